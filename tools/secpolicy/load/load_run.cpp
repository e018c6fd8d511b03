#include "load/load_run.h"

#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <exception>
#include <filesystem>
#include <iostream>
#include <map>
#include <optional>
#include <system_error>

#include "ending.h"
#include "enforce/published.h"
#include "host/linux/operation/label_index.h"
#include "host/linux/operation/label_journal.h"
#include "host/linux/operation/label_numbers.h"
#include "host/linux/operation/noted_labels.h"
#include "host/linux/operation/state_use.h"
#include "load/blocked_signals.h"
#include "load/load_listener.h"
#include "load/load_record.h"
#include "load/load_summary.h"
#include "policy_dir.h"
#include "root.h"
#include "secpolicy/policy_root.h"
#include "secpolicy/secpolicy.h"
#include "text/format.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

using LinuxHost::LoadEnding;
using LinuxHost::LoadKind;
using LinuxHost::NotedLabels;

// Takes a step that only explains the summary after it, which is written whatever happens.
template <class Step>
void Attempt(Step step) {
  try {
    step();
  } catch (const std::exception&) {
    return;  // what is wrong has been said
  }
}

void AddNames(const std::string& dir, const std::string& prefix, std::vector<std::string>& names) {
  std::map<std::string, std::string> files;
  // A directory that cannot be read is for the load to report.
  Attempt([&] { SecPolicy::GetFileList(dir, files); });
  for (const auto& [path, name] : files) names.push_back(prefix + name);
}

std::vector<std::string> DefinedDomains(const LoadStep& step) {
  std::vector<std::string> names;
  AddNames(step.directory + "/" + SecPolicy::kDomainsDir, "", names);
  if (step.kind == LoadKind::kFull) {
    AddNames(step.partnersDirectory, SecPolicy::kPartnerPrefix, names);
  }
  return names;
}

// The domain that the library has missed, and the others that it would have come to.
std::vector<std::string> NeededDomainsWithout(const std::string& policyDir,
                                              const std::string& missing) {
  std::vector<std::string> names;
  for (const std::string name : SecPolicy::kNeededDomains) {
    const bool hasFile = std::filesystem::exists(DomainFile(name, policyDir));
    if (name == missing || !hasFile) names.push_back(name);
  }
  return names;
}

// Without /run there was no boot. The host makes but the directory of the state there.
bool HasPlaceForState() {
  const std::filesystem::path state = LinuxHost::StatePath();
  std::error_code unknown;
  return state.is_relative() ||
         std::filesystem::exists(state.parent_path().parent_path(), unknown) || unknown;
}

class LoadRun;

// A terminate handler cannot be handed anything.
LoadRun* running = nullptr;

class LoadRun {
 public:
  explicit LoadRun(const LoadRequest& wanted)
      : request(wanted), otherwise(std::set_terminate(OnTerminate)) {
    listener.watcher = request.watcher;
    running = this;
  }
  LoadRun(const LoadRun&) = delete;
  LoadRun& operator=(const LoadRun&) = delete;
  ~LoadRun() {
    std::set_terminate(otherwise);
    running = nullptr;
  }

  ExitCode Run() {
    try {
      Install();
    } catch (const std::exception& raised) {
      Abandon();
      Fail(raised);
    }
    if (hasBegun && !request.dryRun && (isInstalled || !stateIsNew)) FollowChange();
    if (request.timing) std::cout << Describe(listener.timing.Phases());
    std::cout.flush();
    return WentWell() ? ReportDone() : ReportFailure();
  }

 private:
  // The library stops a load by rethrowing while no exception is being handled. Whatever else ends
  // the process keeps its usual way, core dump included.
  static void OnTerminate() {
    const std::string& missing = running->listener.MissingDomain();
    if (!std::current_exception() && !missing.empty()) running->ReportStop(missing);
    running->otherwise();
    std::abort();
  }

  void Fail(const std::exception& reason) {
    failure = reason.what();
    if (failure.empty()) failure = "failed";
  }

  bool WentWell() const { return failure.empty() && listener.Count() == 0; }

