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

// What takes the place of the host's own, if anything. Not the environment: a program with more
// rights than its user may not trust what it reads there, not even what it wrote itself.
const UsedState* usedState = nullptr;
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

const std::string& StatePath() {
  if (usedState != nullptr) return usedState->path;
  static const std::string path = StatePathOfHost();
  return path;
}

bool IsStateAtUsualPlace() { return StatePath() == kState; }

const std::string& ShownStatePath() {
  return usedState != nullptr ? usedState->shownAs : StatePath();
}

const std::string& SettingsPath() {
  if (usedSettings) return *usedSettings;
  static const std::string path = PathIn(kSettingsVariable, kSettings);
  return path;
}

bool AreLabelNumbersKept() { return usedState == nullptr || usedSettings; }

UsedState::UsedState(const std::string& file, const std::string& name)
    : path(file), shownAs(name), before(std::exchange(usedState, this)) {}

UsedState::~UsedState() { usedState = before; }

UsedSettings::UsedSettings(const std::string& path) : before(std::exchange(usedSettings, path)) {}

UsedSettings::~UsedSettings() { usedSettings = before; }

}  // namespace LinuxHost
