#include "load/load_listener.h"

#include <utility>

#include "policy/rule.h"

namespace SecPolicyCli {
namespace {

const char* NameOf(SecPolicy::LoadPhase phase) {
  switch (phase) {
    case SecPolicy::LoadPhase::kObjects:
      return "objects";
    case SecPolicy::LoadPhase::kDomains:
      return "domains";
    case SecPolicy::LoadPhase::kPartnerDomains:
      return "partner domains";
    case SecPolicy::LoadPhase::kTardisks:
      return "tardisks";
    case SecPolicy::LoadPhase::kFileLabels:
      return "file labels";
  }
  return "";
}

}  // namespace

void LoadListener::OnEnd(SecPolicy::LoadPhase phase) { timing.EndPhase(NameOf(phase)); }

void LoadListener::OnError(const std::string& message) {
  ErrorList::OnError(message);
  if (watcher != nullptr) watcher->OnError(message);
}

void LoadListener::OnProblem(const SecPolicy::Problem& problem) {
  ++problems[problem.file];
  if (watcher != nullptr) watcher->OnProblem(problem);
}

void LoadListener::OnLabelFailure(const std::string& message) {
  ++labelFailures;
  OnError(message);
}

std::size_t LoadListener::CountProblems() const {
  std::size_t count = labelFailures;
  for (const auto& [file, ofFile] : problems) count += ofFile;
  return count;
}

void LoadListener::OnPathRule(const TeskCtl::Security::TeskAccess_FilePathAccessRule& rule) {
  if (transaction != nullptr) transaction->SetLine(rule.line);
}

void LoadListener::OnFileLabel(const SecPolicy::FileLabel& label) {
  labels.push_back({.path = label.path,
                    .isTree = label.recursive,
                    .label = label.label,
                    .file = label.policyFile,
                    .line = label.lineNumber});
}

void LoadListener::OnTardiskTransition(const TeskCtl::Security::TeskAccess_DomTransRule& rule,
                                       const std::string& policyFile) {
  auto record = rule;
  LinuxHost::RuleOrigin origin{.domain = rule.domainName, .rule = Policy::TakeRule(record)};
  origin.rule.origin = {.file = policyFile, .line = rule.line};
  rules.push_back(std::move(origin));
}

}  // namespace SecPolicyCli
