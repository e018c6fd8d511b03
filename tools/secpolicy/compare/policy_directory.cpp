#include "policy_directory.h"

#include <filesystem>

#include "host/linux/operation/state_use.h"
#include "kitlibs/file.h"
#include "scratch/scratch_state.h"
#include "secpolicy/observed/policy_observer.h"
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

// The library names partner domains so only where the host's own lie; a copy of the files under the
// full names does it anywhere.
void InstallPartners(const std::string& dir, const std::string& copies,
                     TeskAccessInterfaceImpl& access) {
  std::filesystem::create_directory(copies);
  for (const auto& [path, name] : FilesOf(dir)) {
    std::filesystem::copy_file(path, copies + "/" + SecPolicy::kPartnerPrefix + name);
  }
  SecPolicy::LoadPolicyDomains(copies, access);
}

std::map<std::string, std::string> ReadLabels(const std::string& dir, bool& isClean,
                                              TeskAccessInterfaceImpl& access) {
  SecPolicy::FileLabelPolicy policy;
  for (const auto& [path, name] : FilesOf(dir)) {
    isClean &= Try([&, &file = path] { policy.ParsePolicy(file, access); });
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

WrittenPolicy ReadPolicyDirectory(const std::string& dir, const std::string& partnerDir) {
  const ScratchDirectory scratch;
  const LinuxHost::UsedCopy state(scratch.File("host.db"), scratch.File("host.db"));
  TeskAccessInterfaceImpl access;
  WrittenPolicy written;
  const auto step = [&](auto part) { written.isClean &= Try(part); };

  const std::string earlyDomains = dir + "/" + SecPolicy::kEarlyDir + "/" + SecPolicy::kDomainsDir;
  step([&] { SecPolicy::LoadPolicyObjects(dir + "/" + SecPolicy::kObjectsDir, access); });
  if (File_IsDirectory(earlyDomains.c_str())) {
    step([&] { SecPolicy::LoadPolicyDomains(earlyDomains, access); });
  }
  step([&] { SecPolicy::LoadPolicyDomains(dir + "/" + SecPolicy::kDomainsDir, access); });
  if (File_IsDirectory(partnerDir.c_str())) {
    step([&] { InstallPartners(partnerDir, scratch.File("partners"), access); });
  }
  step([&] {
    written.labels = ReadLabels(dir + "/" + SecPolicy::kFileLabelsDir, written.isClean, access);
  });
  written.policy = ReadInstalledPolicy(access);
  return written;
}

}  // namespace SecPolicyCli
