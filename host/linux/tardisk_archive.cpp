#include "tardisk_archive.h"

#include <archive.h>
#include <archive_entry.h>
#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstring>
#include <filesystem>
#include <memory>
#include <new>
#include <set>
#include <string_view>
#include <utility>
#include <vector>

#include "braxo/misc/strcat.h"
#include "descriptor.h"
#include "host_error.h"
#include "inode_origin.h"
#include "running_system.h"

namespace LinuxHost {
namespace {

using Braxo::Misc::StrCat;

// Extended attributes stay in the archive: labels are the policy's to give.
constexpr int kUnpackFlags = ARCHIVE_EXTRACT_PERM | ARCHIVE_EXTRACT_TIME |
                             ARCHIVE_EXTRACT_SECURE_SYMLINKS | ARCHIVE_EXTRACT_SECURE_NODOTDOT |
                             ARCHIVE_EXTRACT_SECURE_NOABSOLUTEPATHS;

struct FreeReader {
  void operator()(archive* reader) const { archive_read_free(reader); }
};
struct FreeWriter {
  void operator()(archive* writer) const { archive_write_free(writer); }
};
using Reader = std::unique_ptr<archive, FreeReader>;
using Writer = std::unique_ptr<archive, FreeWriter>;

// Only what a tar archive needs: every other format is attack surface, and some read local files
// by name.
Reader NewReader() {
  Reader reader(archive_read_new());
  if (!reader) throw std::bad_alloc();
  archive_read_support_format_tar(reader.get());
  archive_read_support_filter_gzip(reader.get());
  archive_read_support_filter_bzip2(reader.get());
  archive_read_support_filter_xz(reader.get());
  archive_read_support_filter_zstd(reader.get());
  return reader;
}

Writer NewWriter() {
  Writer writer(archive_write_disk_new());
  if (!writer) throw std::bad_alloc();
  // Only the superuser can give files away.
  archive_write_disk_set_options(writer.get(),
                                 kUnpackFlags | (geteuid() == 0 ? ARCHIVE_EXTRACT_OWNER : 0));
  return writer;
}

std::string_view TextOf(const char* text) { return text == nullptr ? "" : text; }

// Why the last step failed. The library leaves the system's own text out, and tells a malformed
// archive by an error number of the system, EILSEQ, that would only confuse.
std::string ReasonOf(archive* handle) {
  const std::string_view text = TextOf(archive_error_string(handle));
  const int error = archive_errno(handle);
  if (error <= 0 || error == EILSEQ) return std::string(text);
  return StrCat(text, ": ", std::strerror(error));
}

// The components of `path` that lead somewhere: neither empty ones nor ".".
std::vector<std::string_view> Components(std::string_view path) {
  std::vector<std::string_view> components;
  while (!path.empty()) {
    const std::string_view component = path.substr(0, path.find('/'));
    path.remove_prefix(std::min(component.size() + 1, path.size()));
    if (!component.empty() && component != ".") components.push_back(component);
  }
  return components;
}

// The path of an entry as it is found in the root: behind a link, "/" and "/." would lead on to
// what the link points to.
std::string PlainPath(std::string_view path) {
  std::string plain;
  for (const std::string_view component : Components(path)) {
    if (!plain.empty()) plain += '/';
    plain += component;
  }
  return plain;
}

// One archive on its way into the working directory.
class Unpacking {
 public:
  Unpacking(const std::string& image, const Arrival& receiver)
      : tardisk(std::filesystem::path(image).filename()),
        arrived(receiver),
        file(open(image.c_str(), O_RDONLY | O_NOFOLLOW | O_CLOEXEC)),
        reader(NewReader()),
        writer(NewWriter()) {
    if (!file.IsOpen()) Fail(errno, std::strerror(errno));
    if (archive_read_open_fd(reader.get(), file.Number(), kBlockSize) != ARCHIVE_OK) {
      FailReading();
    }
  }

  void Run() {
    while (archive_entry* entry = NextEntry()) Unpack(entry);
    // Attributes of directories are set last, or they would change while the files are written.
    if (archive_write_close(writer.get()) != ARCHIVE_OK) {
      Fail(archive_errno(writer.get()), ReasonOf(writer.get()));
    }
  }

