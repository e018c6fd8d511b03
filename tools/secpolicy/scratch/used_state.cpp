#include "used_state.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>

#include "braxo/lib/exception.h"
#include "host/linux/state/store_copy.h"

namespace SecPolicyCli {

bool IsStateMissing() {
  return faccessat(AT_FDCWD, LinuxHost::StatePath().c_str(), F_OK,
                   AT_EACCESS | AT_SYMLINK_NOFOLLOW) != 0 &&
         (errno == ENOENT || errno == ENOTDIR);
}

StateCopy CopyUsedState(const std::string& to) {
  const std::string used = LinuxHost::StatePath();
  const int flags = AT_EACCESS | AT_SYMLINK_NOFOLLOW;
  if (faccessat(AT_FDCWD, used.c_str(), R_OK, flags) != 0) {
    if (errno == ENOENT || errno == ENOTDIR) return StateCopy::kMissing;
    if (errno == EACCES) return StateCopy::kForbidden;
  }
  LinuxHost::CopyDatabase(used, LinuxHost::CopyOf::kState, to);
  return StateCopy::kMade;
}

CopiedSettings::CopiedSettings(const std::string& to) {
  try {
    LinuxHost::CopyDatabase(LinuxHost::SettingsPath(), LinuxHost::CopyOf::kSettings, to);
    used.emplace(to);
  } catch (const Braxo::Lib::BraxoException&) {
    return;
  }
}

}  // namespace SecPolicyCli
