#include "whole_load.h"

#include <sys/xattr.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <exception>
#include <filesystem>
#include <iostream>

#include "forked.h"
#include "host/linux/saved_policy.h"
#include "load_rehearsal.h"
#include "policy_dir.h"
#include "scratch/used_state.h"
#include "secpolicy/secpolicy.h"
#include "text/count.h"
#include "zorvan/kernel.h"

namespace SecPolicyCli {
namespace {

constexpr char kAttribute[] = "zorvan.security";

void WriteSummary(const std::string& text) {
  std::cerr << "secpolicy: load: " << text << std::endl;
}

// What a terminal sends to a whole group of processes is to end the load, and not what puts
// everything back after it.
class InterruptsIgnored {
 public:
  InterruptsIgnored() {
    for (std::size_t index = 0; index < kSignals.size(); ++index) {
      before[index] = std::signal(kSignals[index], SIG_IGN);
    }
  }
  InterruptsIgnored(const InterruptsIgnored&) = delete;
  InterruptsIgnored& operator=(const InterruptsIgnored&) = delete;
  ~InterruptsIgnored() { Restore(); }

  // For the child.
  void Restore() const {
    for (std::size_t index = 0; index < kSignals.size(); ++index) {
      static_cast<void>(std::signal(kSignals[index], before[index]));
    }
  }

 private:
  static constexpr std::array kSignals = {SIGINT, SIGTERM, SIGHUP, SIGQUIT};
  std::array<void (*)(int), kSignals.size()> before{};
};

// Where nothing was installed, the host makes the state that a boot starts from.
void MakeIfMissing(const std::string& path) {
  if (std::filesystem::exists(path)) return;
  const UsedState used(path);
  const SecPolicy::TeskAccessInterfaceImpl access;
}

bool PutStateBack(const LoadRehearsal& rehearsal) {
  try {
    MakeIfMissing(rehearsal.StateBefore());
    LinuxHost::RestorePolicy(rehearsal.StateBefore(), LinuxHost::LabelNumbers::kAsSaved);
    return true;
  } catch (const std::exception& failure) {
    WriteSummary(std::string("the state from before cannot be put back: ") + failure.what());
    return false;
  }
}

bool Carries(const std::string& path, std::uint32_t label) {
  std::uint32_t id = 0;
  return Zorvan::Kernel::GetXattr(path.c_str(), kAttribute, &id, sizeof id) == sizeof id &&
         id == label;
}

bool PutLabelBack(const LinuxHost::LabelChange& change) {
  if (Zorvan::Kernel::SetXattr(change.path.c_str(), kAttribute, &change.before,
                               sizeof change.before, XATTR_REPLACE) == 0) {
    return true;
  }
  const int error = errno;
  WriteSummary("the label of " + change.path + " cannot be put back: " + std::strerror(error));
  return false;
}

struct LabelsPutBack {
  std::size_t done = 0;
  bool isAll = true;
};

// Only the labels that the load has come to.
LabelsPutBack PutLabelsBack(const LoadRehearsal& rehearsal) {
  LabelsPutBack back;
  for (const LinuxHost::LabelChange& change : rehearsal.Labels()) {
    if (!Carries(change.path, change.after)) continue;
    if (PutLabelBack(change)) {
      ++back.done;
    } else {
      back.isAll = false;
    }
  }
  return back;
}

ExitCode PutBack(const LoadRehearsal& rehearsal, ExitCode code) {
  const bool isStateBack = PutStateBack(rehearsal);
  const LabelsPutBack labels = PutLabelsBack(rehearsal);
  if (isStateBack && labels.isAll) {
    WriteSummary("failed on the way, so everything was put back as it was (the state, and " +
                 CountOf(labels.done, "file label") + ")");
  } else {
    WriteSummary(
        "failed on the way, and not everything could be put back (above). Mend that, and "
        "load again.");
  }
  return code == kWell ? kFailed : code;
}

}  // namespace

ExitCode LoadAllOrNothing(const std::string& policyDir) {
  if (const auto refusal = RefuseMissingDir("load", policyDir)) return *refusal;
  const LoadRehearsal rehearsal(policyDir);
  if (rehearsal.Ending() != kWell) {
    std::cerr << rehearsal.Messages() << std::flush;
    WriteSummary(
        "nothing was changed: this was the rehearsal. Without --all-or-nothing, a load "
        "installs what has no errors.");
    return rehearsal.Ending();
  }
  const InterruptsIgnored interrupts;
  const ForkedEnd end = RunForked([&] {
    interrupts.Restore();
    return LoadFrom("load", policyDir, SecPolicy::LoadPolicy);
  });
  if (!end.death.empty()) WriteSummary("the load died: " + end.death);
  return end.death.empty() && end.code == kWell ? kWell : PutBack(rehearsal, end.code);
}

}  // namespace SecPolicyCli