  void Install() {
    isUnbooted = !request.prepare && LinuxHost::IsStateMissing();
    if (request.mend) request.mend();
    if (!request.dryRun) {
      PutBackLeftOver();
      KeepLabelNumbers();
    }
    if (request.prepare) request.prepare(listener.timing);
    stateIsNew = LinuxHost::IsStateMissing();
    listener.Follow(transaction.emplace(LinuxHost::CurrentState()));
    hasBegun = true;
    if (request.begin) request.begin();
    // A number on a file is to be one that the state knows.
    std::optional<NotedLabels> labels;
    if (!request.dryRun) labels.emplace(LinuxHost::LabelNotes::kForLater);
    for (const LoadStep& step : request.steps) Take(step);
    if (request.allOrNothing && !WentWell()) {
      Abandon();
    } else if (request.allOrNothing && labels) {
      InstallAllOrNothing(*labels);
    } else {
      RecordedLoad record = Ending();
      record.labelsFollow = labels && !labels->IsEmpty();
      Commit(record);
      if (record.labelsFollow) GiveLabels(*labels);
    }
    listener.timing.EndPhase("file labels");
  }

  // A load that was killed while it gave labels, all of them or none, has left them half done.
  void PutBackLeftOver() {
    if (LinuxHost::IsStateMissing()) return;
    const auto back = LinuxHost::LabelJournal::PutBackLeftOver(LinuxHost::StatePath());
    if (!back) return;
    Summarize("load", "a load before this one was killed, so " +
                          CountOf(back->count, "file label") + " were put back first");
    ReportPutBack(*back);
  }

  // What is made from the policy. Also after a load that failed, which may have labelled files.
  void FollowChange() {
    try {
      if (LinuxHost::RefreshLabelIndex()) listener.timing.EndPhase("label index");
      if (PublishPlans()) listener.timing.EndPhase("plans");
    } catch (const Braxo::Lib::BraxoException& problem) {
      listener.OnError(problem.what());
      SecPolicy::SecpolicyError(problem.what());
      if (isInstalled) RecordLoad(Ending(), ending, listener);
    }
  }

  void KeepLabelNumbers() const {
    const std::string done = LinuxHost::TakeOverLabelNumbers();
    if (!done.empty()) Summarize(request.verb, done);
  }

  // A file without its label is an error of a load that was well until then.
  void GiveLabels(const NotedLabels& labels) {
    const std::vector<LinuxHost::LabelFailure> failures = labels.Apply();
    if (failures.empty()) return RecordLabelled(Ending(), ending);
    ReportUnlabelled(failures);
    RecordInstalled();
    RecordLoad(Ending(), ending, listener);
  }

  void Commit(const RecordedLoad& record) {
    RecordInstalled();
    RecordLoad(record, ending, listener);
    transaction->Commit();
    isInstalled = true;
  }

  // Early policy is but a part of the host's.
  void RecordInstalled() const {
    if (request.steps.back().kind == LoadKind::kFull) {
      RecordInstalledPolicy(request.policyDir, WentWell());
    }
  }

  // The labels come before the commit: they can be taken back, and the commit cannot.
  void InstallAllOrNothing(const NotedLabels& labels) {
    const BlockedSignals blocked;
    LinuxHost::LabelJournal journal(LinuxHost::StatePath());
    try {
      journal.Keep(labels);
      ReportUnlabelled(labels.Apply());
      if (WentWell()) return Commit(Ending());
    } catch (const std::exception&) {
      ReportPutBack(journal.PutBack());
      throw;
    }
    Abandon();
    ReportPutBack(journal.PutBack());
  }

  // Who loads next has waited for the transaction, and is to find the files of before.
  void Abandon() {
    if (!isInstalled) UndoBegin();
    transaction.reset();
  }

  // All or nothing leaves no trace of itself. Where there was no state, there is to be none; its
  // journal goes with it.
  void RecordUndone(const RecordedLoad& record) {
    if (!request.allOrNothing) return RecordEnding(record);
    if (!stateIsNew) return;
    for (const char* part : {"", "-wal", "-shm"}) {
      std::filesystem::remove(LinuxHost::StatePath() + part);
    }
  }

  void UndoBegin() {
    if (!request.undo) return;
    try {
      request.undo();
    } catch (const std::exception& problem) {
      listener.OnError(problem.what());
      SecPolicy::SecpolicyError(problem.what());
    }
  }

  void ReportUnlabelled(const std::vector<LinuxHost::LabelFailure>& failures) {
    ReportFailures("Unable to label ", failures);
  }

  void ReportPutBack(const LinuxHost::LabelsPutBack& back) {
    ReportFailures("Unable to put the label back of ", back.failures);
  }

  void ReportFailures(const std::string& what,
                      const std::vector<LinuxHost::LabelFailure>& failures) {
    for (const auto& [path, error] : failures) {
      const std::string message = what + path + ": " + std::strerror(error);
      listener.OnLabelFailure(message);
      SecPolicy::SecpolicyError(message);
    }
  }

