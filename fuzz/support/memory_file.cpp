#include "support/memory_file.h"

#include <sys/mman.h>
#include <unistd.h>

#include "support/require.h"

namespace SecPolicyFuzz {

MemoryFile::MemoryFile()
    : descriptor(memfd_create("policy", MFD_CLOEXEC)),
      path("/proc/self/fd/" + std::to_string(descriptor)) {
  Require(descriptor >= 0, "a file in memory can be made");
}

MemoryFile::~MemoryFile() { close(descriptor); }

void MemoryFile::Write(std::string_view text) const {
  const bool emptied = ftruncate(descriptor, 0) == 0;
  const bool written =
      pwrite(descriptor, text.data(), text.size(), 0) == static_cast<ssize_t>(text.size());
  Require(emptied && written, "a file in memory can be written");
}

}  // namespace SecPolicyFuzz
