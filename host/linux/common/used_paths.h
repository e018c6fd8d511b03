#pragma once

#include <optional>
#include <string>

// Where this process finds the files of the host: the one place for that. The environment is read
// once, at the first use; a reference holds as long as what is used stays the same.
namespace LinuxHost {

// The host's state: /run/secpolicy/host.db, unless SECPOLICY_HOST_STATE names another file. Throws
// HostError when it names none by an absolute path.
const std::string& StatePath();

// True when that is the usual place, whose directory is the host's to arrange.
bool IsStateAtUsualPlace();

// How messages call that state: a copy by the name of what it was made of.
const std::string& ShownStatePath();

// The wanted settings: /var/lib/secpolicy/config.db, unless SECPOLICY_HOST_CONFIG names another
// absolute path. Programs that run with more rights than their user ignore both variables.
const std::string& SettingsPath();

// True when the numbers of labels are to outlive the state: it is the host's own, or one that is
// used together with settings of its own. Of any other nothing is to remain.
bool AreLabelNumbersKept();

// As long as it lives, this process works with the state at `path`, and not with that of the host;
// no variable can change that. The latest one counts. Not while other threads use the host.
class UsedState {
 public:
  explicit UsedState(const std::string& file) : UsedState(file, file) {}

  // Messages call it `name`.
  UsedState(const std::string& file, const std::string& name);
  UsedState(const UsedState&) = delete;
  UsedState& operator=(const UsedState&) = delete;
  ~UsedState();

  const std::string path;
  const std::string shownAs;

 private:
  const UsedState* const before;
};

// The same for the wanted settings.
class UsedSettings {
 public:
  explicit UsedSettings(const std::string& path);
  UsedSettings(const UsedSettings&) = delete;
  UsedSettings& operator=(const UsedSettings&) = delete;
  ~UsedSettings();

 private:
  const std::optional<std::string> before;
};

}  // namespace LinuxHost
