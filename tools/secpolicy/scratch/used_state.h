#pragma once

#include <optional>
#include <string>

#include "host/linux/used_paths.h"

namespace SecPolicyCli {

// True when there is surely no state where this process looks for it: one that this user may not
// look for counts as there.
bool IsStateMissing();

// Copies the state at `from`, which is only read, to the new file `to`, such that the host works
// with the copy. Returns why it could not, and leaves no file then; empty when it could.
std::string CopyState(const std::string& from, const std::string& to);

// The same for the state that this process works with. Where there is none, nothing is copied, and
// that is no failure.
std::string CopyUsedState(const std::string& to);

// As long as it lives, this process works with a copy of the wanted settings, which becomes the new
// file `to`: even reading leaves traces beside the real ones. Settings that cannot be copied stay
// in use, for the host to say what is wrong with them.
class CopiedSettings {
 public:
  explicit CopiedSettings(const std::string& to);

 private:
  std::optional<LinuxHost::UsedSettings> used;
};

}  // namespace SecPolicyCli
