#include "used_state.h"

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
constexpr char kSettingsVariable[] = "SECPOLICY_HOST_CONFIG";
constexpr char kSettings[] = "/var/lib/secpolicy/config.db";

std::string PathIn(const char* variable, const char* otherwise) {
  const char* const path = secure_getenv(variable);
  return path != nullptr && *path != '\0' ? path : otherwise;
}

}  // namespace

std::string StatePath() { return PathIn(kStateVariable, kInstalledState); }

bool IsStateMissing() {
  return access(StatePath().c_str(), F_OK) != 0 && (errno == ENOENT || errno == ENOTDIR);
}

std::string CopyState(const std::string& from, const std::string& to) {
  std::string failure = LinuxHost::CopyDatabase(from, to);
  std::error_code ignored;
  if (!failure.empty()) {
    std::filesystem::remove(to, ignored);
    return failure;
  }
  // The host trusts only what nobody else can write.
  std::filesystem::permissions(to, std::filesystem::perms(0600));
  return "";
}

std::string CopyUsedState(const std::string& to) {
  const std::string used = StatePath();
  if (access(used.c_str(), R_OK) == 0) return CopyState(used, to);
  return errno == ENOENT ? "" : std::generic_category().message(errno);
}

UsedState::UsedState(const std::string& path) : before(StatePath()) {
  setenv(kStateVariable, path.c_str(), 1);
}

UsedState::~UsedState() { setenv(kStateVariable, before.c_str(), 1); }

void UseCopyOfSettings(const std::string& to) {
  const std::string settings = PathIn(kSettingsVariable, kSettings);
  if (CopyState(settings, to).empty()) setenv(kSettingsVariable, to.c_str(), 1);
}

}  // namespace SecPolicyCli
