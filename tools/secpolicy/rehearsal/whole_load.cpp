#include "whole_load.h"

#include <linux/limits.h>
#include <sys/xattr.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <exception>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "forked.h"
#include "host/linux/saved_policy.h"
#include "load_rehearsal.h"
#include "policy_dir.h"
#include "scratch/scratch_directory.h"
#include "scratch/used_state.h"
#include "secpolicy/secpolicy.h"
#include "summary.h"
#include "text/count.h"
#include "zorvan/kernel.h"

namespace SecPolicyCli {
namespace {

constexpr char kAttribute[] = "zorvan.security";

using Labels = std::vector<LinuxHost::LabelChange>;

// Returns how the rehearsal ended when that was not well. Else returns nothing, and `labels`
// becomes what the load is to label.
std::optional<ExitCode> Rehearse(const std::string& policyDir, Labels& labels) {
  LoadRehearsal rehearsal(policyDir);
  if (rehearsal.Ending() == kWell) {
    labels = rehearsal.TakeLabels();
    return std::nullopt;
  }
  std::cerr << rehearsal.Messages() << std::flush;
  Summarize("load",
            "nothing was changed: this was the rehearsal. Without --all-or-nothing, a load "
            "installs what has no errors.");
  return rehearsal.Ending();
}

// What a load is undone with: copies of what it finds, which go with this object.
struct WayBack {
  WayBack() { CopyInstalledState(state); }

  ScratchDirectory scratch;
  std::string state = scratch.File("host.db");
  std::string labels = scratch.File("labels");
};

// Where there was no state, there is to be none; its journal goes with it.
void RemoveState() {
  for (const char* part : {"", "-wal", "-shm"})
    std::filesystem::remove(LinuxHost::StatePath() + part);
}

// Returns why the state cannot be put back; empty when it was.
std::string PutStateBack(const WayBack& back) {
  try {
    if (std::filesystem::exists(back.state)) {
      LinuxHost::RestorePolicy(back.state, LinuxHost::LabelNumbers::kAsSaved);
    } else {
      RemoveState();
    }
    return "";
  } catch (const std::exception& failure) {
    return failure.what();
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
void KeepLabels(const Labels& labels, const std::string& path) {
  std::ofstream file(path, std::ios::binary);
  for (const LinuxHost::LabelChange& change : labels) {
    const auto label = RawLabel(change.path);
    if (label) file << label->size() << ' ' << *label << change.path << '\0';
  }
  file.flush();
  if (!file) throw std::runtime_error("cannot write " + path);
}

// A load may label the place that the way back is in, and replaces labels only. The label goes with
// the files, so that any will do.
void LabelOwnFiles(const WayBack& back) {
  const std::uint32_t id = 0;
  for (const std::string& path : {back.scratch.Path(), back.state, back.labels}) {
    static_cast<void>(Zorvan::Kernel::SetXattr(path.c_str(), kAttribute, &id, sizeof id, 0));
  }
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

// What of the labels was put back, and what of them cannot be.
struct LabelsPutBack {
  std::size_t done = 0;
  std::vector<std::string> failures;
};

void PutLabelBack(const KeptLabel& kept, LabelsPutBack& back) {
  if (Zorvan::Kernel::SetXattr(kept.path.c_str(), kAttribute, kept.value.data(), kept.value.size(),
                               XATTR_REPLACE) == 0) {
    ++back.done;
    return;
  }
  const int error = errno;
  back.failures.push_back("the label of " + kept.path +
                          " cannot be put back: " + std::strerror(error));
}

// Every label that is not as it was: the load may have come to any of the lines about a file.
LabelsPutBack PutLabelsBack(const std::string& path) {
  LabelsPutBack back;
  std::ifstream file(path, std::ios::binary);
  KeptLabel kept;
  while (ReadKept(file, kept)) {
    if (RawLabel(kept.path) != kept.value) PutLabelBack(kept, back);
  }
  return back;
}

void WritePutBack(const std::string& stateFailure, const LabelsPutBack& labels) {
  if (!stateFailure.empty()) {
    Summarize("load", "the state from before cannot be put back: " + stateFailure);
  }
  for (const std::string& failure : labels.failures) Summarize("load", failure);
  if (stateFailure.empty() && labels.failures.empty()) {
    Summarize("load", "failed on the way, so everything was put back as it was (the state, and " +
                          CountOf(labels.done, "file label") + ")");
    return;
  }
  Summarize("load", "failed on the way, and not everything could be put back (above: " +
                        std::string(stateFailure.empty() ? "" : "the state, and ") +
                        CountOf(labels.failures.size(), "file label") +
                        "). Mend that, and load again.");
}

// Writes nothing before all is done: a terminal may keep the writer waiting.
ExitCode PutBack(const WayBack& back, const ForkedEnd& end) {
  // The state tells which attribute carries labels, and may go.
  const LabelsPutBack labels = PutLabelsBack(back.labels);
  const std::string stateFailure = PutStateBack(back);
  if (!end.death.empty()) Summarize("load", "the load died: " + end.death);
  WritePutBack(stateFailure, labels);
  return end.code == kWell ? kFailed : end.code;
}

}  // namespace

ExitCode LoadAllOrNothing(const std::string& policyDir) {
  if (const auto refusal = RefuseMissingDir("load", policyDir)) return *refusal;
  Labels labels;
  if (const auto ending = Rehearse(policyDir, labels)) return *ending;
  // Not the copy of the rehearsal: what has changed since is not the load's to undo.
  const WayBack back;
  InterruptibleChild child;
  const ForkedEnd end = child.Run([&] {
    KeepLabels(labels, back.labels);
    LabelOwnFiles(back);
    return LoadFrom("load", policyDir, SecPolicy::LoadPolicy);
  });
  if (end.death.empty() && end.code == kWell) return kWell;
  return PutBack(back, end);
}

}  // namespace SecPolicyCli
