#include "load/load_run.h"

#include <signal.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <exception>
#include <filesystem>
#include <iostream>
#include <map>
#include <optional>
#include <string_view>

#include "error_watch.h"
#include "host/linux/operation/label_journal.h"
#include "host/linux/operation/noted_labels.h"
#include "host/linux/operation/state_use.h"
#include "load/load_record.h"
#include "load/load_summary.h"
#include "root.h"
#include "secpolicy/policy_root.h"
#include "secpolicy/secpolicy.h"
#include "summary.h"
#include "text/count.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

using LinuxHost::LoadEnding;
using LinuxHost::LoadKind;
using LinuxHost::NotedLabels;

// The library's last words before it stops a load, and the domain that each is about.
struct WellKnownDomain {
  std::string_view message;
  std::string_view name;
};

constexpr WellKnownDomain kWellKnownDomains[] = {
    {"Failed to fetch domainID for global VM Domain", "globalVMDom"},
    {"Failed to fetch domainID for IOFilter domain", "ioFilterDom"},
    {"Failed to fetch domainID for default tar disk domain", "appDom"},
    {"Failed to fetch domainID for daemon framework domain", "daemonFrameworkDom"},
};

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
    AddNames(SecPolicy::kPartnerDomainsDir, SecPolicy::kPartnerPrefix, names);
  }
  return names;
}

// What asks the process to end waits until the labels are given and the load is committed, or both
// are undone; so does that nobody reads the messages.
class BlockedSignals {
 public:
  BlockedSignals() {
    sigset_t signals;
    sigemptyset(&signals);
    for (const int signal : {SIGINT, SIGTERM, SIGHUP, SIGQUIT, SIGPIPE})
      sigaddset(&signals, signal);
    sigprocmask(SIG_BLOCK, &signals, &before);
  }
  BlockedSignals(const BlockedSignals&) = delete;
  BlockedSignals& operator=(const BlockedSignals&) = delete;
  ~BlockedSignals() { sigprocmask(SIG_SETMASK, &before, nullptr); }

 private:
  sigset_t before;
};

class LoadRun;

// A terminate handler cannot be handed anything.
LoadRun* running = nullptr;

