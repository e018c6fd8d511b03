#include "policy_check.h"

#include <filesystem>
#include <optional>
#include <system_error>

#include "check_run.h"
#include "host/linux/operation/policy_load.h"
#include "host/linux/operation/state_use.h"
#include "kitlibs/file.h"
#include "policy_dir.h"
#include "refusal.h"
#include "scratch/scratch_state.h"
#include "secpolicy/policy_root.h"

namespace SecPolicyCli {
namespace {

// What is checked: a policy directory, and the one file in it that is asked about, if any.
struct Subject {
  std::string dir;
  std::string file;
};

// In the order in which a boot comes to the files.
void CheckFiles(CheckRun& run, const std::string& root) {
  CheckObjects(run, root + "/" + SecPolicy::kObjectsDir);
  for (const DomainsDir& dir : DomainsDirsOf(root)) CheckDomains(run, dir);
  const std::string tardisks = root + "/" + SecPolicy::kTardisksDir;
  if (File_IsDirectory(tardisks.c_str())) CheckTardisks(run, tardisks);
  CheckFileLabels(run, root + "/" + SecPolicy::kFileLabelsDir);
  CheckUse(run, root + "/" + SecPolicy::kDomainsDir);
}

std::optional<Subject> FindSubject(const std::string& path) {
  if (File_IsDirectory(path.c_str())) return Subject{.dir = path, .file = ""};
  std::error_code error;
  if (!std::filesystem::is_regular_file(path, error)) return std::nullopt;
  const std::filesystem::path file = std::filesystem::absolute(path).lexically_normal();
  const auto dir = FindPolicyOf(file);
  if (!dir) return std::nullopt;
  return Subject{.dir = *dir, .file = file};
}

// A load reads them first.
void RequireUsableSettings(const ScratchState& scratch) {
  if (scratch.IsCopy()) LinuxHost::CopyUsedSettings(scratch.DirectoryPath() + "/settings.db");
}

}  // namespace

CheckReport CheckPolicy(const CheckRequest& request) {
  const std::optional<Subject> subject = FindSubject(request.path);
  if (!subject) {
    throw NoSuchPolicy("there is no policy at " + request.path +
                       " below this root. Name the directory of the policy or a file in it, or "
                       "the root that it is in (--root DIR)." +
                       AdviseOnMissing(request.path));
  }
  if (request.content != nullptr && subject->file.empty()) {
    throw NoSuchPolicy("name the file that standard input holds the content of.");
  }
  CheckRun run(request.fresh, request.unwanted);
  RequireUsableSettings(run.scratch);
  if (request.content != nullptr) TakeContent(run, subject->file, *request.content);
  LinuxHost::PolicyTransaction load(LinuxHost::CurrentState());
  BeginLoadOf(load, subject->dir);
  CheckFiles(run, subject->dir);
  if (!subject->file.empty()) {
    if (!run.diagnostics.Knows(subject->file)) {
      throw NoSuchPolicy("a load does not read " + subject->file +
                         ": it is in none of the directories of a policy.");
    }
    run.diagnostics.KeepFile(subject->file);
  }
  run.diagnostics.Sort();
  run.diagnostics.against = run.scratch.IsCopy() ? "installed" : "boot";
  return {.diagnostics = std::move(run.diagnostics), .whyFresh = run.scratch.WhyNoCopy()};
}

}  // namespace SecPolicyCli
