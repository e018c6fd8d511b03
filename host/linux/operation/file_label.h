#pragma once

#include <cstdint>
#include <optional>

namespace LinuxHost {

struct FileLabel {
  std::uint32_t id = 0;
  bool isInherited = false;  // from a directory above; the file itself carries none
};

// The label of the file at `path`; nothing, with errno set, when it has none (ENODATA) or it cannot
// be read. Links on the way to the file are followed, the last one is not.
std::optional<FileLabel> ReadLabel(const char* path);

// The same for the open file that lies at `path`, so that no other file's label is read in its
// place.
std::optional<FileLabel> ReadLabel(int file, const char* path);

// Gives the file at `path` the label `id` in place of the one it has, be that its own or inherited;
// writes nothing to a file that carries it already. Returns 0, or -1 with errno set; ENODATA when
// it had none. Links on the way to the file are followed, the last one is not.
int ReplaceLabel(const char* path, std::uint32_t id);

}  // namespace LinuxHost
