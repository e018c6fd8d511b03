#include "host/linux/operation/state_use.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/operation/store_copy.h"
#include "host/linux/state/host_state.h"

namespace LinuxHost {

using Braxo::Misc::StrCat;

namespace {

StateCopy Copy(const std::string& used, CopyOf what, const std::string& to) {
  const int flags = AT_EACCESS | AT_SYMLINK_NOFOLLOW;
  if (faccessat(AT_FDCWD, used.c_str(), R_OK, flags) != 0) {
    if (errno == ENOENT || errno == ENOTDIR) return StateCopy::kMissing;
    if (errno == EACCES) return StateCopy::kForbidden;
  }
  CopyDatabase(used, what, to);
  return StateCopy::kMade;
}

}  // namespace

void OwnProcess() { KeepNoMemoryAccount(); }

HostState& CurrentState() { return HostState::Current(); }

bool IsStateMissing() {
  return faccessat(AT_FDCWD, StatePath().c_str(), F_OK, AT_EACCESS | AT_SYMLINK_NOFOLLOW) != 0 &&
         (errno == ENOENT || errno == ENOTDIR);
}

bool IsStateForbidden() {
  constexpr int kFlags = AT_EACCESS | AT_SYMLINK_NOFOLLOW;
  return faccessat(AT_FDCWD, StatePath().c_str(), R_OK | W_OK, kFlags) != 0 && errno == EACCES;
}

StateCopy CopyUsedState(const std::string& to) { return Copy(StatePath(), CopyOf::kState, to); }

StateCopy CopyUsedSettings(const std::string& to) {
  return Copy(SettingsPath(), CopyOf::kSettings, to);
}

UsedCopy::UsedCopy(const std::string& path, const std::string& shownAs) : used(path, shownAs) {
  const std::string& opened = HostState::Current().Database().Path();
  if (opened != path) throw HostError(EBUSY, StrCat("A load is installing its policy in ", opened));
}

CopiedSettings::CopiedSettings(const std::string& to) {
  try {
    CopyDatabase(SettingsPath(), CopyOf::kSettings, to);
    used.emplace(to);
  } catch (const HostError&) {
    return;
  }
}

}  // namespace LinuxHost