 private:
  static constexpr std::size_t kBlockSize = 65536;

  [[noreturn]] void Fail(int error, std::string_view reason) const {
    throw HostError(error > 0 ? error : EINVAL,
                    StrCat("Unable to unpack tardisk ", tardisk, ": ", reason));
  }

  [[noreturn]] void FailReading() const {
    Fail(archive_errno(reader.get()), ReasonOf(reader.get()));
  }

  [[noreturn]] void Refuse(std::string_view path, std::string_view reason) const {
    Fail(EINVAL, StrCat(path, ": ", reason));
  }

  // Null after the last entry. A warning is about a name that is not text, which a name need not
  // be.
  archive_entry* NextEntry() const {
    archive_entry* entry = nullptr;
    const int result = archive_read_next_header(reader.get(), &entry);
    if (result == ARCHIVE_EOF) return nullptr;
    if (result != ARCHIVE_OK && result != ARCHIVE_WARN) FailReading();
    return entry;
  }

  void Unpack(archive_entry* entry) {
    const std::string path(TextOf(archive_entry_pathname(entry)));
    if (IsAlreadyThere(path, entry)) return;
    RefuseUnwanted(path, entry);
    if (archive_read_extract2(reader.get(), entry, writer.get()) != ARCHIVE_OK) {
      Fail(archive_errno(reader.get()), StrCat(path, ": ", ReasonOf(reader.get())));
    }
    Settle(PlainPath(path));
  }

  // The root itself, and a running system's directory, which another file system may cover by now.
  static bool IsAlreadyThere(const std::string& path, archive_entry* entry) {
    if (archive_entry_filetype(entry) != AE_IFDIR || path.starts_with('/')) return false;
    const std::vector<std::string_view> components = Components(path);
    if (components.empty()) return !path.empty();
    struct stat status;
    return components.size() == 1 && IsRunningSystem(components[0]) &&
           lstat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode);
  }

  void RefuseUnwanted(const std::string& path, archive_entry* entry) const {
    if (path.empty()) Refuse("an entry", "It has no name");
    if (path.size() >= PATH_MAX) Refuse(path, "Its name is too long");
    RefuseForeignPlace(path, entry);
    if (const char* target = archive_entry_hardlink(entry)) return RefuseForeignLink(path, target);
    switch (archive_entry_filetype(entry)) {
      case AE_IFREG:
      case AE_IFDIR:
      case AE_IFLNK:
      case AE_IFIFO:
        return;
      default:
        Refuse(path, "Devices and sockets are made by the running system");
    }
  }

  // Which images make up the root is decided before the first of them is unpacked.
  void RefuseForeignPlace(const std::string& path, archive_entry* entry) const {
    const std::vector<std::string_view> components = Components(path);
    if (components.empty()) Refuse(path, "It is the root");
    if (components.size() == 1 && archive_entry_filetype(entry) == AE_IFDIR) return;
    if (IsRunningSystem(components[0])) Refuse(path, "It belongs to the running system");
    if (components[0] == "tardisks") Refuse(path, "It belongs to the tardisk images");
  }

  // Otherwise a tardisk could write to a file of somebody else, and pass for where it came from.
  void RefuseForeignLink(const std::string& path, const char* target) const {
    struct statx status;
    if (Examine(target, &status) && brought.contains({DeviceOf(status), status.stx_ino})) return;
    Refuse(path, StrCat("It is a hard link to ", target, ", which this tardisk did not bring"));
  }

  void Settle(const std::string& path) {
    struct statx status;
    if (!Examine(path.c_str(), &status)) Fail(errno, StrCat(path, ": ", std::strerror(errno)));
    const int error = arrived(path, status);
    if (error != 0) Fail(error, StrCat(path, ": ", std::strerror(error)));
    brought.emplace(DeviceOf(status), status.stx_ino);
  }

  const std::string tardisk;
  const Arrival& arrived;
  const Descriptor file;
  const Reader reader;
  const Writer writer;
  std::set<std::pair<dev_t, ino_t>> brought;
};

}  // namespace

void UnpackArchive(const std::string& image, const Arrival& arrived) {
  Unpacking(image, arrived).Run();
}

}  // namespace LinuxHost
