#include "host/enforce/mount_namespace.h"

#include <fcntl.h>
#include <sched.h>
#include <sys/mount.h>
#include <unistd.h>

#include <string>

namespace Enforce {
namespace {

bool WriteSetting(const char* path, const std::string& value) {
  const int file = open(path, O_WRONLY | O_CLOEXEC);
  if (file < 0) return false;
  const bool isWritten = write(file, value.data(), value.size()) >= 0;
  close(file);
  return isWritten;
}

// Users and groups have the same numbers inside; those that are not this process's have none.
bool MapIdentity(uid_t user, gid_t group) {
  const auto sameNumber = [](unsigned int number) {
    return std::to_string(number) + " " + std::to_string(number) + " 1";
  };
  return WriteSetting("/proc/self/uid_map", sameNumber(user)) &&
         WriteSetting("/proc/self/setgroups", "deny") &&
         WriteSetting("/proc/self/gid_map", sameNumber(group));
}

// True where the mounts that this process sees are its to change.
bool OwnsMounts() {
  const int context = fsopen("tmpfs", FSOPEN_CLOEXEC);
  if (context >= 0) close(context);
  return context >= 0;
}

}  // namespace

const char* EnterMountNamespace() {
  const uid_t user = geteuid();
  const gid_t group = getegid();
  const bool ownsMounts = OwnsMounts();
  if (unshare(CLONE_NEWNS) == 0) {
    // Copies of what belongs to another user namespace give nothing back anyhow.
    const bool isKept = mount(nullptr, "/", nullptr, MS_REC | MS_SLAVE, nullptr) == 0;
    if (isKept || !ownsMounts) return nullptr;
    return "cannot keep masks from the rest of the system; is the root a mount point?";
  }
  if (unshare(CLONE_NEWUSER | CLONE_NEWNS) != 0) {
    return "cannot mask paths without being root where user namespaces are forbidden";
  }
  return MapIdentity(user, group) ? nullptr : "cannot have a user namespace without /proc";
}

}  // namespace Enforce
