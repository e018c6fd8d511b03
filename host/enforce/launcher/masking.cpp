#include "host/enforce/launcher/masking.h"

#include <fcntl.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <climits>
#include <cstdint>
#include <string>

#include "host/enforce/kernel.h"
#include "host/enforce/launcher/refuse.h"

namespace Enforce {
namespace {

constexpr std::uint64_t kNothingAllowed =
    MOUNT_ATTR_RDONLY | MOUNT_ATTR_NOEXEC | MOUNT_ATTR_NODEV | MOUNT_ATTR_NOSUID;

[[noreturn]] void RefuseMask(const Mask& mask) { RefuseForErrno("cannot mask " + mask.path); }

void WriteSetting(const char* path, const std::string& value) {
  const int file = open(path, O_WRONLY | O_CLOEXEC);
  if (file < 0 || write(file, value.data(), value.size()) < 0) {
    RefuseForErrno(std::string("cannot write ") + path);
  }
  close(file);
}

// Users and groups have the same numbers inside; those that are not this process's have none.
void MapOwnIdentity(uid_t user, gid_t group) {
  const auto sameNumber = [](unsigned int number) {
    return std::to_string(number) + " " + std::to_string(number) + " 1";
  };
  WriteSetting("/proc/self/uid_map", sameNumber(user));
  WriteSetting("/proc/self/setgroups", "deny");
  WriteSetting("/proc/self/gid_map", sameNumber(group));
}

// Mounts are copied, those that were shared so that nothing goes back.
void EnterMountNamespace() {
  const uid_t user = geteuid();
  const gid_t group = getegid();
  if (unshare(CLONE_NEWNS) == 0) {
    if (mount(nullptr, "/", nullptr, MS_REC | MS_SLAVE, nullptr) == 0) return;
    RefuseForErrno("cannot keep masks from the rest of the system; is the root a mount point?");
  }
  if (unshare(CLONE_NEWUSER | CLONE_NEWNS) != 0) {
    RefuseForErrno("cannot mask paths without being root where user namespaces are forbidden");
  }
  MapOwnIdentity(user, group);
}

// A directory in which there is nothing, and that nobody may look into.
int MakeEmptyDirectory() {
  const int context = fsopen("tmpfs", FSOPEN_CLOEXEC);
  if (context < 0 || fsconfig(context, FSCONFIG_SET_STRING, "mode", "000", 0) != 0 ||
      fsconfig(context, FSCONFIG_CMD_CREATE, nullptr, nullptr, 0) != 0) {
    return -1;
  }
  const int tree = fsmount(context, FSMOUNT_CLOEXEC, kNothingAllowed);
  close(context);
  return tree;
}

// What is at the place, or a device when none is given, with less allowed.
int CloneWithout(int place, const char* path, std::uint64_t attributes) {
  const int tree =
      open_tree(place, path, OPEN_TREE_CLONE | OPEN_TREE_CLOEXEC | AT_EMPTY_PATH | AT_RECURSIVE);
  mount_attr changes = {};
  changes.attr_set = attributes;
  if (tree < 0 ||
      mount_setattr(tree, "", AT_EMPTY_PATH | AT_RECURSIVE, &changes, sizeof(changes)) != 0) {
    return -1;
  }
  return tree;
}

// A device is no device any more where devices are not allowed, and cannot be opened.
int MakeHiding(int place) {
  struct stat status = {};
  if (fstat(place, &status) != 0) return -1;
  if (S_ISDIR(status.st_mode)) return MakeEmptyDirectory();
  return CloneWithout(AT_FDCWD, "/dev/null", kNothingAllowed);
}

// What is to lie over the place, not yet anywhere.
int MakeTree(MaskKind kind, int place) {
  switch (kind) {
    case MaskKind::kHidden:
      return MakeHiding(place);
    case MaskKind::kNoExec:
      return CloneWithout(place, "", MOUNT_ATTR_NOEXEC);
    case MaskKind::kReadOnly:
      break;
  }
  return CloneWithout(place, "", MOUNT_ATTR_RDONLY);
}

void Apply(const Mask& mask) {
  const int place = Kernel::OpenPlace(mask.path.c_str());
  const int tree = place < 0 ? -1 : MakeTree(mask.kind, place);
  if (tree < 0 ||
      move_mount(tree, "", place, "", MOVE_MOUNT_F_EMPTY_PATH | MOVE_MOUNT_T_EMPTY_PATH) != 0) {
    RefuseMask(mask);
  }
  close(tree);
  close(place);
}

std::string WorkingDirectory() {
  char path[PATH_MAX];
  if (getcwd(path, sizeof(path)) == nullptr) RefuseForErrno("cannot tell the working directory");
  return path;
}

}  // namespace

void ApplyMasks(const std::vector<Mask>& masks) {
  if (masks.empty()) return;
  const std::string directory = WorkingDirectory();
  EnterMountNamespace();
  for (const Mask& mask : masks) Apply(mask);
  // Entered again: one that is masked now would still be the one beneath the mask.
  if (chdir(directory.c_str()) != 0) RefuseForErrno("cannot stay in the directory " + directory);
}

}  // namespace Enforce
