#include "calls.h"

#include <sstream>
#include <utility>

#include "check/policy_check.h"
#include "check/report_format.h"
#include "compare/policy_diff.h"
#include "dry_run/load_dry_run.h"
#include "dry_run/load_plan.h"
#include "host/linux/operation/log_use.h"
#include "host/linux/operation/policy_count.h"
#include "host/linux/operation/state_use.h"
#include "installed/installed_policy.h"
#include "kitlibs/file.h"
#include "load/full_load.h"
#include "query/answer.h"
#include "query/named.h"
#include "query/search.h"
#include "refusal.h"
#include "root.h"

namespace SecPolicyPython {
namespace {

using SecPolicyCli::Json;

void RequireDirectory(const std::string& dir) {
  if (File_IsDirectory(dir.c_str())) return;
  throw SecPolicyCli::NoSuchPolicy("there is no directory " + dir + " below this root");
}

// The host would make a state of its own.
void RequireState() {
  if (!LinuxHost::IsStateMissing()) return;
  throw SecPolicyCli::NothingInstalled("nothing is installed below this root. Run " +
                                       SecPolicyCli::Call("boot") + " first.");
}

Json ToJson(const SecPolicy::Problem& problem) {
  Json json = {{"file", SecPolicyCli::OutsidePath(problem.file)}, {"message", problem.reason}};
  if (problem.line > 0) json["line"] = problem.line;
  return json;
}

Json ToJson(const LinuxHost::LoadRemainder& remainder) {
  return {{"domains", remainder.domains}, {"rules", remainder.rules}};
}

const char* WordFor(SecPolicyCli::ExitCode ending) {
  return ending == SecPolicyCli::kStopped ? "stopped" : "failed";
}

// What is wrong with policy files.
class ProblemList : public SecPolicyCli::LoadWatcher {
 public:
  void OnError(const std::string& message) override { errors.push_back(message); }
  void OnProblem(const SecPolicy::Problem& problem) override { problems.Append(ToJson(problem)); }

  // For a failure with this message.
  Json Describe(const std::string& message) const {
    return {{"message", message}, {"errors", errors}, {"problems", problems}};
  }

 private:
  std::vector<std::string> errors;
  Json problems = Json::Array();
};

// Sends what a load that does not end well has found: it may end the process.
class LoadReport : public ProblemList {
 public:
  explicit LoadReport(Send use) : send(std::move(use)) {}

  void OnOutcome(const SecPolicyCli::LoadOutcome& ended) override {
    outcome = ended;
    if (outcome.code == SecPolicyCli::kWell) return;
    Json failure = Describe(outcome.reason);
    failure["ending"] = WordFor(outcome.code);
    send({"load", failure.Text()});
  }

  const SecPolicyCli::LoadOutcome& Outcome() const { return outcome; }

 private:
  const Send send;
  SecPolicyCli::LoadOutcome outcome;
};

}  // namespace

void Check(const std::string& path, bool fresh, const Send& send) {
  SecPolicyCli::CheckReport report =
      SecPolicyCli::CheckPolicy({.path = path, .fresh = fresh, .content = nullptr, .unwanted = {}});
  report.diagnostics.Select({});
  std::ostringstream document;
  WriteJson(report.diagnostics, document);
  send({"answer", document.str()});
}

void Plan(const std::string& dir, bool keep, const Send& send) {
  RequireDirectory(dir);
  SecPolicyCli::LoadRequest load = SecPolicyCli::FullLoad(dir);
  load.keep = keep;
  const SecPolicyCli::LoadDryRun dryRun(load);
  const LinuxHost::DroppedLog dropped;
  std::ostringstream document;
  WritePlanJson(MakeLoadPlan(dryRun), dir, SecPolicyCli::Json(), dryRun, document);
  send({"answer", document.str()});
}

void Load(const std::string& dir, bool keep, bool allOrNothing, const Send& send) {
  RequireDirectory(dir);
  LoadReport report(send);
  SecPolicyCli::LoadRequest load = SecPolicyCli::FullLoad(dir);
  load.keep = keep;
  load.allOrNothing = allOrNothing;
  load.watcher = &report;
  if (RunLoad(load) != SecPolicyCli::kWell) return;
  const LinuxHost::PolicyCount count = LinuxHost::CountPolicy(LinuxHost::CurrentState());
  const LinuxHost::LoadEnding& remainder = report.Outcome().remainder;
  const Json document = {{"directory", dir},
                         {"domains", count.domains},
                         {"rules", count.rules},
                         {"objects", count.objects},
                         {"removed", ToJson(remainder.removed)},
                         {"stay", ToJson(remainder.staying)}};
  send({"answer", document.Text()});
}

void Why(const std::string& domain, const std::vector<std::string>& words, const Send& send) {
  RequireState();
  SecPolicy::TeskAccessInterfaceImpl access;
  const Policy::InstalledDomain installed = SecPolicyCli::RequireInstalledDomain(domain, access);
  const SecPolicyCli::Question question = SecPolicyCli::ReadQuestion(words, access);
  const Policy::Decision decision = Policy::Decide(question.asked, installed);
  send({"answer", WhyToJson(question, installed, decision).Text()});
}

void WhoCan(const std::vector<std::string>& words, const Send& send) {
  RequireState();
  SecPolicy::TeskAccessInterfaceImpl access;
  const Policy::InstalledPolicy policy = SecPolicyCli::ReadInstalledPolicy(access);
  const SecPolicyCli::Question question = SecPolicyCli::ReadQuestion(words, access);
  send({"answer", WhoCanToJson(question, FindDomains(question, policy)).Text()});
}

void Diff(const std::string& before, const std::string& after, const Send& send) {
  const LinuxHost::DroppedLog dropped;
  ProblemList problems;
  try {
    SecPolicyCli::Side first = SecPolicyCli::ReadSide(before, problems);
    SecPolicyCli::Side second = SecPolicyCli::ReadSide(after, problems);
    std::ostringstream document;
    WriteDiffJson(SecPolicyCli::Diff(std::move(first), std::move(second)), document);
    send({"answer", document.str()});
  } catch (const SecPolicyCli::BadPolicy&) {
    send({"policy", problems.Describe("the policy has errors, so it was not compared").Text()});
  }
}

}  // namespace SecPolicyPython
