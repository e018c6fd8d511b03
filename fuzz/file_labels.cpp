// A file-label policy: accepted and applied as the format says, line by line.

#include <algorithm>
#include <cstdint>
#include <deque>
#include <map>
#include <string>

#include "secpolicy/labels/file_label_policy.h"
#include "support/memory_file.h"
#include "support/message_of.h"
#include "support/policy_host.h"
#include "support/reference_reader.h"
#include "support/require.h"

namespace SecPolicyFuzz {
namespace {

using SecPolicyTest::MessageOf;
using FileLabel = SecPolicy::FileLabelPolicy::FileLabel;

const std::map<std::string, unsigned int>& Labels(PolicyHost& host) {
  return host.labels[TeskCtl::Security::TESKACCESS_LABEL_OBJECT];
}

// The kernel takes a domain's name for a label, too, until a file is to carry it.
bool IsKnown(const std::string& label, PolicyHost& host) {
  return Labels(host).contains(label) ||
         std::any_of(host.domains.begin(), host.domains.end(),
                     [&](const auto& domain) { return domain.second.name == label; });
}

std::string Show(const FileLabel& label) {
  return label.path + (label.recursive ? " and below: " : ": ") + label.label + ", " +
         label.policyFile + ":" + std::to_string(label.lineNumber) + "\n";
}

std::string Show(const std::deque<FileLabel>& labels) {
  std::string text;
  for (const FileLabel& label : labels) text += Show(label);
  return text;
}

struct Reading {
  std::string labels;
  std::string refusal;
};

Reading ReadReference(const std::string& path, const Lines& lines, PolicyHost& host) {
  Reading reading;
  for (const auto& [number, words] : lines) {
    const std::string place = path + ":" + std::to_string(number) + " : ";
    if (words.size() != 2) {
      reading.refusal = place + "incorrect no of parameters";
      return reading;
    }
    if (!IsKnown(words[1], host)) {
      reading.refusal = "unknown word " + words[1];
      return reading;
    }
    const std::string& pattern = words[0];
    const bool recursive = pattern.ends_with("/*");
    const std::string named = recursive ? pattern.substr(0, pattern.size() - 2) : pattern;
    // "/*" is for the end alone; "/*/*" has one before it.
    if ((named + (recursive ? "/" : "")).find("/*") != std::string::npos) {
      reading.refusal = place + "Unrecognized format for file/dir specification";
      return reading;
    }
    reading.labels += Show(FileLabel{named, words[1], recursive, path, number});
  }
  return reading;
}

// Trees are left out: their paths may name real directories.
void CheckApplying(SecPolicy::FileLabelPolicy& policy, PolicyHost& host,
                   SecPolicyTest::TeskAccessInterfaceImpl& access) {
  std::erase_if(policy.fileLabels, [](const FileLabel& label) { return label.recursive; });
  std::map<std::string, std::string> attributes;
  std::string errors;
  for (const FileLabel& label : policy.fileLabels) {
    const auto known = Labels(host).find(label.label);
    if (known == Labels(host).end()) {
      errors += "Error: " + label.policyFile + ":" + std::to_string(label.lineNumber) +
                " : Invalid label (" + label.label + ") for file " + label.path + "\n";
      continue;
    }
    const std::uint32_t id = known->second;
    attributes[label.path].assign(reinterpret_cast<const char*>(&id), sizeof id);
  }
  RequireEqual(MessageOf([&] { policy.SetFileLabels(access); }),
               errors.empty() ? "" : "There was a failure in setting file labels", "applying");
  RequireEqual(host.StandardError(), errors, "the labels that failed");
  Require(policy.fileLabels.empty(), "applying uses the labels up");
  Require(host.attributes == attributes, "the later label of a file stays");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const MemoryFile file;
  file.Write(Text(data, size));
  PolicyHost host;
  SecPolicyTest::TeskAccessInterfaceImpl access;

  SecPolicy::FileLabelPolicy policy;
  const std::string failure = MessageOf([&] { policy.ParsePolicy(file.Path(), access); });
  const Reading expected = ReadReference(file.Path(), ReadFile(Text(data, size)), host);
  RequireEqual(failure, expected.refusal, "the refused line");
  RequireEqual(Show(policy.fileLabels), expected.labels, "the labels before it");
  CheckApplying(policy, host, access);
  return 0;
}

}  // namespace SecPolicyFuzz
