#include "whole_load.h"

#include <linux/limits.h>
#include <sys/xattr.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <exception>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <optional>
#include <stdexcept>
#include <string>

#include "forked.h"
#include "host/linux/saved_policy.h"
#include "load_rehearsal.h"
#include "policy_dir.h"
#include "scratch/scratch_directory.h"
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

// The bytes that the file carries; empty when it carries nothing, or cannot be read.
std::optional<std::string> RawLabel(const std::string& path) {
  std::array<char, XATTR_SIZE_MAX> value;
  const ssize_t size =
      Zorvan::Kernel::GetXattr(path.c_str(), kAttribute, value.data(), value.size());
  if (size < 0) return std::nullopt;
  return std::string(value.data(), static_cast<std::size_t>(size));
}

// Writes down what the files carry that a load is to label. It labels no file that carries nothing.
void KeepLabels(const LoadRehearsal& rehearsal, const std::string& path) {
  std::ofstream file(path, std::ios::binary);
  for (const LinuxHost::LabelChange& change : rehearsal.Labels()) {
    const auto label = RawLabel(change.path);
    if (label) file << label->size() << ' ' << *label << change.path << '\0';
  }
  file.flush();
  if (!file) throw std::runtime_error("cannot write " + path);
}

struct KeptLabel {
  std::string path;
  std::string value;
};

// False at the end of the file, and where the writer has died.
bool ReadKept(std::istream& file, KeptLabel& kept) {
  std::size_t size = 0;
  if (!(file >> size) || size > XATTR_SIZE_MAX || file.get() != ' ') return false;
  kept.value.resize(size);
  file.read(kept.value.data(), static_cast<std::streamsize>(size));
  return std::getline(file, kept.path, '\0') && !file.eof();
}

bool PutLabelBack(const KeptLabel& kept) {
  if (Zorvan::Kernel::SetXattr(kept.path.c_str(), kAttribute, kept.value.data(), kept.value.size(),
                               XATTR_REPLACE) == 0) {
    return true;
  }
  const int error = errno;
  WriteSummary("the label of " + kept.path + " cannot be put back: " + std::strerror(error));
  return false;
}

struct LabelsPutBack {
  std::size_t done = 0;
  std::size_t failed = 0;
};

// Every label that is not as it was: the load may have come to any of the lines about a file.
LabelsPutBack PutLabelsBack(const std::string& path) {
  LabelsPutBack back;
  std::ifstream file(path, std::ios::binary);
  KeptLabel kept;
  while (ReadKept(file, kept)) {
    if (RawLabel(kept.path) == kept.value) continue;
    ++(PutLabelBack(kept) ? back.done : back.failed);
  }
  return back;
}

ExitCode PutBack(const LoadRehearsal& rehearsal, const std::string& labelFile, ExitCode code) {
  const bool isStateBack = PutStateBack(rehearsal);
  const LabelsPutBack labels = PutLabelsBack(labelFile);
  if (isStateBack && labels.failed == 0) {
    WriteSummary("failed on the way, so everything was put back as it was (the state, and " +
                 CountOf(labels.done, "file label") + ")");
  } else {
    WriteSummary("failed on the way, and not everything could be put back (above: " +
                 std::string(isStateBack ? "" : "the state, and ") +
                 CountOf(labels.failed, "file label") + "). Mend that, and load again.");
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
  const ScratchDirectory scratch;
  const std::string labelFile = scratch.File("labels");
  const InterruptsIgnored interrupts;
  const ForkedEnd end = RunForked([&] {
    interrupts.Restore();
    KeepLabels(rehearsal, labelFile);
    return LoadFrom("load", policyDir, SecPolicy::LoadPolicy);
  });
  if (!end.death.empty()) WriteSummary("the load died: " + end.death);
  return end.death.empty() && end.code == kWell ? kWell : PutBack(rehearsal, labelFile, end.code);
}

}  // namespace SecPolicyCli
