#pragma once

#include <string>
#include <vector>

#include "secpolicy/observed/policy_observer.h"

namespace SecPolicyTest {

// Keeps a line of text for everything that an observer is told.
class ObserverLog : public SecPolicy::PolicyObserver {
 public:
  void OnEnd(SecPolicy::LoadPhase phase) override;
  void OnError(const std::string& message) override;
  void OnProblem(const SecPolicy::Problem& problem) override;
  void OnPathRule(const TeskCtl::Security::TeskAccess_FilePathAccessRule& rule) override;
  void OnFileLabel(const SecPolicy::FileLabel& label) override;
  void OnTardiskTransition(const TeskCtl::Security::TeskAccess_DomTransRule& rule,
                           const std::string& policyFile) override;
  void OnMissingDomain(const std::string& name) override;

  // Only the lines of problems.
  std::vector<std::string> Problems() const;

  std::vector<std::string> lines;
};

// "argument-count in all", "unknown-word in word 2", or nothing of a problem of no line.
std::string Describe(const SecPolicy::Problem& problem);

}  // namespace SecPolicyTest
