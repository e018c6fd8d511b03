#include "secpolicy/observed/policy_lines.h"

#include <queue>
#include <utility>

#include "secpolicy/domain/capability_param_rules.h"
#include "secpolicy/domain/domain_policy.h"
#include "secpolicy/domain/file_path_access_rules.h"
#include "secpolicy/labels/file_label_policy.h"
#include "secpolicy/labels/object_policy.h"
#include "secpolicy/tardisk/tardisk_policy_steps.h"

namespace SecPolicy {
namespace {

constexpr char kParameterRule[] = "-p";

// Hands the words to `parse`, which throws when a load does not take the line.
template <class Parse>
bool Takes(LineWords words, Parse parse) {
  std::queue<std::string> tokens(std::deque<std::string>(words.begin(), words.end()));
  try {
    parse(tokens);
    return true;
  } catch (const Braxo::Lib::BraxoException&) {
    return false;
  }
}

class LabelCollector : public PolicyObserver {
 public:
  explicit LabelCollector(std::deque<FileLabel>& collected) : labels(collected) {}
  void OnFileLabel(const FileLabel& label) override { labels.push_back(label); }

 private:
  std::deque<FileLabel>& labels;
};

}  // namespace

DomainLines::DomainLines(const std::string& name, unsigned int id)
    : policy(std::make_unique<DomainPolicy>(name, id)) {}

DomainLines::~DomainLines() = default;

bool DomainLines::Read(LineWords words, TeskAccessInterfaceImpl& access, Problem& problem) {
  return Takes(words, [&](auto& tokens) { policy->ParseLine(tokens, access, problem); });
}

std::list<TeskCtl::Security::TeskAccess_CapabilityParamRule>& DomainLines::ParameterRules() {
  return dynamic_cast<CapabilityParamRules&>(*policy->ruleSets.at(kParameterRule)).rules;
}

TardiskLines::TardiskLines(const std::string& policyFile, const std::string& tardiskPath)
    : policy(policyFile), tardisk(tardiskPath) {}

bool TardiskLines::Read(LineWords words, TeskAccessInterfaceImpl& access, Problem& problem) {
  PolicyObserver nobody;
  TardiskPolicySteps steps(policy, nobody);
  return Takes(words, [&](auto& tokens) { steps.ParseLine(tardisk, tokens, access, problem); });
}

bool ReadObjectLine(LineWords words, std::vector<std::string>& names, Problem& problem) {
  ObjectPolicy policy;
  const bool isTaken = Takes(words, [&](auto& tokens) { policy.ParseLine(tokens, problem); });
  if (isTaken) names.push_back(std::move(policy.names.front()));
  return isTaken;
}

bool ReadFileLabelLine(LineWords words, TeskAccessInterfaceImpl& access,
                       std::deque<FileLabel>& labels, Problem& problem) {
  FileLabelPolicy policy;
  const bool isTaken =
      Takes(words, [&](auto& tokens) { policy.ParseLine(tokens, access, problem); });
  if (isTaken) labels.push_back(std::move(policy.fileLabels.front()));
  return isTaken;
}

void ReadFileLabels(const std::string& file, TeskAccessInterfaceImpl& access,
                    std::deque<FileLabel>& labels) {
  LabelCollector collector(labels);
  FileLabelPolicy().ParsePolicy(file, access, collector);
}

void CheckPermissions(const std::string& permissions) {
  FilePathAccessRules().GetPermission(permissions);
}

}  // namespace SecPolicy
