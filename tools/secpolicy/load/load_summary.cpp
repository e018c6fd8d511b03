#include "load/load_summary.h"

#include <array>
#include <exception>
#include <iostream>
#include <map>
#include <string_view>

#include "domain_file.h"
#include "host/linux/operation/policy_count.h"
#include "secpolicy/policy_root.h"
#include "summary.h"
#include "text/count.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

constexpr std::string_view kEnd = " : ";

// What stands before the name of a domain, or before the file of a tardisk's policy.
constexpr std::array<std::string_view, 3> kBeforeDomain = {
    "Error in parsing policy for domain: ", "Error in setting policy for domain: ",
    "Policy constraint error for domain: "};

// What stands before a path that ends the message.
constexpr std::array<std::string_view, 6> kBeforePath = {
    "Unable to open policy file ",         "Unable to open policy directory for tardisks ",
    "Unable to open policy directory ",    "Unable to get attributes for policy file ",
    "No backing tardisk for policy file ", "Ignoring "};

template <class Beginnings>
std::string_view Behind(const Beginnings& beginnings, std::string_view message) {
  for (const std::string_view beginning : beginnings) {
    if (message.starts_with(beginning)) return message.substr(beginning.size());
  }
  return {};
}

// "NAME: LINE : REASON", or "NAME : REASON" where the whole domain is meant.
std::string FileOfDomain(std::string_view text, const std::string& policyDir) {
  const std::string_view name = text.substr(0, text.find_first_of(" :"));
  if (name.starts_with('/')) return std::string(name);
  return DomainFile(name, policyDir);
}

// The file that a message is about; empty when it is about none.
std::string FileOf(std::string_view message, const std::string& policyDir) {
  const std::string_view domain = Behind(kBeforeDomain, message);
  if (!domain.empty()) return FileOfDomain(domain, policyDir);
  if (!message.starts_with('/')) return std::string(Behind(kBeforePath, message));
  // "FILE:LINE : REASON"
  const std::string_view place = message.substr(0, message.find(kEnd));
  return std::string(place.substr(0, place.rfind(':')));
}

// "1 domain and 2 rules"
std::string Count(const LinuxHost::LoadRemainder& remainder) {
  std::string text;
  if (!remainder.domains.empty()) text = CountOf(remainder.domains.size(), "domain");
  if (remainder.rules == 0) return text;
  return text + (text.empty() ? "" : " and ") + CountOf(remainder.rules, "rule");
}

}  // namespace

void WriteErrorsByFile(const std::vector<std::string>& messages, std::size_t earlyErrors,
                       const std::string& policyDir) {
  std::map<std::string, std::size_t> errors;
  for (std::size_t index = 0; index < messages.size(); ++index) {
    const bool isEarly = index < earlyErrors;
    const std::string file =
        FileOf(messages[index], isEarly ? SecPolicy::kEarlyPolicyRoot : policyDir);
    if (!file.empty()) ++errors[file];
  }
  for (const auto& [file, count] : errors) {
    std::cerr << Visible(file) << ": " << CountOf(count, "error") << std::endl;
  }
  if (errors.empty()) return;
  // A check of the policy looks at the early policy in it too.
  const bool isEarly = policyDir == SecPolicy::kEarlyPolicyRoot;
  std::cerr << "'secpolicy check " << Visible(isEarly ? SecPolicy::kPolicyRoot : policyDir)
            << "' shows the lines, and what may be meant" << std::endl;
}

std::string CountInstalled() {
  const LinuxHost::PolicyCount count = LinuxHost::CountPolicy();
  return CountOf(count.domains, "domain") + ", " + CountOf(count.rules, "rule") + ", " +
         CountOf(count.objects, "object");
}

std::string DescribeDone(const std::string& verb) {
  try {
    return "done (" + CountInstalled() + ")";
  } catch (const std::exception& failure) {
    Summarize(verb, std::string("what is installed cannot be counted: ") + failure.what());
    return "done";
  }
}

std::string DescribeRemainder(const LinuxHost::LoadEnding& ending, bool keep) {
  if (!ending.removed.IsEmpty()) return ", " + Count(ending.removed) + " removed that no file has";
  // Domains in which worlds run are told before.
  if (keep && !ending.staying.IsEmpty()) {
    return ", " + Count(ending.staying) + " kept that no file has";
  }
  if (ending.staying.rules == 0) return "";
  return "; nothing was removed: " + Count(ending.staying) + " that no file has";
}

}  // namespace SecPolicyCli