  void Take(const LoadStep& step) {
    const bool isEarlyPart = step.kind == LoadKind::kEarly && request.steps.size() > 1;
    listener.timing.BeginPart(isEarlyPart ? "early " : "");
    transaction->BeginLoad({.kind = step.kind,
                            .directory = CanonicalName(step.directory),
                            .domains = DefinedDomains(step)});
    try {
      step.load(step.directory, listener);
    } catch (const Braxo::Lib::BraxoException& problem) {
      Fail(problem);
    }
    Add(transaction->EndLoad(WentWell() && !request.keep));
  }

  void Add(LoadEnding part) {
    const auto add = [](LinuxHost::LoadRemainder& sum, LinuxHost::LoadRemainder& more) {
      sum.rules += more.rules;
      sum.domains.insert(sum.domains.end(), more.domains.begin(), more.domains.end());
    };
    add(ending.removed, part.removed);
    add(ending.staying, part.staying);
  }

  RecordedLoad Ending() const {
    const bool onlyThrown = listener.Count() == 0 && !failure.empty();
    return {.verb = request.verb,
            .policyDir = request.policyDir,
            .ending = WentWell() ? "done" : "failed",
            .errors = onlyThrown ? std::vector<std::string>{failure} : listener.Messages()};
  }

  std::string DescribeErrors() const {
    const std::size_t problems = listener.CountProblems();
    if (problems > 0) return " (" + CountOf(problems, "problem") + " above)";
    if (listener.Count() == 0) return "";
    return " (" + CountOf(listener.Count(), "error") + " above)";
  }

  // A domain without a file is named only where all else was removed: worlds run in it.
  void WriteStayingDomains() const {
    for (const std::string& domain : ending.staying.domains) {
      std::cerr << "domain " << Visible(domain)
                << " stays, though no file defines it: worlds run in it" << std::endl;
    }
  }

  std::string DescribeProblemFiles() const {
    if (request.bundle.empty()) return DescribeProblems(listener.Problems(), request.policyDir);
    return DescribeBundleProblems(listener.Problems(), request.bundle,
                                  request.steps.front().directory);
  }

  void WriteProblems() const {
    Attempt([&] { std::cerr << DescribeProblemFiles() << std::flush; });
  }

  ExitCode End(ExitCode code, const std::string& reason, const std::string& summary) const {
    if (request.watcher != nullptr) request.watcher->OnOutcome({code, reason, ending});
    Summarize(request.verb, summary);
    return code;
  }

  ExitCode ReportDone() {
    if (!request.keep) WriteStayingDomains();
    return End(kWell, "", DescribeDone(request.verb) + DescribeRemainder(ending, request.keep));
  }

  // Only a boot gives files their first label, without which the policy's cannot be given.
  std::string Advise() const {
    std::string advice = AdviseOnPrivilege();
    if (!advice.empty() || !isUnbooted || request.dryRun) return advice;
    return "This root was not booted: " + Call("boot") + " labels its files and loads the policy";
  }

  ExitCode ReportFailure() {
    if (!isInstalled) Attempt([&] { RecordUndone(Ending()); });
    WriteProblems();
    const std::string reason = failure.empty() ? "failed" : failure;
    std::string summary = reason + DescribeErrors();
    if (isInstalled) {
      if (!request.dryRun) {
        Attempt([] { std::cerr << "installed now: " + CountInstalled() << std::endl; });
      }
      summary += DescribeUnremoved(ending);
    } else if (hasBegun) {
      summary += "; nothing was installed";
    }
    const std::string next = Advise();
    return End(kFailed, reason, next.empty() ? summary : summary + ". " + next);
  }

  // An exception that left the terminate handler would be an abort without a summary.
  [[noreturn]] void ReportStop(const std::string& missing) {
    std::cout.flush();
    RecordedLoad record = Ending();
    record.ending = "stopped";
    UndoBegin();
    Attempt([&] {
      transaction->Undo();
      RecordUndone(record);
    });
    WriteProblems();
    const std::string stop =
        DescribeStop(NeededDomainsWithout(request.policyDir, missing), request.policyDir);
    _exit(End(kStopped, stop, stop));
  }

  const LoadRequest& request;
  const std::terminate_handler otherwise;
  LoadListener listener;
  std::optional<LinuxHost::PolicyTransaction> transaction;
  std::string failure;
  LoadEnding ending;
  bool isUnbooted = false;
  bool stateIsNew = false;
  bool hasBegun = false;
  bool isInstalled = false;
};

}  // namespace

ExitCode RunLoad(const LoadRequest& request) {
  if (!request.prepare && LinuxHost::IsStateMissing() && !HasPlaceForState()) {
    return RefuseWithoutState(request.verb);
  }
  return LoadRun(request).Run();
}

}  // namespace SecPolicyCli
