#include "used_state.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <system_error>

#include "host/linux/store_copy.h"

namespace SecPolicyCli {

bool IsStateMissing() {
  return faccessat(AT_FDCWD, LinuxHost::StatePath().c_str(), F_OK, AT_EACCESS) != 0 &&
         (errno == ENOENT || errno == ENOTDIR);
}

std::string CopyState(const std::string& from, const std::string& to) {
  std::string failure = LinuxHost::CopyDatabase(from, to);
  std::error_code ignored;
  if (!failure.empty()) {
    std::filesystem::remove(to, ignored);
    return failure;
  }
  // The host trusts only what nobody else can write.
  std::filesystem::permissions(to, std::filesystem::perms(0600));
  return "";
}

std::string CopyUsedState(const std::string& to) {
  const std::string used = LinuxHost::StatePath();
  if (faccessat(AT_FDCWD, used.c_str(), R_OK, AT_EACCESS) == 0) return CopyState(used, to);
  return errno == ENOENT ? "" : std::generic_category().message(errno);
}

CopiedSettings::CopiedSettings(const std::string& to) {
  if (CopyState(LinuxHost::SettingsPath(), to).empty()) used.emplace(to);
}

}  // namespace SecPolicyCli
