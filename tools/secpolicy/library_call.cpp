#include "library_call.h"

#include <unistd.h>

#include <cstdlib>
#include <exception>
#include <iostream>
#include <string_view>

#include "error_watch.h"
#include "host/linux/noted_labels.h"
#include "load_record.h"
#include "load_summary.h"
#include "summary.h"
#include "text/count.h"

namespace SecPolicyCli {
namespace {

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

// What the terminate handler has to know; it cannot be handed anything.
struct RunningCall {
  std::string verb;
  std::string policyDir;
  const ErrorWatch* errors;
  std::size_t earlyErrors = 0;
  std::terminate_handler otherwise;
};

RunningCall* runningCall = nullptr;

// A call without a policy directory is no load.
void Record(const RunningCall& call, const std::string& ending,
            const std::vector<std::string>& errors) {
  if (!call.policyDir.empty()) RecordLoad(call.verb, call.policyDir, ending, errors);
}

// Takes a step that only explains the summary after it, which is written whatever happens.
template <class Step>
void Attempt(Step step) {
  try {
    step();
  } catch (const std::exception&) {
    return;  // what is wrong has been said
  }
}

void WriteErrorsByFile(const RunningCall& call) {
  if (call.policyDir.empty()) return;
  SecPolicyCli::WriteErrorsByFile(call.errors->Messages(), call.earlyErrors, call.policyDir);
}

// A load carries on after an error, so what is installed is seldom what was before.
void WriteInstalled(const RunningCall& call) {
  if (call.policyDir.empty() || LinuxHost::IsRehearsing()) return;
  std::cerr << "installed now: " + CountInstalled() << std::endl;
}

// What is done is done, also when it cannot be counted.
std::string Describe(const std::string& verb, const std::function<std::string()>& ending) {
  if (!ending) return "done";
  try {
    return ending();
  } catch (const std::exception& failure) {
    Summarize(verb, std::string("what is installed cannot be counted: ") + failure.what());
    return "done";
  }
}

// An exception that left the terminate handler would be an abort without a summary.
[[noreturn]] void EndStopped(const RunningCall& running, std::string_view missing) {
  std::cout.flush();
  Record(running, "stopped", running.errors->Messages());
  Attempt([&] { WriteErrorsByFile(running); });
  const std::string name(missing);
  Summarize(running.verb,
            "stopped: there is no domain " + name +
                ", so the load ended before tardisks and file labels. Put a policy file named " +
                name + " into " + running.policyDir + "/domains and run it again.");
  _exit(kStopped);
}

// The library stops a load by rethrowing while no exception is being handled. Whatever else ends
// the process keeps its usual way, core dump included.
void OnTerminate() {
  const RunningCall& running = *runningCall;
  const std::vector<std::string>& messages = running.errors->Messages();
  if (!std::current_exception() && !messages.empty()) {
    for (const WellKnownDomain& domain : kWellKnownDomains) {
      if (messages.back() == domain.message) EndStopped(running, domain.name);
    }
  }
  running.otherwise();
  std::abort();
}

// Puts OnTerminate in place for the time of one call.
class TerminateGuard {
 public:
  explicit TerminateGuard(RunningCall& running) {
    runningCall = &running;
    running.otherwise = std::set_terminate(OnTerminate);
  }
  TerminateGuard(const TerminateGuard&) = delete;
  TerminateGuard& operator=(const TerminateGuard&) = delete;
  ~TerminateGuard() {
    std::set_terminate(runningCall->otherwise);
    runningCall = nullptr;
  }
};

}  // namespace

ExitCode CallLibrary(const std::string& verb, const std::string& policyDir,
                     const std::function<void()>& call, const std::function<std::string()>& advice,
                     const std::function<std::string()>& ending) {
  std::string failure;
  ErrorWatch errors(std::cerr);
  RunningCall running{
      .verb = verb, .policyDir = policyDir, .errors = &errors, .otherwise = nullptr};
  const TerminateGuard guard(running);
  try {
    call();
  } catch (const std::exception& raised) {
    failure = raised.what();
    if (failure.empty()) failure = "failed";
  }
  std::cout.flush();
  if (failure.empty() && errors.Count() == 0) {
    Record(running, "done", {});
    Summarize(verb, Describe(verb, ending));
    return kWell;
  }
  Record(running, "failed",
         errors.Count() > 0 ? errors.Messages() : std::vector<std::string>{failure});
  Attempt([&] { WriteErrorsByFile(running); });
  Attempt([&] { WriteInstalled(running); });
  std::string summary = failure.empty() ? "failed" : failure;
  if (errors.Count() > 0) summary += " (" + CountOf(errors.Count(), "error") + " above)";
  const std::string next = advice();
  Summarize(verb, next.empty() ? summary : summary + ". " + next);
  return kFailed;
}

void EndEarlyLoad() { runningCall->earlyErrors = runningCall->errors->Count(); }

ExitCode Refuse(const std::string& verb, const std::string& why) {
  Summarize(verb, why);
  return kFailed;
}

ExitCode RefuseWithoutState(const std::string& verb) {
  return Refuse(verb,
                "nothing is installed below this root. Name the root that was booted (--root "
                "DIR), or run 'secpolicy boot' first.");
}

}  // namespace SecPolicyCli
