#pragma once

#include <optional>
#include <string>

#include "host/linux/operation/state_use.h"
#include "host/linux/operation/store_copy.h"
#include "installed/installed_policy.h"

namespace SecPolicyCli {

// A directory that only this user may use; removed, with all that is in it, with this object.
class ScratchDirectory {
 public:
  // Throws Braxo::Lib::BraxoException when there is no place for it.
  ScratchDirectory();
  // Takes over the directory `made`.
  explicit ScratchDirectory(std::string made);
  ScratchDirectory(const ScratchDirectory&) = delete;
  ScratchDirectory& operator=(const ScratchDirectory&) = delete;
  ~ScratchDirectory();

  const std::string& Path() const { return path; }

  // The path of the file `name` in it.
  std::string File(const std::string& name) const { return path + "/" + name; }

 private:
  std::string path;
};

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

// As long as it lives, this process works with a copy of the state at `path`, since even reading
// leaves traces beside a state. Throws Braxo::Lib::BraxoException when that cannot be copied or
// used.
class CopiedState {
 public:
  CopiedState(const std::string& path, LinuxHost::CopyOf what);

 private:
  const ScratchDirectory directory;
  std::optional<LinuxHost::UsedCopy> used;
};

// Reads the state at `path` from a copy. Throws as that does.
Policy::InstalledPolicy ReadStateAt(const std::string& path, LinuxHost::CopyOf what);

}  // namespace SecPolicyCli
