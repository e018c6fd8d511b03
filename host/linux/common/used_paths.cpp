#include "host/linux/common/used_paths.h"

#include <cstdlib>
#include <utility>

#include "host/linux/common/private_file.h"

namespace LinuxHost {
namespace {

constexpr char kState[] = "/run/secpolicy/host.db";
constexpr char kStateVariable[] = "SECPOLICY_HOST_STATE";
constexpr char kSettings[] = "/var/lib/secpolicy/config.db";
constexpr char kSettingsVariable[] = "SECPOLICY_HOST_CONFIG";

std::optional<std::string> usedSettings;

std::string PathIn(const char* variable, const char* otherwise) {
  const char* const path = secure_getenv(variable);
  return path != nullptr && *path != '\0' ? path : otherwise;
}

// A relative path would be looked up in a directory that nobody has chosen, and show no state
// there.
std::string StatePathOfHost() {
  std::string path = PathIn(kStateVariable, kState);
  RequireFilePath(path, "host state");
  return path;
}

}  // namespace

// What takes the place of the host's own, if anything. Not the environment: a program with more
// rights than its user may not trust what it reads there, not even what it wrote itself.
std::optional<UsedState::Paths> UsedState::used;

const std::string& StatePath() {
  if (UsedState::used) return UsedState::used->real;
  static const std::string path = StatePathOfHost();
  return path;
}

const std::string& ShownStatePath() {
  return UsedState::used ? UsedState::used->shown : StatePath();
}

const std::string& SettingsPath() {
  if (usedSettings) return *usedSettings;
  static const std::string path = PathIn(kSettingsVariable, kSettings);
  return path;
}

UsedState::UsedState(const std::string& path, const std::string& shownAs)
    : before(std::exchange(used, Paths{path, shownAs})) {}

UsedState::~UsedState() { used = before; }

UsedSettings::UsedSettings(const std::string& path) : before(std::exchange(usedSettings, path)) {}

UsedSettings::~UsedSettings() { usedSettings = before; }

}  // namespace LinuxHost
