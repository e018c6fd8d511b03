#include "root.h"

#include <sched.h>
#include <unistd.h>

#include <cerrno>
#include <fstream>

#include "host/linux/common/host_error.h"

namespace SecPolicyCli {
namespace {

using LinuxHost::ThrowErrno;

bool rootEntered = false;

void WriteProcFile(const char* path, const std::string& text) {
  std::ofstream file(path);
  file << text << std::flush;
  if (!file) ThrowErrno("cannot write ", path);
}

// Inside a namespace of its own every user may change the root. The user and the group keep their
// numbers, so files made below the root belong to who ran the command.
void EnterUserNamespace() {
  const std::string user = std::to_string(geteuid());
  const std::string group = std::to_string(getegid());
  if (unshare(CLONE_NEWUSER) != 0) {
    ThrowErrno("cannot enter a root without being root where user namespaces are forbidden");
  }
  WriteProcFile("/proc/self/setgroups", "deny");
  WriteProcFile("/proc/self/uid_map", user + " " + user + " 1");
  WriteProcFile("/proc/self/gid_map", group + " " + group + " 1");
}

bool MakeRoot() { return chroot(".") == 0 && chdir("/") == 0; }

}  // namespace

void EnterRoot(const std::string& directory) {
  if (chdir(directory.c_str()) != 0) ThrowErrno("cannot enter the root ", directory);
  if (!MakeRoot()) {
    if (errno != EPERM) ThrowErrno("cannot enter the root ", directory);
    EnterUserNamespace();
    if (!MakeRoot()) ThrowErrno("cannot enter the root ", directory);
  }
  rootEntered = true;
}

std::string AdviseOnPrivilege() {
  if (rootEntered || geteuid() == 0) return "";
  return "You are not root: run it as root, or give --root DIR to work below a directory of yours.";
}

}  // namespace SecPolicyCli
