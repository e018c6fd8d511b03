#include <chrono>
#include <csignal>
#include <ctime>
#include <exception>
#include <iostream>
#include <map>
#include <thread>

#include "explainer.h"
#include "host/enforce/module/event_reader.h"
#include "host/linux/operation/state_use.h"
#include "options.h"
#include "output.h"
#include "process_paths.h"
#include "root.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyLog {
namespace {

using namespace std::chrono_literals;
using SecPolicyCli::GatheredRefusal;

constexpr auto kLongestWait = 1000ms;
constexpr auto kWaitForMore = 100ms;

// While there is a flood, the kernel wakes nobody up, and what comes meanwhile has room.
constexpr auto kNap = 10ms;

volatile std::sig_atomic_t isToEnd = 0;

void EndSoon(int /*signal*/) { isToEnd = 1; }

void HandleSignals() {
  struct sigaction action = {};
  action.sa_handler = EndSoon;
  sigaction(SIGINT, &action, nullptr);
  sigaction(SIGTERM, &action, nullptr);
}

// As events count.
std::uint64_t Now() {
  timespec now = {};
  clock_gettime(CLOCK_BOOTTIME, &now);
  return static_cast<std::uint64_t>(now.tv_sec) * 1'000'000'000 +
         static_cast<std::uint64_t>(now.tv_nsec);
}

class Log {
 public:
  explicit Log(bool isJson)
      : output(isJson), reader([this](const Enforce::ModuleEvent& event, std::string_view path) {
          Take(event, path);
        }) {}

  void TellAllThereIs() {
    reader.Drain();
    Tell(gathering.TakeAll());
  }

  // Until a signal comes, or the module ends.
  void Follow() {
    NoteUntold();
    while (isToEnd == 0 && reader.IsOfRunningModule()) {
      reader.Wait(gathering.IsEmpty() ? kLongestWait : kWaitForMore);
      std::this_thread::sleep_for(kNap);
      Tell(gathering.TakeUntil(Now()));
    }
    TellAllThereIs();
  }

 private:
  void Take(const Enforce::ModuleEvent& event, std::string_view path) {
    // The module's own test of the kernel.
    if (event.domain == Enforce::kCanaryDomain) return;
    GatheredRefusal* const begun = gathering.Add(event, path);
    if (begun != nullptr) AddProgramPaths(*begun);
  }

  void Tell(const std::vector<GatheredRefusal>& refusals) {
    if (refusals.empty()) return;
    for (const GatheredRefusal& refusal : refusals) {
      if (const auto explained = explainer.Explain(refusal)) output.Tell(*explained);
    }
    for (const auto& [domain, count] : TakeUntold())
      output.TellUntold(explainer.NameOfDomain(domain), count);
    output.Flush();
  }

  // What came before is nobody's to tell.
  void NoteUntold() {
    for (unsigned int domain = 0; domain < Enforce::kModuleDomains; ++domain)
      untold[domain] = reader.UntoldIn(domain);
  }

  // Both what the kernel had no room for and what was too much here.
  std::map<unsigned int, std::uint64_t> TakeUntold() {
    std::map<unsigned int, std::uint64_t> taken = gathering.TakeExcess();
    for (unsigned int domain = 0; domain < Enforce::kModuleDomains; ++domain) {
      const std::uint64_t now = reader.UntoldIn(domain);
      if (now > untold[domain]) taken[domain] += now - untold[domain];
      untold[domain] = now;
    }
    return taken;
  }

  Explainer explainer;
  SecPolicyCli::Gathering gathering;
  Output output;
  Enforce::EventReader reader;
  std::map<unsigned int, std::uint64_t> untold;
};

int Run(int argc, char** argv) {
  int exitCode = SecPolicyCli::kWell;
  const auto options = ReadOptions(argc, argv, &exitCode);
  if (!options) return exitCode;
  try {
    HandleSignals();
    Log log(options->isJson);
    options->isOnce ? log.TellAllThereIs() : log.Follow();
    return SecPolicyCli::kWell;
  } catch (const std::exception& failure) {
    std::cerr << "secpolicy-log: "
              << SecPolicyCli::VisibleLines(SecPolicyCli::WithAdvice(failure.what())) << std::endl;
    return SecPolicyCli::kFailed;
  }
}

}  // namespace
}  // namespace SecPolicyLog

int main(int argc, char** argv) {
  LinuxHost::OwnProcess();
  return SecPolicyLog::Run(argc, argv);
}
