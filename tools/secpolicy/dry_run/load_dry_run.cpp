#include "load_dry_run.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>
#include <stdexcept>
#include <utility>

#include "forked.h"
#include "host/linux/common/host_error.h"
#include "host/linux/operation/log_use.h"
#include "host/linux/operation/state_use.h"
#include "host/linux/operation/store_copy.h"
#include "load/full_load.h"
#include "policy_dir.h"
#include "root.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {
namespace {

[[noreturn]] void ThrowForbidden() {
  throw std::runtime_error("this user may not read the installed state " + LinuxHost::StatePath());
}

void Redirect(int descriptor, const std::string& path) {
  const int file = open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
  if (file < 0 || dup2(file, descriptor) < 0) {
    LinuxHost::ThrowErrno("cannot write ", path);
  }
  close(file);
}

std::string Replaced(std::string text, const std::string& old, const std::string& other) {
  for (std::size_t at = text.find(old); at != std::string::npos;
       at = text.find(old, at + other.size())) {
    text.replace(at, old.size(), other);
  }
  return text;
}

// Each as it happens: the load may end the process. Who watches the load itself is told why it will
// not come to that.
class ErrorFile : public LoadWatcher {
 public:
  // The files are in `directory` where the load would have them in its own.
  ErrorFile(const std::string& path, const LoadRequest& wanted, std::string directory)
      : file(path, std::ios::binary), load(wanted), unpacked(std::move(directory)) {}

  void OnError(const std::string& message) override { file << message << '\0' << std::flush; }

  void OnProblem(const SecPolicy::Problem& problem) override {
    if (load.watcher == nullptr) return;
    SecPolicy::Problem told = problem;
    told.file = Replaced(problem.file, unpacked, load.policyDir);
    load.watcher->OnProblem(told);
  }

  void OnOutcome(const LoadOutcome& outcome) override {
    if (load.watcher != nullptr && outcome.code != kWell) load.watcher->OnOutcome(outcome);
  }

 private:
  std::ofstream file;
  const LoadRequest& load;
  const std::string unpacked;
};

// But for files that are only there for the dry run, below `own`.
void WriteLabels(const LinuxHost::NotedLabels& labels, const std::string& own,
                 const std::string& path) {
  std::ofstream file(path, std::ios::binary);
  for (const auto& change : labels.Changes()) {
    if (change.path.starts_with(own)) continue;
    file << change.before << ' ' << change.after << ' ' << change.path << '\0';
  }
  file.flush();
  if (!file) throw std::runtime_error("cannot write " + path);
}

// A load that was stopped has not come to the labels, and has left no file.
std::vector<LinuxHost::LabelChange> ReadLabels(const std::string& path) {
  std::vector<LinuxHost::LabelChange> changes;
  std::ifstream file(path, std::ios::binary);
  LinuxHost::LabelChange change;
  while (file >> change.before >> change.after && file.get() == ' ' &&
         std::getline(file, change.path, '\0')) {
    changes.push_back(change);
  }
  return changes;
}

std::string ReadAll(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), {}};
}

// What was told in a dry run, with its files in `directory` where the load would have them.
std::string ReadTold(const std::string& path, const std::string& directory,
                     const std::string& place) {
  return Replaced(ReadAll(path), directory, place);
}

std::vector<std::string> SplitErrors(const std::string& text) {
  std::vector<std::string> errors;
  std::istringstream stream(text);
  for (std::string error; std::getline(stream, error, '\0');) errors.push_back(error);
  return errors;
}

}  // namespace

LoadDryRun::LoadDryRun(const LoadRequest& load) {
  if (LinuxHost::CopyUsedState(StateBefore()) == LinuxHost::StateCopy::kForbidden) ThrowForbidden();
  // Both are of the same moment.
  if (std::filesystem::exists(StateBefore())) {
    LinuxHost::CopyDatabase(StateBefore(), LinuxHost::CopyOf::kOwnCopy, StateAfter());
  }
  const std::string messageFile = scratch.File("messages");
  const std::string labelFile = scratch.File("labels");
  const std::string unpacked = scratch.File("policy");
  const ForkedEnd end = RunForked([&] {
    Redirect(STDOUT_FILENO, scratch.File("output"));
    Redirect(STDERR_FILENO, messageFile);
    const LinuxHost::DroppedLog dropped;
    const LinuxHost::NotedLabels notes(LinuxHost::LabelNotes::kDryRun, scratch.Path());
    const LinuxHost::CopiedSettings settings(scratch.File("config.db"));
    const LinuxHost::UsedState state(StateAfter(), LinuxHost::ShownStatePath());
    LoadRequest dryRun = load;
    dryRun.dryRun = true;
    if (load.unpack) {
      load.unpack(unpacked);
      dryRun.steps = OwnLoad(unpacked);
    }
    ErrorFile errorFile(scratch.File("errors"), load, unpacked);
    dryRun.watcher = &errorFile;
    const ExitCode code = RunLoad(dryRun);
    if (code == kWell || !load.allOrNothing) WriteLabels(notes, scratch.File(""), labelFile);
    return code;
  });
  messages = ReadTold(messageFile, unpacked, load.policyDir);
  if (!end.death.empty()) {
    throw std::runtime_error("the dry run of the load died: " + end.death + "\n" + messages);
  }
  ending = end.code;
  errors = SplitErrors(ReadTold(scratch.File("errors"), unpacked, load.policyDir));
  labels = ReadLabels(labelFile);
}

}  // namespace SecPolicyCli
