#pragma once

#include <archive.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <new>
#include <string>

#include "braxo/misc/strcat.h"

namespace LinuxHost {

struct FreeReader {
  void operator()(archive* reader) const { archive_read_free(reader); }
};
struct FreeWriter {
  void operator()(archive* writer) const { archive_write_free(writer); }
};
using ArchiveReader = std::unique_ptr<archive, FreeReader>;
using ArchiveWriter = std::unique_ptr<archive, FreeWriter>;

inline ArchiveReader NewReader() {
  ArchiveReader reader(archive_read_new());
  if (!reader) throw std::bad_alloc();
  return reader;
}

// Why the last step failed. The library leaves the system's own text out, and tells a malformed
// archive by error numbers of the system that would only confuse.
inline std::string ReasonOf(archive* handle) {
  const char* const text = archive_error_string(handle);
  std::string reason = text == nullptr ? "" : text;
  const int error = archive_errno(handle);
  if (error <= 0 || error == EILSEQ || error == EINVAL) return reason;
  return Braxo::Misc::StrCat(reason, ": ", std::strerror(error));
}

}  // namespace LinuxHost
