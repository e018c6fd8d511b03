#pragma once

#include <optional>
#include <string>

#include "host/linux/common/used_paths.h"

// Which state and settings the command works with: those of the host, or copies of its own.
namespace LinuxHost {

class HostState;

// To be called first by a program that has its process to itself: databases are used faster then.
void OwnProcess();

// The state that this process works with, made if there is none. The reference holds until the
// state is used next. Throws HostError when it cannot be used.
HostState& CurrentState();

// True when there is surely no state where this process looks for it: one that this user may not
// look for counts as there.
bool IsStateMissing();

// True when there may be a state that this user may not use.
bool IsStateForbidden();

// What became of a copy of the state or the settings: only what is missing, or not this user's to
// read, is left out.
enum class StateCopy { kMade, kMissing, kForbidden };

// Copies the state that this process works with to the new file `to`. Throws HostError for one that
// cannot be trusted or is damaged; leaves no file unless the copy was made.
StateCopy CopyUsedState(const std::string& to);

// The same of the wanted settings.
StateCopy CopyUsedSettings(const std::string& to);

// As long as it lives, this process works with the state at `path`, which is its own and which
// messages call `shownAs`, and surely with no other: throws HostError when that cannot be used, or
// while a load runs, which keeps to the state that it began with.
class UsedCopy {
 public:
  UsedCopy(const std::string& path, const std::string& shownAs);

 private:
  const UsedState used;
};

// As long as it lives, this process works with a copy of the wanted settings, which becomes the new
// file `to`: even reading leaves traces beside the real ones. Settings that cannot be copied stay
// in use, for the host to say what is wrong with them.
class CopiedSettings {
 public:
  explicit CopiedSettings(const std::string& to);

 private:
  std::optional<UsedSettings> used;
};

}  // namespace LinuxHost
