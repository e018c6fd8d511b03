#include "host/linux/files/tar_reader.h"

#include <cerrno>

#include "host/linux/common/host_error.h"

namespace LinuxHost {
namespace {

// Two blocks of zeros.
constexpr std::uint64_t kEndMarkSize = 1024;

// A name need not be text in the language of whoever boots. Any other warning tells of something
// that was passed over.
bool IsHarmless(archive* reader) {
  const std::string_view text = archive_error_string(reader);
  return text.find("can't be converted") != std::string_view::npos;
}

}  // namespace

// Only what a tar archive needs: every other format is attack surface, and some read local files
// by name.
TarReader::TarReader(const std::string& image) : stream(image), reader(NewReader()) {
  archive_read_support_format_tar(reader.get());
  if (archive_read_open(reader.get(), this, nullptr, ReadStream, nullptr) != ARCHIVE_OK) Fail();
}

archive_entry* TarReader::Next() {
  archive_entry* entry = nullptr;
  const int result = archive_read_next_header(reader.get(), &entry);
  if (result == ARCHIVE_OK || (result == ARCHIVE_WARN && IsHarmless(reader.get()))) return entry;
  if (result != ARCHIVE_EOF) Fail();
  CheckEnd();
  return nullptr;
}

bool TarReader::ReadContent(ContentPiece* piece) {
  const void* bytes = nullptr;
  std::size_t size = 0;
  la_int64_t offset = 0;
  const int result = archive_read_data_block(reader.get(), &bytes, &size, &offset);
  if (result == ARCHIVE_EOF) return false;
  if (result != ARCHIVE_OK) Fail();
  *piece = {.offset = static_cast<std::uint64_t>(offset),
            .bytes = {static_cast<const char*>(bytes), size}};
  return true;
}

void TarReader::Extract(archive_entry* entry, archive* writer) {
  if (archive_read_extract2(reader.get(), entry, writer) != ARCHIVE_OK) Fail();
}

la_ssize_t TarReader::ReadStream(archive* reader, void* self, const void** bytes) {
  auto& tar = *static_cast<TarReader*>(self);
  try {
    const std::string_view piece = tar.stream.Read();
    *bytes = piece.data();
    return static_cast<la_ssize_t>(piece.size());
  } catch (const HostError& error) {
    // It would not come through the library, which keeps no reason of others for certain either.
    tar.streamFailure = std::current_exception();
    archive_set_error(reader, error.Code(), "%s", error.what());
    return -1;
  }
}

void TarReader::Fail() const {
  if (streamFailure) std::rethrow_exception(streamFailure);
  const int error = archive_errno(reader.get());
  throw HostError(error > 0 ? error : EINVAL, ReasonOf(reader.get()));
}

// The reader stops at the first block of zeros and calls that the end, and so it does where the
// image stops behind an entry.
void TarReader::CheckEnd() {
  if (streamFailure) Fail();
  while (!stream.Read().empty()) continue;
  const auto end = static_cast<std::uint64_t>(archive_read_header_position(reader.get()));
  if (stream.ZerosFrom() > end) {
    throw HostError(EINVAL, "It holds something else behind the end of its archive");
  }
  if (stream.Size() - end >= kEndMarkSize) return;
  throw HostError(EINVAL, "It lacks the two blocks of zeros at its end, so it was cut off");
}

}  // namespace LinuxHost
