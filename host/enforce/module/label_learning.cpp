// The kernel's programs learn a label when somebody reads it. So every file system is walked once,
// by a tree of its own in which nothing is mounted over it, and the label of each file asked for.
#include "host/enforce/module/label_learning.h"

#include <bpf/bpf.h>
#include <dirent.h>
#include <fcntl.h>
#include <linux/mount.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <memory>
#include <string_view>

#include "braxo/misc/strcat.h"
#include "host/enforce/module/mounts.h"

using Braxo::Misc::StrCat;

namespace Enforce {
namespace {

// Where a file keeps its device, number and generation for as long as there is one.
constexpr std::array<std::string_view, 10> kTypes = {
    "ext2", "ext3", "ext4", "f2fs", "xfs", "tmpfs", "devtmpfs", "sysfs", "cgroup", "cgroup2"};

// Whoever serves them may not answer.
constexpr std::array<std::string_view, 8> kServed = {"fuse", "nfs", "cifs", "smb3",
                                                     "ceph", "9p",  "afs",  "autofs"};

struct CloseDirectory {
  void operator()(DIR* directory) const { closedir(directory); }
};
using Directory = std::unique_ptr<DIR, CloseDirectory>;

// Only that it is asked for counts.
void AskFor(const char* name) {
  std::array<char, sizeof(__u32)> label;
  lgetxattr(name, kModuleLabelAttribute, label.data(), label.size());
}

// Reads the labels of what is in the directory, which it ends, and beneath it. Changes the working
// directory. Returns 0 or an error number.
int ReadLabelsIn(int descriptor) {
  const Directory directory(fdopendir(descriptor));
  if (!directory) return errno;
  while (true) {
    if (fchdir(dirfd(directory.get())) != 0) return errno;
    errno = 0;
    const dirent* const entry = readdir(directory.get());
    if (entry == nullptr) return errno;
    const std::string_view name = entry->d_name;
    if (name == "." || name == "..") continue;
    if (entry->d_type != DT_LNK) AskFor(entry->d_name);
    if (entry->d_type != DT_DIR && entry->d_type != DT_UNKNOWN) continue;
    const int next = openat(dirfd(directory.get()), entry->d_name,
                            O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
    if (next < 0) {
      // What has gone meanwhile has no label.
      if (errno == ENOENT || errno == ENOTDIR || errno == ELOOP) continue;
      return errno;
    }
    const int error = ReadLabelsIn(next);
    if (error != 0) return error;
  }
}

// Directories may lie deep.
void RaiseLimits() {
  rlimit limit = {};
  if (getrlimit(RLIMIT_NOFILE, &limit) != 0) return;
  limit.rlim_cur = limit.rlim_max;
  setrlimit(RLIMIT_NOFILE, &limit);
}

int ReadLabelsOf(int tree) {
  RaiseLimits();
  if (fchdir(tree) != 0) return errno;
  AskFor(".");
  const int root = openat(tree, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  return root < 0 ? errno : ReadLabelsIn(root);
}

// In a process of its own, whose working directory nobody shares.
int ReadLabelsBeside(int tree) {
  const pid_t child = fork();
  if (child < 0) return errno;
  if (child == 0) _exit(ReadLabelsOf(tree));
  int status = 0;
  while (waitpid(child, &status, 0) < 0) {
    if (errno != EINTR) return errno;
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : EINTR;
}

bool IsServed(const Mount& mount) {
  return std::ranges::any_of(
      kServed, [&mount](std::string_view type) { return mount.type.starts_with(type); });
}

// Whether files can carry labels there at all.
bool CanCarry(const FileDescriptor& tree) {
  const std::string path = StrCat("/proc/self/fd/", tree.Number());
  return getxattr(path.c_str(), kModuleLabelAttribute, nullptr, 0) >= 0 || errno != EOPNOTSUPP;
}

// Returns why not; nothing when all is learned.
std::string Learn(const Mount& mount) {
  if (IsServed(mount)) return "its files are served by others";
  const FileDescriptor tree(
      static_cast<int>(syscall(SYS_open_tree, AT_FDCWD, mount.place.c_str(),
                               OPEN_TREE_CLONE | OPEN_TREE_CLOEXEC | AT_NO_AUTOMOUNT)));
  if (!tree.IsOpen()) return strerror(errno);
  if (!CanCarry(tree)) return {};
  if (std::ranges::find(kTypes, mount.type) == kTypes.end())
    return "its files cannot be told apart for certain";
  if (mount.root != "/") return "only a part of it is mounted";
  const int error = ReadLabelsBeside(tree.Number());
  return error == 0 ? std::string() : strerror(error);
}

}  // namespace

std::vector<UnlabelledMount> LearnLabels(const ModuleMaps& maps) {
  std::vector<UnlabelledMount> unlabelled;
  for (const Mount& mount : ListMounts()) {
    __u32 value = 0;
    if (bpf_map_lookup_elem(maps.devices.Number(), &mount.device, &value) == 0) continue;
    const std::string why = Learn(mount);
    if (!why.empty()) {
      unlabelled.push_back({mount.place, mount.type, why});
      continue;
    }
    Require(bpf_map_update_elem(maps.devices.Number(), &mount.device, &value, BPF_ANY) == 0,
            "cannot write file systems");
  }
  maps.BeginEpoch();
  return unlabelled;
}

}  // namespace Enforce
