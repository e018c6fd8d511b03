// A tardisk policy: at most one exception rule, and it labels the image and brings every launch
// domain into the named one.

#include <cstdint>
#include <map>
#include <optional>
#include <string>

#include "secpolicy/secpolicy.h"
#include "support/memory_file.h"
#include "support/message_of.h"
#include "support/policy_host.h"
#include "support/reference_reader.h"
#include "support/require.h"

namespace SecPolicyFuzz {
namespace {

using SecPolicyTest::MessageOf;

constexpr char kTardisk[] = "/tardisks/tool.tgz";

const std::map<std::string, unsigned int> kDomains = {
    {"hostDom", 0}, {"appDom", 1}, {"daemonFrameworkDom", 2}, {"fuzzDom", 3}};

struct Exception {
  unsigned int line;
  std::string label;
  std::string domain;
};

struct Reading {
  std::optional<Exception> exception;
  std::string refusal;
};

// Why `line` cannot be read; empty when it can. `place` is what a refused line is told with.
std::string Refusal(const Words& line, bool hasException, const std::string& place) {
  if (line[0] != "-E") return place + "invalid tardisk policy rule type (" + line[0] + ")";
  if (hasException) return "Only one rule of this type is allowed";
  if (line.size() != 3) return place + "incorrect number of arguments for this rule type";
  if (!kDomains.contains(line[2])) return place + "Failed to fetch domain id for " + line[2];
  return {};
}

Reading ReadReference(const std::string& path, const Lines& lines) {
  Reading reading;
  for (const auto& [number, words] : lines) {
    const std::string place =
        "Error in parsing policy for domain: " + path + ": " + std::to_string(number) + " : ";
    reading.refusal = Refusal(words, reading.exception.has_value(), place);
    if (!reading.refusal.empty()) break;
    reading.exception = {number, words[1], words[2]};
  }
  return reading;
}

std::string Show(const std::string& launchDomain, const std::string& label,
                 const std::string& target, unsigned int line) {
  return launchDomain + " on " + label + " into " + target + ", line " + std::to_string(line) +
         "\n";
}

std::string ExpectedTransitions(const Exception& exception, const PolicyHost& host) {
  if (exception.label == "unlabeled") return {};
  std::string text;
  for (const std::string& launchDomain : host.tardiskLaunchDomains) {
    if (launchDomain == exception.domain) continue;
    text += Show(launchDomain, exception.label, exception.domain, exception.line);
  }
  return text;
}

std::string InstalledTransitions(PolicyHost& host) {
  std::string text;
  for (const std::string& launchDomain : host.tardiskLaunchDomains) {
    for (const auto& rule : host.rules[kDomains.at(launchDomain)].domTrans) {
      Require(rule.grant && rule.transitionKind == host.tardiskExecEventKeyword &&
                  rule.domainName == launchDomain &&
                  rule.targetDomainId == kDomains.at(rule.targetDomain),
              "a transition of a tardisk");
      text += Show(launchDomain, rule.label, rule.targetDomain, rule.line);
    }
  }
  return text;
}

void CheckApplying(SecPolicy::TardiskPolicy& policy, const std::string& path,
                   const std::optional<Exception>& exception, PolicyHost& host,
                   SecPolicyTest::TeskAccessInterfaceImpl& access) {
  const std::string failure = MessageOf([&] { policy.SetPolicy(access); });
  const auto& labels = host.labels[TeskCtl::Security::TESKACCESS_LABEL_OBJECT];
  const bool known = exception && labels.contains(exception->label);
  if (exception && !known) {
    RequireEqual(failure,
                 path + ":" + std::to_string(exception->line) + " : Tardisk: " + kTardisk +
                     " : Invalid label (" + exception->label + ") for file " + kTardisk,
                 "an unknown label");
  } else {
    RequireEqual(failure, "", "applying a good exception");
  }
  Require(host.attributes.contains(kTardisk) == known, "the image is labelled");
  RequireEqual(InstalledTransitions(host), known ? ExpectedTransitions(*exception, host) : "",
               "the transitions");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const MemoryFile file;
  file.Write(Text(data, size));
  PolicyHost host;
  host.defaultTardiskName = "tool.tgz";
  SecPolicyTest::TeskAccessInterfaceImpl access;

  SecPolicy::TardiskPolicy policy(file.Path());
  const std::string failure = MessageOf([&] { policy.ParsePolicy(access); });
  const Reading expected = ReadReference(file.Path(), ReadFile(Text(data, size)));
  RequireEqual(failure, expected.refusal, "the refused line");
  CheckApplying(policy, file.Path(), expected.exception, host, access);
  return 0;
}

}  // namespace SecPolicyFuzz
