#pragma once

#include <string>

#include "host/linux/operation/state_use.h"
#include "scratch_directory.h"

namespace SecPolicyCli {

// A private copy of the host's state, which takes the place of the installed one as long as this
// object lives. The installed state is never written.
class ScratchState {
 public:
  // Copies the installed state; with `fresh`, and where there is none or this user may not read it,
  // starts from the state after a boot. Throws Braxo::Lib::BraxoException when there is no place
  // for it, and for a state that cannot be trusted or is damaged.
  explicit ScratchState(bool fresh);

  // False when the state is a new one.
  bool IsCopy() const { return copy == LinuxHost::StateCopy::kMade; }

  // Why the state is a new one although a copy was wanted; empty when it is not.
  std::string WhyNoCopy() const;

  // The directory that the state is in.
  const std::string& DirectoryPath() const { return directory.Path(); }

 private:
  ScratchDirectory directory;
  std::optional<LinuxHost::StateCopy> copy;
  LinuxHost::UsedCopy used;
};

}  // namespace SecPolicyCli
