// Of a new file the kernel's programs know the number and the generation, by which its file system
// finds it again: such a handle is what exports of file systems are made of.
#include "host/enforce/module/label_writing.h"

#include <fcntl.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <string_view>
#include <vector>

#include "braxo/misc/strcat.h"
#include "host/enforce/module/hash_map.h"
#include "host/enforce/module/mounts.h"

using Braxo::Misc::StrCat;

namespace Enforce {
namespace {

// Those that know the short kind of handle, and keep what they are given.
constexpr std::array<std::string_view, 5> kTypes = {"ext2", "ext3", "ext4", "f2fs", "xfs"};
constexpr int kNumberAndGeneration = 1;

struct ShortHandle {
  __u32 inode;
  __u32 generation;
};

FileDescriptor OpenByHandle(int place, const ModuleFile& file) {
  const ShortHandle content = {static_cast<__u32>(file.inode), file.generation};
  alignas(file_handle) std::array<unsigned char, sizeof(file_handle) + sizeof(content)> memory = {};
  auto* const handle = reinterpret_cast<file_handle*>(memory.data());
  handle->handle_bytes = sizeof(content);
  handle->handle_type = kNumberAndGeneration;
  std::memcpy(memory.data() + sizeof(file_handle), &content, sizeof(content));
  return FileDescriptor(open_by_handle_at(place, handle, O_PATH | O_CLOEXEC));
}

// What is gone needs none.
bool WriteLabel(int place, const ModuleFile& file, __u32 label) {
  const FileDescriptor found = OpenByHandle(place, file);
  if (!found.IsOpen()) return errno == ESTALE || errno == ENOENT;
  const std::string path = StrCat("/proc/self/fd/", found.Number());
  return setxattr(path.c_str(), kModuleLabelAttribute, &label, sizeof(label), 0) == 0;
}

struct Unwritten {
  ModuleFile file;
  __u32 label;
};

std::vector<Unwritten> FindUnwritten(const ModuleMaps& maps) {
  std::vector<Unwritten> found;
  ForEach<ModuleFile, __u32>(maps.labels, [&found](const ModuleFile& file, __u32 label) {
    if ((label & kLabelIsUnwritten) != 0) found.push_back({file, label & ~kLabelIsUnwritten});
  });
  return found;
}

}  // namespace

std::size_t WriteLabels(const ModuleMaps& maps) {
  std::vector<Unwritten> unwritten = FindUnwritten(maps);
  if (unwritten.empty()) return 0;
  for (const Mount& mount : ListMounts()) {
    if (std::ranges::find(kTypes, mount.type) == kTypes.end()) continue;
    const FileDescriptor place(open(mount.place.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
    if (!place.IsOpen()) continue;
    std::erase_if(unwritten, [&mount, &place](const Unwritten& one) {
      return one.file.device == mount.device && WriteLabel(place.Number(), one.file, one.label);
    });
  }
  return unwritten.size();
}

}  // namespace Enforce
