#include "policy_check.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <optional>
#include <system_error>

#include "check_run.h"
#include "host/linux/common/host_error.h"
#include "host/linux/operation/policy_load.h"
#include "host/linux/operation/state_use.h"
#include "kitlibs/file.h"
#include "policy_dir.h"
#include "refusal.h"
#include "secpolicy/policy_root.h"

namespace SecPolicyCli {
namespace {

// What is checked: a policy directory, and the one file in it that is asked about, if any.
struct Subject {
  std::string dir;
  std::string file;
};

void AddNames(const std::string& dir, const std::string& prefix, std::vector<std::string>& names) {
  if (!File_IsDirectory(dir.c_str())) return;
  std::map<std::string, std::string> files;
  SecPolicy::GetFileList(dir, files);
  for (const auto& [path, name] : files) names.push_back(prefix + name);
}

// As for a load, domains that earlier loads have defined and no file defines any more are not
// there.
void HideOldDomains(LinuxHost::PolicyTransaction& load, const std::string& root) {
  const std::string domains = root + "/" + SecPolicy::kDomainsDir;
  std::vector<std::string> names;
  AddNames(domains, "", names);
  AddNames(domains + "/" + SecPolicy::kPartnersDir, SecPolicy::kPartnerPrefix, names);
  load.BeginLoad({.kind = LinuxHost::LoadKind::kFull, .directory = root, .domains = names});
}

// In the order in which a boot comes to the files. The directories of early boot, partners and
// tardisks may be missing.
void CheckFiles(CheckRun& run, const std::string& root) {
  const std::string domains = root + "/" + SecPolicy::kDomainsDir;
  const std::string earlyDomains = root + "/" + SecPolicy::kEarlyDir + "/" + SecPolicy::kDomainsDir;
  const std::string partners = domains + "/" + SecPolicy::kPartnersDir;
  const std::string tardisks = root + "/" + SecPolicy::kTardisksDir;
  CheckObjects(run, root + "/" + SecPolicy::kObjectsDir);
  if (File_IsDirectory(earlyDomains.c_str())) CheckDomains(run, earlyDomains, "");
  CheckDomains(run, domains, "", SecPolicy::kPartnersDir);
  if (File_IsDirectory(partners.c_str())) CheckDomains(run, partners, SecPolicy::kPartnerPrefix);
  if (File_IsDirectory(tardisks.c_str())) CheckTardisks(run, tardisks);
  CheckFileLabels(run, root + "/" + SecPolicy::kFileLabelsDir);
  CheckUse(run, domains);
}

bool HoldsDomains(const std::filesystem::path& dir) {
  return File_IsDirectory((dir / SecPolicy::kDomainsDir).c_str());
}

// The policy directory that the file belongs to; that of early boot is part of the one above it.
std::optional<Subject> FindPolicyOf(const std::filesystem::path& file) {
  std::filesystem::path dir = file.parent_path();
  while (!HoldsDomains(dir)) {
    if (!dir.has_relative_path()) return std::nullopt;
    dir = dir.parent_path();
  }
  if (dir.filename() == SecPolicy::kEarlyDir && HoldsDomains(dir.parent_path())) {
    dir = dir.parent_path();
  }
  return Subject{.dir = dir, .file = file};
}

std::optional<Subject> FindSubject(const std::string& path) {
  if (File_IsDirectory(path.c_str())) return Subject{.dir = path, .file = ""};
  std::error_code error;
  if (!std::filesystem::is_regular_file(path, error)) return std::nullopt;
  return FindPolicyOf(std::filesystem::absolute(path).lexically_normal());
}

// Takes what is read from `input` for the content of `file`.
void TakeContent(CheckRun& run, const std::string& file, std::istream& input) {
  const std::string content = run.scratch.DirectoryPath() + "/content";
  std::ofstream output(content, std::ios::binary);
  std::copy(std::istreambuf_iterator<char>(input), {}, std::ostreambuf_iterator<char>(output));
  output.flush();
  if (!output) LinuxHost::ThrowErrno("cannot write ", content);
  run.contents.emplace(file, content);
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
  if (request.content != nullptr) TakeContent(run, subject->file, *request.content);
  LinuxHost::PolicyTransaction load(LinuxHost::CurrentState());
  HideOldDomains(load, subject->dir);
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
