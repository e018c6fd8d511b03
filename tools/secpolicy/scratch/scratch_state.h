#pragma once

#include <string>

#include "scratch_directory.h"
#include "used_state.h"

namespace SecPolicyCli {

// A private copy of the host's state, which takes the place of the installed one as long as this
// object lives. The installed state is never written.
class ScratchState {
 public:
  // Copies the installed state; with `fresh`, and where there is none, starts from the state after
  // a boot. Throws std::system_error when there is no place for it.
  explicit ScratchState(bool fresh);

  // False when the state is a new one.
  bool IsCopy() const { return copied; }

  // Why an installed state was not copied; empty when it was, and when there is none.
  const std::string& CopyFailure() const { return copyFailure; }

  // The directory that the state is in.
  const std::string& DirectoryPath() const { return directory.Path(); }

  // A file beside the state, for what has to be read from a file.
  std::string ScratchFile() const { return directory.File("policy"); }

 private:
  ScratchDirectory directory;
  std::string copyFailure;
  bool copied;
  LinuxHost::UsedState used;
};

}  // namespace SecPolicyCli
