#include "policy_directory.h"

#include <filesystem>
#include <string_view>
#include <utility>

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

std::map<std::string, std::string> ReadLabels(const std::string& dir, bool& isClean,
                                              TeskAccessInterfaceImpl& access,
                                              SecPolicy::PolicyObserver& observer) {
  SecPolicy::FileLabelPolicy policy;
  for (const auto& [path, name] : FilesOf(dir)) {
    isClean &= Try([&, &file = path] { policy.ParsePolicy(file, access, observer); });
  }
  std::map<std::string, std::string> labels;
  for (const SecPolicy::FileLabel& line : policy.fileLabels) {
    labels[line.path + (line.recursive ? "/*" : "")] = line.label;
  }
  return labels;
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
  const auto step = [&](auto part) { written.isClean &= Try(part); };

  const std::string earlyDomains = dir + "/" + SecPolicy::kEarlyDir + "/" + SecPolicy::kDomainsDir;
  step([&] { SecPolicy::LoadPolicyObjects(dir + "/" + SecPolicy::kObjectsDir, access, observer); });
  if (File_IsDirectory(earlyDomains.c_str())) {
    step([&] { SecPolicy::LoadPolicyDomains(earlyDomains, access, observer); });
  }
  step([&] { SecPolicy::LoadPolicyDomains(dir + "/" + SecPolicy::kDomainsDir, access, observer); });
  if (File_IsDirectory(partnerDir.c_str())) {
    step([&] { InstallPartners(partnerDir, scratch.File("partners"), access, observer); });
  }
  step([&] {
    written.labels =
        ReadLabels(dir + "/" + SecPolicy::kFileLabelsDir, written.isClean, access, observer);
  });
  written.policy = ReadInstalledPolicy(access);
  return written;
}

}  // namespace SecPolicyCli
