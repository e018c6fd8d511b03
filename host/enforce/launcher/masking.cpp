#include "host/enforce/launcher/masking.h"

#include <fcntl.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdint>
#include <string>

#include "host/enforce/kernel.h"
#include "host/enforce/launcher/refuse.h"
#include "host/enforce/mount_namespace.h"

namespace Enforce {
namespace {

constexpr std::uint64_t kNothingAllowed =
    MOUNT_ATTR_RDONLY | MOUNT_ATTR_NOEXEC | MOUNT_ATTR_NODEV | MOUNT_ATTR_NOSUID;

[[noreturn]] void RefuseMask(const Mask& mask) { RefuseForErrno("cannot mask " + mask.path); }

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
int CloneNullDevice() {
  struct stat status = {};
  if (stat("/dev/null", &status) != 0) return -1;
  if (S_ISCHR(status.st_mode)) return CloneWithout(AT_FDCWD, "/dev/null", kNothingAllowed);
  errno = ENODEV;
  return -1;
}

int MakeHiding(int place) {
  struct stat status = {};
  if (fstat(place, &status) != 0) return -1;
  return S_ISDIR(status.st_mode) ? MakeEmptyDirectory() : CloneNullDevice();
}

// What is to lie over the place, not yet anywhere.
int MakeTree(MaskKind kind, int place) {
  return kind == MaskKind::kHidden ? MakeHiding(place) : CloneWithout(place, "", MOUNT_ATTR_NOEXEC);
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

// What was opened before lies beneath the masks, with all that a directory leads to.
void RequireNoDirectory(int descriptor) {
  struct stat status = {};
  if (fstat(descriptor, &status) != 0 || !S_ISDIR(status.st_mode)) return;
  Refuse("descriptor " + std::to_string(descriptor) +
         " is a directory, which leads past the masks of the domain; start the program without it");
}

}  // namespace

void ApplyMasks(const std::vector<Mask>& masks, const std::vector<int>& descriptors) {
  if (masks.empty()) return;
  for (const int descriptor : descriptors) RequireNoDirectory(descriptor);
  const std::string directory = WorkingDirectory();
  if (const char* const failed = EnterMountNamespace()) RefuseForErrno(failed);
  for (const Mask& mask : masks) Apply(mask);
  // Entered again: one that is masked now would still be the one beneath the mask.
  if (chdir(directory.c_str()) != 0) RefuseForErrno("cannot stay in the directory " + directory);
}

}  // namespace Enforce
