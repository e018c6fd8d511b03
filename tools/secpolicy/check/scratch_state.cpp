#include "scratch_state.h"

#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <system_error>

#include "host/linux/store_copy.h"

namespace SecPolicyCli {
namespace {

constexpr char kStateVariable[] = "SECPOLICY_HOST_STATE";
constexpr char kInstalledState[] = "/run/secpolicy/host.db";

// A root that was never booted has none of the usual places.
std::string MakePrivateDirectory() {
  const char* const wanted = secure_getenv("TMPDIR");
  for (const std::string place :
       {wanted == nullptr ? "" : wanted, "/tmp", "/var/tmp", "/run", ""}) {
    std::string directory = place + "/secpolicy-check.XXXXXX";
    if (mkdtemp(directory.data()) != nullptr) return directory;
  }
  throw std::system_error(errno, std::generic_category(),
                          "cannot make a directory for the scratch state; TMPDIR can name a place");
}

std::string InstalledState() {
  const char* const path = secure_getenv(kStateVariable);
  return path != nullptr && *path != '\0' ? path : kInstalledState;
}

}  // namespace

ScratchState::ScratchState(bool fresh) : directory(MakePrivateDirectory()) {
  const std::string state = directory + "/host.db";
  const std::string installed = InstalledState();
  if (!fresh && access(installed.c_str(), R_OK) == 0) {
    copyFailure = LinuxHost::CopyDatabase(installed, state);
    copied = copyFailure.empty();
    // The host trusts only what nobody else can write, and makes a new one where there is none.
    if (copied) {
      std::filesystem::permissions(state, std::filesystem::perms(0600));
    } else {
      std::filesystem::remove(state);
    }
  } else if (!fresh && errno != ENOENT) {
    copyFailure = std::generic_category().message(errno);
  }
  setenv(kStateVariable, state.c_str(), 1);
}

ScratchState::~ScratchState() {
  std::error_code ignored;
  std::filesystem::remove_all(directory, ignored);
}

}  // namespace SecPolicyCli