class LoadRun {
 public:
  explicit LoadRun(const LoadRequest& wanted)
      : request(wanted), otherwise(std::set_terminate(OnTerminate)) {
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
      transaction.reset();
      Fail(raised);
    }
    std::cout.flush();
    return WentWell() ? ReportDone() : ReportFailure();
  }

 private:
  // The library stops a load by rethrowing while no exception is being handled. Whatever else ends
  // the process keeps its usual way, core dump included.
  static void OnTerminate() {
    const std::vector<std::string>& messages = running->errors.Messages();
    if (!std::current_exception() && !messages.empty()) {
      for (const WellKnownDomain& domain : kWellKnownDomains) {
        if (messages.back() == domain.message) running->ReportStop(domain.name);
      }
    }
    running->otherwise();
    std::abort();
  }

  void Fail(const std::exception& reason) {
    failure = reason.what();
    if (failure.empty()) failure = "failed";
  }

  bool WentWell() const { return failure.empty() && errors.Count() == 0; }

  void Install() {
    LoadTiming timing(request.timing);
    if (request.mend) request.mend();
    if (!request.dryRun) PutBackLeftOver();
    if (request.prepare) request.prepare(timing);
    stateIsNew = LinuxHost::IsStateMissing();
    transaction.emplace();
    hasBegun = true;
    if (request.begin) request.begin();
    // A number on a file is to be one that the state knows.
    std::optional<NotedLabels> labels;
    if (!request.dryRun) labels.emplace(LinuxHost::LabelNotes::kForLater);
    for (const LoadStep& step : request.steps) Take(step, timing);
    if (request.allOrNothing && labels) {
      InstallAllOrNothing(*labels);
    } else {
      Commit();
      if (labels) GiveLabels(*labels);
    }
    timing.EndPhase("file labels");
  }

  // A load that was killed while it gave labels, all of them or none, has left them half done.
  static void PutBackLeftOver() {
    if (LinuxHost::IsStateMissing()) return;
    const auto back = LinuxHost::LabelJournal::PutBackLeftOver(LinuxHost::StatePath());
    if (!back) return;
    Summarize("load", "a load before this one was killed, so " +
                          CountOf(back->count, "file label") + " were put back first");
    ReportPutBack(*back);
  }

  // A file without its label is an error of a load that was well until then.
  void GiveLabels(const NotedLabels& labels) {
    const std::vector<LinuxHost::LabelFailure> failures = labels.Apply();
    if (failures.empty()) return;
    ReportUnlabelled(failures);
    RecordLoad(Ending(), ending);
  }

  void Commit() {
    RecordLoad(Ending(), ending);
    transaction->Commit();
    isInstalled = true;
  }

  // The labels come before the commit: they can be taken back, and the commit cannot.
  void InstallAllOrNothing(const NotedLabels& labels) {
    if (!WentWell()) return transaction.reset();
    const BlockedSignals blocked;
    LinuxHost::LabelJournal journal(LinuxHost::StatePath());
    try {
      journal.Keep(labels);
      ReportUnlabelled(labels.Apply());
      if (WentWell()) return Commit();
    } catch (const std::exception&) {
      ReportPutBack(journal.PutBack());
      throw;
    }
    transaction.reset();
    ReportPutBack(journal.PutBack());
  }

  // All or nothing leaves no trace of itself. Where there was no state, there is to be none; its
  // journal goes with it.
  void RecordUndone(const RecordedLoad& record) const {
    if (!request.allOrNothing) return RecordEnding(record);
    if (!stateIsNew) return;
    for (const char* part : {"", "-wal", "-shm"}) {
      std::filesystem::remove(LinuxHost::StatePath() + part);
    }
  }

  static void ReportUnlabelled(const std::vector<LinuxHost::LabelFailure>& failures) {
    ReportFailures("Unable to label ", failures);
  }

  static void ReportPutBack(const LinuxHost::LabelsPutBack& back) {
    ReportFailures("Unable to put the label back of ", back.failures);
  }

  static void ReportFailures(const std::string& what,
                             const std::vector<LinuxHost::LabelFailure>& failures) {
    for (const auto& [path, error] : failures) {
      SecPolicy::SecpolicyError(what + path + ": " + std::strerror(error));
    }
  }

  void Take(const LoadStep& step, LoadTiming& timing) {
    const bool isEarlyPart = step.kind == LoadKind::kEarly && request.steps.size() > 1;
    timing.BeginPart(isEarlyPart ? "early " : "");
    transaction->BeginLoad({.kind = step.kind,
                            .directory = CanonicalName(step.directory),
                            .domains = DefinedDomains(step)});
    try {
      step.load(step.directory);
    } catch (const Braxo::Lib::BraxoException& problem) {
      Fail(problem);
    }
    Add(transaction->EndLoad(WentWell() && !request.keep));
    if (isEarlyPart) earlyErrors = errors.Count();
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
    const bool onlyThrown = errors.Count() == 0 && !failure.empty();
    return {.verb = request.verb,
            .policyDir = request.policyDir,
            .ending = WentWell() ? "done" : "failed",
            .errors = onlyThrown ? std::vector<std::string>{failure} : errors.Messages()};
  }

  // A domain without a file is named only where all else was removed: worlds run in it.
  void WriteStayingDomains() const {
    for (const std::string& domain : ending.staying.domains) {
      std::cerr << "domain " << Visible(domain)
                << " stays, though no file defines it: worlds run in it" << std::endl;
    }
  }

  ExitCode ReportDone() {
    if (!request.keep) WriteStayingDomains();
    Summarize(request.verb, DescribeDone(request.verb) + DescribeRemainder(ending, request.keep));
    return kWell;
  }

  ExitCode ReportFailure() {
    if (!isInstalled) Attempt([&] { RecordUndone(Ending()); });
    Attempt([&] { WriteErrorsByFile(errors.Messages(), earlyErrors, request.policyDir); });
    std::string summary = failure.empty() ? "failed" : failure;
    if (errors.Count() > 0) summary += " (" + CountOf(errors.Count(), "error") + " above)";
    if (isInstalled) {
      if (!request.dryRun) {
        Attempt([] { std::cerr << "installed now: " + CountInstalled() << std::endl; });
      }
      summary += DescribeRemainder(ending, request.keep);
    } else if (hasBegun) {
      summary += "; nothing was installed";
    }
    const std::string next = AdviseOnPrivilege();
    Summarize(request.verb, next.empty() ? summary : summary + ". " + next);
    return kFailed;
  }

  // An exception that left the terminate handler would be an abort without a summary.
  [[noreturn]] void ReportStop(std::string_view missing) {
    std::cout.flush();
    RecordedLoad record = Ending();
    record.ending = "stopped";
    Attempt([&] {
      transaction->Undo();
      RecordUndone(record);
    });
    Attempt([&] { WriteErrorsByFile(errors.Messages(), earlyErrors, request.policyDir); });
    const std::string name(missing);
    Summarize(request.verb, "stopped: there is no domain " + name +
                                ", so nothing was installed. Put a policy file named " + name +
                                " into " + request.policyDir + "/domains and run it again.");
    _exit(kStopped);
  }

  const LoadRequest& request;
  const std::terminate_handler otherwise;
  ErrorWatch errors{std::cerr};
  std::optional<LinuxHost::PolicyTransaction> transaction;
  std::size_t earlyErrors = 0;
  std::string failure;
  LoadEnding ending;
  bool stateIsNew = false;
  bool hasBegun = false;
  bool isInstalled = false;
};

}  // namespace

ExitCode RunLoad(const LoadRequest& request) { return LoadRun(request).Run(); }

}  // namespace SecPolicyCli
