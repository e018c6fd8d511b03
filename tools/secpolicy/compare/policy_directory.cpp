#include "policy_directory.h"

#include <filesystem>
#include <string_view>
#include <utility>

#include "host/linux/operation/policy_load.h"
#include "host/linux/operation/state_use.h"
#include "kitlibs/file.h"
#include "scratch/scratch_state.h"
#include "secpolicy/observed/loading.h"
#include "secpolicy/policy_root.h"

namespace SecPolicyCli {
namespace {

using SecPolicy::TeskAccessInterfaceImpl;

// As a load takes its parts: one that fails is reported. Returns whether it succeeded.
template <class Part>
bool Try(Part part) {
  try {
    part();
    return true;
  } catch (const Braxo::Lib::BraxoException& failure) {
    SecPolicy::SecpolicyError(failure.what());
    return false;
  }
}

std::map<std::string, std::string> FilesOf(const std::string& dir) {
  std::map<std::string, std::string> files;
  SecPolicy::GetFileList(dir, files);
  return files;
}

// Tells of the partner domains' own files in `dir`, and not of their copies.
class PartnerObserver : public SecPolicy::PolicyObserver {
 public:
  PartnerObserver(std::string partnerDir, SecPolicy::PolicyObserver& told)
      : dir(std::move(partnerDir)), observer(told) {}

  void OnError(const std::string& message) override { observer.OnError(message); }

  void OnProblem(const SecPolicy::Problem& problem) override {
    constexpr std::string_view kPrefix = SecPolicy::kPartnerPrefix;
    const std::string copy = std::filesystem::path(problem.file).filename();
    SecPolicy::Problem ofFile = problem;
    ofFile.file = copy.starts_with(kPrefix) ? dir + "/" + copy.substr(kPrefix.size()) : dir;
    observer.OnProblem(ofFile);
  }

 private:
  const std::string dir;
  SecPolicy::PolicyObserver& observer;
};

// Tells the load, too, in which lines rules about paths are.
class PlaceObserver : public SecPolicy::PolicyObserver {
 public:
  PlaceObserver(LinuxHost::PolicyTransaction& followed, SecPolicy::PolicyObserver& told)
      : load(followed), observer(told) {}

  void OnError(const std::string& message) override { observer.OnError(message); }
  void OnProblem(const SecPolicy::Problem& problem) override { observer.OnProblem(problem); }
  void OnPathRule(const TeskCtl::Security::TeskAccess_FilePathAccessRule& rule) override {
    load.SetLine(rule.line);
  }

 private:
  LinuxHost::PolicyTransaction& load;
  SecPolicy::PolicyObserver& observer;
};

// The library names partner domains so only where the host's own lie; a copy of the files under the
// full names does it anywhere.
void InstallPartners(const std::string& dir, const std::string& copies,
                     TeskAccessInterfaceImpl& access, SecPolicy::PolicyObserver& observer) {
  std::filesystem::create_directory(copies);
  for (const auto& [path, name] : FilesOf(dir)) {
    std::filesystem::copy_file(path, copies + "/" + SecPolicy::kPartnerPrefix + name);
  }
  PartnerObserver ofPartners(dir, observer);
  SecPolicy::LoadPolicyDomains(copies, access, ofPartners);
}

void ReadLabels(const std::string& dir, WrittenPolicy& written, TeskAccessInterfaceImpl& access,
                SecPolicy::PolicyObserver& observer) {
  SecPolicy::FileLabelPolicy policy;
  for (const auto& [path, name] : FilesOf(dir)) {
    written.isClean &= Try([&, &file = path] { policy.ParsePolicy(file, access, observer); });
  }
  for (const SecPolicy::FileLabel& line : policy.fileLabels) {
    written.labels[line.path + (line.recursive ? "/*" : "")] = line.label;
    written.labelLines.push_back({.path = line.path,
                                  .isTree = line.recursive,
                                  .label = line.label,
                                  .file = line.policyFile,
                                  .line = line.lineNumber});
  }
}

// Rules of partner domains are in the files that were copied, and not where a host has them.
void NamePartnerFiles(const std::string& partnerDir, Policy::InstalledPolicy& policy) {
  constexpr std::string_view kPrefix = SecPolicy::kPartnerPrefix;
  for (Policy::InstalledDomain& domain : policy.domains) {
    if (!domain.name.starts_with(kPrefix)) continue;
    const std::string file = partnerDir + "/" + domain.name.substr(kPrefix.size());
    for (Policy::Rule& rule : domain.rules) rule.origin.file = file;
  }
}

// Installs the objects and domains of `dir`, with partner domains whose copies are made in
// `copies`.
void Install(const std::string& dir, const std::string& partnerDir, const std::string& copies,
             WrittenPolicy& written, TeskAccessInterfaceImpl& access,
             SecPolicy::PolicyObserver& observer) {
  LinuxHost::PolicyTransaction load(LinuxHost::CurrentState());
  PlaceObserver places(load, observer);
  const auto step = [&](auto part) { written.isClean &= Try(part); };

  const std::string early = dir + "/" + SecPolicy::kEarlyDir;
  const std::string earlyDomains = early + "/" + SecPolicy::kDomainsDir;
  step([&] { SecPolicy::LoadPolicyObjects(dir + "/" + SecPolicy::kObjectsDir, access, places); });
  if (File_IsDirectory(earlyDomains.c_str())) {
    load.BeginLoad({.kind = LinuxHost::LoadKind::kEarly, .directory = early, .domains = {}});
    step([&] { SecPolicy::LoadPolicyDomains(earlyDomains, access, places); });
    load.EndLoad(false);
  }
  load.BeginLoad({.kind = LinuxHost::LoadKind::kFull, .directory = dir, .domains = {}});
  step([&] { SecPolicy::LoadPolicyDomains(dir + "/" + SecPolicy::kDomainsDir, access, places); });
  if (File_IsDirectory(partnerDir.c_str())) {
    step([&] { InstallPartners(partnerDir, copies, access, places); });
  }
  load.EndLoad(false);
  load.Commit();
}

}  // namespace

std::string PartnerDirOf(const std::string& dir) {
  return dir + "/" + SecPolicy::kDomainsDir + "/" + SecPolicy::kPartnersDir;
}

WrittenPolicy ReadPolicyDirectory(const std::string& dir, const std::string& partnerDir,
                                  SecPolicy::PolicyObserver& observer) {
  const ScratchDirectory scratch;
  const LinuxHost::UsedCopy state(scratch.File("host.db"), scratch.File("host.db"));
  TeskAccessInterfaceImpl access;
  WrittenPolicy written;
  Install(dir, partnerDir, scratch.File("partners"), written, access, observer);
  written.isClean &=
      Try([&] { ReadLabels(dir + "/" + SecPolicy::kFileLabelsDir, written, access, observer); });
  written.policy = ReadInstalledPolicy(access);
  NamePartnerFiles(partnerDir, written.policy);
  return written;
}

}  // namespace SecPolicyCli
