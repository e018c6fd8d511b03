#include "host/linux/files/tardisk_stream.h"

#include <archive.h>
#include <archive_entry.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <zlib.h>

#include <cerrno>
#include <cstring>
#include <new>
#include <vector>

#include "host/linux/common/host_error.h"
#include "host/linux/files/archive_handle.h"

namespace LinuxHost {
namespace {

constexpr std::size_t kPieceSize = 65536;
constexpr char kCut[] = "It is cut off in the middle of its compressed data";

// A file of gzip members, each up to its check sum and length, which libarchive passes over.
class GzipMembers : public ByteSource {
 public:
  explicit GzipMembers(int number) : file(number), packed(kPieceSize), plain(kPieceSize) {
    constexpr int kGzipOnly = 16;
    if (inflateInit2(&inflater, MAX_WBITS + kGzipOnly) != Z_OK) throw std::bad_alloc();
  }
  GzipMembers(const GzipMembers&) = delete;
  GzipMembers& operator=(const GzipMembers&) = delete;
  ~GzipMembers() override { inflateEnd(&inflater); }

  std::string_view Read() override {
    inflater.next_out = plain.data();
    inflater.avail_out = static_cast<uInt>(plain.size());
    while (inflater.next_out == plain.data() && HasMore()) Inflate();
    return {reinterpret_cast<const char*>(plain.data()),
            static_cast<std::size_t>(inflater.next_out - plain.data())};
  }

 private:
  bool HasMore() {
    if (inflater.avail_in > 0) return true;
    const ssize_t count = read(file, packed.data(), packed.size());
    if (count < 0) ThrowErrno();
    inflater.next_in = packed.data();
    inflater.avail_in = static_cast<uInt>(count);
    if (count == 0 && isInMember) throw HostError(EINVAL, kCut);
    return count > 0;
  }

  void Inflate() {
    isInMember = true;
    const int result = inflate(&inflater, Z_NO_FLUSH);
    if (result == Z_STREAM_END) {
      isInMember = false;
      inflateReset(&inflater);
    } else if (result != Z_OK) {
      const char* const reason = inflater.msg != nullptr ? inflater.msg : zError(result);
      throw HostError(EINVAL, std::string("Its gzip data is damaged: ") + reason);
    }
  }

  const int file;
  z_stream inflater{};
  bool isInMember = false;
  std::vector<Bytef> packed;
  std::vector<Bytef> plain;
};

// What libarchive unpacks, with all checks, in one step; a file that is not compressed as it is.
class FilteredFile : public ByteSource {
 public:
  explicit FilteredFile(int number) : file(number), reader(NewReader()) {
    archive_read_support_format_raw(reader.get());
    archive_read_support_format_empty(reader.get());
    archive_read_support_filter_bzip2(reader.get());
    archive_read_support_filter_xz(reader.get());
    archive_read_support_filter_zstd(reader.get());
    if (archive_read_open_fd(reader.get(), file, kPieceSize) != ARCHIVE_OK) Fail();
    archive_entry* entry = nullptr;
    const int result = archive_read_next_header(reader.get(), &entry);
    if (result != ARCHIVE_OK && result != ARCHIVE_EOF) Fail();
    isOver = result == ARCHIVE_EOF;
    // One filter, and the file itself.
    if (archive_filter_count(reader.get()) > 2) {
      throw HostError(EINVAL, "It is compressed more than once");
    }
  }

  std::string_view Read() override {
    const void* piece = nullptr;
    std::size_t size = 0;
    while (!isOver && size == 0) {
      la_int64_t offset = 0;
      const int result = archive_read_data_block(reader.get(), &piece, &size, &offset);
      if (result == ARCHIVE_EOF) return End();
      if (result != ARCHIVE_OK) Fail();
    }
    return {static_cast<const char*>(piece), size};
  }

 private:
  std::string_view End() {
    isOver = true;
    struct stat status {};
    if (fstat(file, &status) != 0) ThrowErrno();
    if (archive_filter_bytes(reader.get(), -1) == status.st_size) return {};
    throw HostError(EINVAL, "Its compressed data is followed by something else");
  }

  [[noreturn]] void Fail() const { throw HostError(EINVAL, ReasonOf(reader.get())); }

  const int file;
  const ArchiveReader reader;
  bool isOver = false;
};

bool IsGzip(int file) {
  unsigned char head[2] = {};
  return pread(file, head, sizeof head, 0) == sizeof head && head[0] == 0x1f && head[1] == 0x8b;
}

std::unique_ptr<ByteSource> NewSource(const Descriptor& file) {
  if (!file.IsOpen()) ThrowErrno();
  if (IsGzip(file.Number())) return std::make_unique<GzipMembers>(file.Number());
  return std::make_unique<FilteredFile>(file.Number());
}

}  // namespace

TardiskStream::TardiskStream(const std::string& image)
    : file(open(image.c_str(), O_RDONLY | O_NOFOLLOW | O_CLOEXEC)), source(NewSource(file)) {}

std::string_view TardiskStream::Read() {
  const std::string_view piece = source->Read();
  const std::size_t last = piece.find_last_not_of('\0');
  if (last != std::string_view::npos) zerosFrom = size + last + 1;
  size += piece.size();
  return piece;
}

}  // namespace LinuxHost
