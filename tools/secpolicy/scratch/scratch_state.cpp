#include "scratch_state.h"

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <system_error>
#include <utility>
#include <vector>

#include "host/linux/common/host_error.h"
#include "text/format.h"

namespace SecPolicyCli {
namespace {

// A root that was never booted has none of the usual places, so that only the root itself is left.
std::vector<std::string> UsualPlaces() {
  std::vector<std::string> places = {"/tmp", "/var/tmp", "/run", ""};
  const char* const wanted = secure_getenv("TMPDIR");
  if (wanted != nullptr && *wanted != '\0') places.emplace(places.begin(), wanted);
  return places;
}

std::string MakePrivateDirectory() {
  const std::vector<std::string> places = UsualPlaces();
  for (const std::string& place : places) {
    std::string directory = place + "/secpolicy.XXXXXX";
    if (mkdtemp(directory.data()) != nullptr) return directory;
  }
  const int failure = errno;
  std::vector<std::string> named;
  named.reserve(places.size());
  for (const std::string& place : places) named.push_back(place.empty() ? "/" : place);
  const std::string text =
      "there is no place for a copy of the policy to work with: " + ListOf(named, "and") +
      " below this root cannot be written; TMPDIR can name another";
  errno = failure;
  LinuxHost::ThrowErrno(text);
}

constexpr char kState[] = "host.db";

std::optional<LinuxHost::StateCopy> CopyUnless(bool fresh, const std::string& to) {
  if (fresh) return std::nullopt;
  return LinuxHost::CopyUsedState(to);
}

}  // namespace

ScratchDirectory::ScratchDirectory() : path(MakePrivateDirectory()) {}

ScratchDirectory::ScratchDirectory(std::string made) : path(std::move(made)) {}

ScratchDirectory::~ScratchDirectory() {
  std::error_code ignored;
  std::filesystem::remove_all(path, ignored);
}

ScratchState::ScratchState(bool fresh)
    : copy(CopyUnless(fresh, directory.File(kState))),
      used(directory.File(kState),
           IsCopy() ? LinuxHost::ShownStatePath() : directory.File(kState)) {}

std::string ScratchState::WhyNoCopy() const {
  if (copy == LinuxHost::StateCopy::kMissing) return "nothing is installed";
  if (copy == LinuxHost::StateCopy::kForbidden) return "this user may not read the installed state";
  return "";
}

CopiedState::CopiedState(const std::string& path, LinuxHost::CopyOf what) {
  const std::string copy = directory.File(kState);
  LinuxHost::CopyDatabase(path, what, copy);
  used.emplace(copy, path);
}

Policy::InstalledPolicy ReadStateAt(const std::string& path, LinuxHost::CopyOf what) {
  const CopiedState copied(path, what);
  SecPolicy::TeskAccessInterfaceImpl access;
  return ReadInstalledPolicy(access);
}

}  // namespace SecPolicyCli
