#include "side.h"

#include "compare/policy_directory.h"
#include "ending.h"
#include "host/linux/common/host_error.h"
#include "host/linux/operation/state_use.h"
#include "kitlibs/file.h"
#include "policy_dir.h"
#include "refusal.h"
#include "root.h"
#include "saved/saved_state.h"
#include "scratch/scratch_state.h"
#include "text/shell_word.h"
#include "text/suggestion.h"

namespace SecPolicyCli {
namespace {

constexpr char kInstalled[] = "installed";

Side ReadDirectory(const std::string& dir, SecPolicy::PolicyObserver& observer) {
  if (!File_IsDirectory(dir.c_str())) {
    throw NoSuchPolicy("there is no directory " + dir +
                       " below this root. Name a policy directory, a saved state, or "
                       "'installed'." +
                       AdviseOnMissing(dir));
  }
  WrittenPolicy written = ReadPolicyDirectory(dir, PartnerDirOf(dir), observer);
  if (!written.isClean) {
    throw BadPolicy("the policy in " + dir + " has errors (above), so it was not compared. " +
                    Call("check " + ShellWord(dir)) + " shows every one with its place.");
  }
  return {.name = dir,
          .policy = std::move(written.policy),
          .labels = std::move(written.labels),
          .labelLines = std::move(written.labelLines)};
}

Side ReadStateOf(const std::string& name, const std::string& path, LinuxHost::CopyOf what) {
  return {.name = name, .policy = ReadStateAt(path, what), .labels = std::nullopt};
}

Side ReadInstalled() {
  if (LinuxHost::IsStateMissing()) throw NothingInstalled(WhyWithoutState());
  return ReadStateOf(kInstalled, LinuxHost::StatePath(), LinuxHost::CopyOf::kState);
}

std::string NearestSide(const std::string& name) {
  const std::string installed = NearestWord(name, {kInstalled});
  return installed.empty() ? NearestSavedName(name) : installed;
}

Side ReadSaved(const std::string& name) {
  if (!IsSaved(name)) {
    const std::string nearest = NearestSide(name);
    throw NoSuchPolicy("there is no saved state '" + name + "', and no such directory. " +
                       (nearest.empty() ? Call("history") + " lists what is saved; 'installed' is "
                                                            "what is installed now."
                                        : "Did you mean '" + nearest + "'?"));
  }
  return ReadStateOf(name, SavedStatePath(name), LinuxHost::CopyOf::kSavedState);
}

// Where there is a directory, a saved state that this user may not look for is not meant.
bool IsKnownToBeSaved(const std::string& name) {
  try {
    return IsSaved(name);
  } catch (const LinuxHost::HostError&) {
    return false;
  }
}

bool MeansDirectory(const std::string& name) {
  if (name.find('/') != std::string::npos) return true;
  return File_IsDirectory(name.c_str()) && !IsKnownToBeSaved(name);
}

}  // namespace

Side ReadSide(const std::string& name, SecPolicy::PolicyObserver& observer) {
  if (name == kInstalled) return ReadInstalled();
  return MeansDirectory(name) ? ReadDirectory(name, observer) : ReadSaved(name);
}

}  // namespace SecPolicyCli
