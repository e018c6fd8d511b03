// Not every file system answers the request for a generation, but all that have one put it into the
// handles of their files, each at a place of its own.
#include "host/linux/files/inode_generation.h"

#include <fcntl.h>
#include <linux/magic.h>
#include <sys/vfs.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstring>

namespace LinuxHost {
namespace {

struct HandleForm {
  long system;
  int type;
  unsigned int words;
  std::size_t place;  // of the word with the generation
};

constexpr std::array<HandleForm, 5> kForms = {{
    {EXT4_SUPER_MAGIC, 1, 2, 1},
    {F2FS_SUPER_MAGIC, 1, 2, 1},
    {XFS_SUPER_MAGIC, 1, 2, 1},
    {XFS_SUPER_MAGIC, 0x81, 3, 2},
    {TMPFS_MAGIC, 1, 3, 0},
}};

using Word = std::uint32_t;

}  // namespace

std::optional<std::uint32_t> GenerationOf(const char* path) {
  constexpr unsigned int kMostWords = 3;
  struct statfs system = {};
  if (statfs(path, &system) != 0) return std::nullopt;
  alignas(file_handle) std::array<unsigned char, sizeof(file_handle) + kMostWords * sizeof(Word)>
      memory = {};
  auto* const handle = reinterpret_cast<file_handle*>(memory.data());
  handle->handle_bytes = kMostWords * sizeof(Word);
  int mount = 0;
  if (name_to_handle_at(AT_FDCWD, path, handle, &mount, 0) != 0) return std::nullopt;
  const auto* const form = std::ranges::find_if(kForms, [&](const HandleForm& each) {
    return each.system == system.f_type && each.type == handle->handle_type &&
           each.words * sizeof(Word) == handle->handle_bytes;
  });
  if (form == kForms.end()) return std::nullopt;
  Word generation = 0;
  std::memcpy(&generation, memory.data() + sizeof(file_handle) + form->place * sizeof(Word),
              sizeof generation);
  return generation;
}

}  // namespace LinuxHost
