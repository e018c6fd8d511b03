#pragma once

#include <string>

namespace SecPolicyCli {

// The path of the host's state that this process works with; there may be none yet.
std::string StatePath();

// True when there is surely no such state: one that this user may not look for counts as there.
bool IsStateMissing();

// Copies the state at `from`, which is only read, to the new file `to`, such that the host works
// with the copy. Returns why it could not, and leaves no file then; empty when it could.
std::string CopyState(const std::string& from, const std::string& to);

// The same for the state that this process works with. Where there is none, nothing is copied, and
// that is no failure.
std::string CopyUsedState(const std::string& to);

// Makes this process work with the state at `path`, as long as this object lives. The host makes a
// new one where there is none.
class UsedState {
 public:
  explicit UsedState(const std::string& path);
  UsedState(const UsedState&) = delete;
  UsedState& operator=(const UsedState&) = delete;
  ~UsedState();

 private:
  std::string before;
};

// Makes this process work with a copy of the wanted settings, which becomes the new file `to`, from
// now on: even reading leaves traces beside the real ones. Settings that cannot be copied stay in
// use, for the host to say what is wrong with them.
void UseCopyOfSettings(const std::string& to);

}  // namespace SecPolicyCli
