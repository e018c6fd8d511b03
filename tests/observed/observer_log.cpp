#include "observed/observer_log.h"

namespace SecPolicyTest {
namespace {

using SecPolicy::Fault;
using SecPolicy::LoadPhase;
using SecPolicy::Problem;

std::string NameOf(LoadPhase phase) {
  switch (phase) {
    case LoadPhase::kObjects:
      return "objects";
    case LoadPhase::kDomains:
      return "domains";
    case LoadPhase::kPartnerDomains:
      return "partner domains";
    case LoadPhase::kTardisks:
      return "tardisks";
    case LoadPhase::kFileLabels:
      return "file labels";
  }
  return "?";
}

std::string NameOf(Fault fault) {
  switch (fault) {
    case Fault::kRuleType:
      return "rule-type";
    case Fault::kArgumentCount:
      return "argument-count";
    case Fault::kGrantWord:
      return "grant-word";
    case Fault::kUnknownDomain:
      return "unknown-domain";
    case Fault::kUnknownWord:
      return "unknown-word";
    case Fault::kTreeMarker:
      return "tree-marker";
    case Fault::kSecondRule:
      return "second-rule";
  }
  return "?";
}

std::string Place(const std::string& file, unsigned int line) {
  return file + ":" + std::to_string(line);
}

}  // namespace

std::string Describe(const Problem& problem) {
  if (!problem.fault) return "";
  return NameOf(*problem.fault) + " in " +
         (problem.word == Problem::kWholeLine ? "all" : "word " + std::to_string(problem.word));
}

void ObserverLog::OnEnd(LoadPhase phase) { lines.push_back("end " + NameOf(phase)); }

void ObserverLog::OnError(const std::string& message) { lines.push_back("error " + message); }

void ObserverLog::OnProblem(const Problem& problem) {
  const std::string fault = Describe(problem);
  lines.push_back("problem " + Place(problem.file, problem.line) + " " +
                  (fault.empty() ? "" : fault + " ") + problem.reason);
}

void ObserverLog::OnPathRule(const TeskCtl::Security::TeskAccess_FilePathAccessRule& rule) {
  lines.push_back("path " + rule.path + " of " + Place(rule.domainName, rule.line));
}

void ObserverLog::OnFileLabel(const SecPolicy::FileLabel& label) {
  lines.push_back("label " + label.label + " of " + label.path + (label.recursive ? "/*" : "") +
                  " from " + Place(label.policyFile, label.lineNumber));
}

void ObserverLog::OnTardiskTransition(const TeskCtl::Security::TeskAccess_DomTransRule& rule,
                                      const std::string& policyFile) {
  lines.push_back("transition " + rule.domainName + " " + rule.label + " " + rule.targetDomain +
                  " from " + Place(policyFile, rule.line));
}

void ObserverLog::OnMissingDomain(const std::string& name) { lines.push_back("missing " + name); }

std::vector<std::string> ObserverLog::Problems() const {
  std::vector<std::string> problems;
  for (const std::string& line : lines) {
    if (line.starts_with("problem ")) problems.push_back(line);
  }
  return problems;
}

}  // namespace SecPolicyTest
