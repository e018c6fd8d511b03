#pragma once

#include <cstddef>
#include <map>
#include <string>
#include <vector>

#include "error_list.h"
#include "host/linux/operation/policy_load.h"
#include "host/linux/operation/rule_origins.h"
#include "load/load_timing.h"
#include "load/load_watcher.h"

namespace SecPolicyCli {

// What a load tells while it runs, kept for its summary and its records.
class LoadListener : public ErrorList {
 public:
  // Rules that are installed from now on belong to `load`, which is only borrowed.
  void Follow(LinuxHost::PolicyTransaction& load) { transaction = &load; }

  void OnEnd(SecPolicy::LoadPhase phase) override;
  void OnError(const std::string& message) override;
  void OnProblem(const SecPolicy::Problem& problem) override;
  void OnPathRule(const TeskCtl::Security::TeskAccess_FilePathAccessRule& rule) override;
  void OnFileLabel(const SecPolicy::FileLabel& label) override;
  void OnTardiskTransition(const TeskCtl::Security::TeskAccess_DomTransRule& rule,
                           const std::string& policyFile) override;
  void OnMissingDomain(const std::string& name) override { missingDomain = name; }

  // The number of problems of each policy file and directory.
  const std::map<std::string, std::size_t>& Problems() const { return problems; }

  // A file that did not get its label, which no policy file is to blame for.
  void OnLabelFailure(const std::string& message);

  // How many problems there are: the library sums up each in further errors.
  std::size_t CountProblems() const;

  // Where rules and labels are written, but for the rules that are in the file of their domain.
  const std::vector<LinuxHost::RuleOrigin>& Rules() const { return rules; }
  const std::vector<LinuxHost::LabelOrigin>& Labels() const { return labels; }

  // The domain without which the library ends the process; empty while there is none.
  const std::string& MissingDomain() const { return missingDomain; }

  LoadTiming timing;

  LoadWatcher* watcher = nullptr;  // is told each problem and error, if set

 private:
  LinuxHost::PolicyTransaction* transaction = nullptr;
  std::map<std::string, std::size_t> problems;
  std::size_t labelFailures = 0;
  std::vector<LinuxHost::RuleOrigin> rules;
  std::vector<LinuxHost::LabelOrigin> labels;
  std::string missingDomain;
};

}  // namespace SecPolicyCli
