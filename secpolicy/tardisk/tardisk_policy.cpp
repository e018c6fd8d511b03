#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cstring>

#include "braxo/misc/strcat.h"
#include "secpolicy/carry_on.h"
#include "secpolicy/policy_root.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"
#include "secpolicy/tardisk/tardisk_exception_rules.h"
#include "secpolicy/tardisk/tardisk_policy_steps.h"
#include "teskctl/sysinfo.h"

namespace SecPolicy {
namespace {

constexpr char kExceptionRule[] = "-E";

// The kernel's inode record: statistics, then the name of the tardisk that the inode came from.
constexpr std::size_t kInodeRecordSize = 548;
constexpr std::size_t kTardiskNameOffset = 36;

class File {
 public:
  explicit File(const std::string& path) : descriptor(open(path.c_str(), O_RDONLY | O_CLOEXEC)) {}
  File(const File&) = delete;
  File& operator=(const File&) = delete;
  ~File() {
    if (IsOpen()) close(descriptor);
  }

  bool IsOpen() const { return descriptor >= 0; }
  bool GetAttributes(struct stat& attributes) const { return fstat(descriptor, &attributes) == 0; }

 private:
  int descriptor;
};

std::string ReadTardiskName(unsigned long inode) {
  std::array<char, kInodeRecordSize> record{};
  TeskCtl::Util::Sysinfo sysinfo(TeskCtl::Util::KSI_NODE_system_kelpfs_inodes_stats);
  sysinfo.AddInstancePath(inode);
  sysinfo.Get(record.data(), record.size());
  const char* name = record.data() + kTardiskNameOffset;
  return {name, strnlen(name, record.size() - kTardiskNameOffset)};
}

}  // namespace

void RaiseTardiskParseError(const std::string& policyFile, const Problem& problem) {
  // Worded like the error of a domain policy, for those who watch for either.
  throw LineFailure(Braxo::Misc::StrCat("Error in parsing policy for domain: ", policyFile, ": ",
                                        problem.line, " : ", problem.reason),
                    problem);
}

TardiskPolicy::TardiskPolicy(const std::string& path) : policyFile(path) {
  auto rules = std::make_unique<TardiskExceptionRules>();
  rules->ruleType = kExceptionRule;
  ruleSets.emplace(kExceptionRule, std::move(rules));
}

TardiskPolicy::~TardiskPolicy() = default;

std::string TardiskPolicy::GetBackingTardiskPath() {
  const File file(policyFile);
  if (!file.IsOpen()) RaiseError("Unable to open policy file " + policyFile);
  struct stat attributes {};
  if (!file.GetAttributes(attributes)) {
    RaiseError("Unable to get attributes for policy file " + policyFile);
  }
  const std::string name = ReadTardiskName(attributes.st_ino);
  return name.empty() ? name : kTardiskImagesDir + name;
}

void TardiskPolicy::ParsePolicy(TeskAccessInterfaceImpl& access) {
  TardiskPolicySteps(*this, Nobody()).ParsePolicy(access);
}

void TardiskPolicy::SetPolicy(TeskAccessInterfaceImpl& access) {
  TardiskPolicySteps(*this, Nobody()).SetPolicy(access);
}

std::string TardiskPolicySteps::GetBackingTardiskPath() {
  std::string path;
  TellFailure(policy.policyFile, observer, [&] { path = policy.GetBackingTardiskPath(); });
  return path;
}

void TardiskPolicySteps::ParsePolicy(TeskAccessInterfaceImpl& access) {
  const std::string tardisk = GetBackingTardiskPath();
  if (tardisk.empty()) return ReportWithoutTardisk(policy.policyFile, observer);

  ReadLines(policy.policyFile, observer, [&](unsigned int line, std::queue<std::string>& tokens) {
    ParseLine(tardisk, line, tokens, access);
  });
}

void TardiskPolicySteps::ParseLine(const std::string& tardisk, unsigned int line,
                                   std::queue<std::string>& tokens,
                                   TeskAccessInterfaceImpl& access) {
  const std::string type = std::move(tokens.front());
  tokens.pop();
  const auto rules = policy.ruleSets.find(type);
  if (rules == policy.ruleSets.end()) {
    RaiseTardiskParseError(policy.policyFile,
                           {.line = line,
                            .fault = Fault::kRuleType,
                            .word = 0,
                            .reason = "invalid tardisk policy rule type (" + type + ")"});
  }
  rules->second->AddRule(line, tardisk, policy.policyFile, tokens, access);
}

void TardiskPolicySteps::SetPolicy(TeskAccessInterfaceImpl& access) {
  TellFailure(policy.policyFile, observer, [&] {
    for (const auto& [type, rules] : policy.ruleSets) {
      // The only kind.
      dynamic_cast<TardiskExceptionRules&>(*rules).SetObserved(access, observer);
    }
  });
}

void ReportWithoutTardisk(const std::string& policyFile, PolicyObserver& observer) {
  const std::string message = "No backing tardisk for policy file " + policyFile;
  observer.OnProblem({.file = policyFile, .reason = message});
  ReportError(message, observer);
}

}  // namespace SecPolicy
