#pragma once

#include <archive_entry.h>

#include <cstdint>
#include <exception>
#include <string>
#include <string_view>

#include "host/linux/files/archive_handle.h"
#include "host/linux/files/tardisk_stream.h"

namespace LinuxHost {

// A piece of what a file of an archive holds. Between the pieces there are zeros.
struct ContentPiece {
  std::uint64_t offset;
  std::string_view bytes;
};

// Reads the tar archive in a tardisk image, entry by entry. What is wrong with the archive is a
// HostError with the bare reason.
class TarReader {
 public:
  explicit TarReader(const std::string& image);
  TarReader(const TarReader&) = delete;
  TarReader& operator=(const TarReader&) = delete;

  // The next entry, which holds until the next call; null after the last one, when all is right up
  // to the end of the image: the mark at the end of the archive, and nothing but zeros behind it.
  archive_entry* Next();

  // Reads on in the file that Next() returned; false at its end.
  bool ReadContent(ContentPiece* piece);

  // Writes the entry that Next() returned to the disk.
  void Extract(archive_entry* entry, archive* writer);

 private:
  // What libarchive reads the archive by.
  static la_ssize_t ReadStream(archive* reader, void* self, const void** bytes);

  [[noreturn]] void Fail() const;
  void CheckEnd();

  TardiskStream stream;
  std::exception_ptr streamFailure;
  const ArchiveReader reader;
};

}  // namespace LinuxHost
