#pragma once

#include <cstddef>
#include <string>

namespace LinuxHost {

// What a text of policy may be, and what messages call it.
struct TextLimit {
  const char* noun;       // "path"
  const char* whenEmpty;  // the whole message about an empty one
  std::size_t maxSize;    // in bytes
};

// Throws HostError for a text that is empty, goes on behind a NUL byte or is too long.
void RequireText(const std::string& text, const TextLimit& limit);

}  // namespace LinuxHost
