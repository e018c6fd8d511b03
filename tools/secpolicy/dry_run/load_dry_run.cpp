#include "load_dry_run.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>

#include "forked.h"
#include "host/linux/common/host_error.h"
#include "host/linux/operation/log_use.h"
#include "host/linux/operation/state_use.h"
#include "host/linux/operation/store_copy.h"
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

// Each as it happens: the load may end the process.
class ErrorFile : public LoadWatcher {
 public:
  explicit ErrorFile(const std::string& path) : file(path, std::ios::binary) {}

  void OnError(const std::string& message) override { file << message << '\0' << std::flush; }

 private:
  std::ofstream file;
};

void WriteLabels(const LinuxHost::NotedLabels& labels, const std::string& path) {
  std::ofstream file(path, std::ios::binary);
  for (const auto& change : labels.Changes()) {
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

std::vector<std::string> ReadErrors(const std::string& path) {
  std::vector<std::string> errors;
  std::ifstream file(path, std::ios::binary);
  for (std::string error; std::getline(file, error, '\0');) errors.push_back(error);
  return errors;
}

std::string ReadAll(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), {}};
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
  const ForkedEnd end = RunForked([&] {
    Redirect(STDOUT_FILENO, scratch.File("output"));
    Redirect(STDERR_FILENO, messageFile);
    const LinuxHost::DroppedLog dropped;
    const LinuxHost::NotedLabels notes(LinuxHost::LabelNotes::kDryRun, scratch.Path());
    const LinuxHost::CopiedSettings settings(scratch.File("config.db"));
    const LinuxHost::UsedState state(StateAfter(), LinuxHost::ShownStatePath());
    LoadRequest dryRun = load;
    dryRun.dryRun = true;
    ErrorFile errorFile(scratch.File("errors"));
    dryRun.watcher = &errorFile;
    const ExitCode code = RunLoad(dryRun);
    WriteLabels(notes, labelFile);
    return code;
  });
  messages = ReadAll(messageFile);
  if (!end.death.empty()) {
    throw std::runtime_error("the dry run of the load died: " + end.death + "\n" + messages);
  }
  ending = end.code;
  errors = ReadErrors(scratch.File("errors"));
  labels = ReadLabels(labelFile);
}

}  // namespace SecPolicyCli
