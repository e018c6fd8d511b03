#include "load/load_summary.h"

#include <exception>

#include "ending.h"
#include "host/linux/operation/policy_count.h"
#include "host/linux/operation/state_use.h"
#include "root.h"
#include "secpolicy/policy_root.h"
#include "text/format.h"
#include "text/shell_word.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

// "1 domain and 2 rules"
std::string Count(const LinuxHost::LoadRemainder& remainder) {
  std::string text;
  if (!remainder.domains.empty()) text = CountOf(remainder.domains.size(), "domain");
  if (remainder.rules == 0) return text;
  return text + (text.empty() ? "" : " and ") + CountOf(remainder.rules, "rule");
}

std::string DescribeRemoved(const LinuxHost::LoadRemainder& removed) {
  return ", " + Count(removed) + " removed that no file has";
}

}  // namespace

std::string DescribeProblems(const std::map<std::string, std::size_t>& problems,
                             const std::string& policyDir) {
  if (problems.empty()) return "";
  std::string text;
  for (const auto& [file, count] : problems) {
    text += Visible(OutsidePath(file)) + ": " + CountOf(count, "error") + "\n";
  }
  // A check of the policy looks at the early policy in it too.
  const bool isEarly = policyDir == SecPolicy::kEarlyPolicyRoot;
  return text + Visible(Call("check " + ShellWord(isEarly ? SecPolicy::kPolicyRoot : policyDir))) +
         " shows the lines, and what may be meant\n";
}

std::string DescribeBundleProblems(const std::map<std::string, std::size_t>& problems,
                                   const std::string& bundle, const std::string& dir) {
  std::string text;
  for (const auto& [file, count] : problems) {
    const bool isInside = file.starts_with(dir + "/");
    text += Visible(bundle + ": " + (isInside ? file.substr(dir.size() + 1) : file)) + ": " +
            CountOf(count, "error") + "\n";
  }
  return text;
}

std::string DescribeStop(const std::vector<std::string>& missing, const std::string& policyDir) {
  const std::string names = ListOf(missing, "and");
  const bool isOne = missing.size() == 1;
  return std::string("stopped: there ") + (isOne ? "is no domain " : "are no domains ") + names +
         ", so nothing was installed. Put " +
         (isOne ? "a policy file named " + names : "policy files of these names") + " into " +
         policyDir + "/domains and run it again.";
}

std::string CountInstalled() {
  const LinuxHost::PolicyCount count = LinuxHost::CountPolicy(LinuxHost::CurrentState());
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
  if (!ending.removed.IsEmpty()) return DescribeRemoved(ending.removed);
  // Domains in which worlds run are told before.
  if (!keep || ending.staying.IsEmpty()) return "";
  return ", " + Count(ending.staying) + " kept that no file has";
}

std::string DescribeUnremoved(const LinuxHost::LoadEnding& ending) {
  // What fails when all is committed is a label.
  if (!ending.removed.IsEmpty()) return DescribeRemoved(ending.removed);
  if (ending.staying.IsEmpty()) return "";
  return "; nothing was removed: " + Count(ending.staying) + " found in no file";
}

}  // namespace SecPolicyCli
