// Archives come from outside and are read by the superuser. So each is read twice: once to its last
// byte while nothing is written, when every entry is judged by what all the entries before it will
// have made of the root; and once to unpack it, when it is judged again, since it may have been
// changed in between.
#include "host/linux/files/tardisk_archive.h"

#include <archive.h>
#include <archive_entry.h>
#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <new>
#include <string_view>
#include <vector>

#include "braxo/misc/strcat.h"
#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/inode_origin.h"
#include "host/linux/files/archive_admission.h"
#include "host/linux/files/archive_handle.h"
#include "host/linux/files/archive_path.h"
#include "host/linux/files/tar_reader.h"

namespace LinuxHost {
namespace {

using Braxo::Misc::StrCat;

// Extended attributes stay in the archive: labels are the policy's to give.
constexpr int kUnpackFlags = ARCHIVE_EXTRACT_PERM | ARCHIVE_EXTRACT_TIME |
                             ARCHIVE_EXTRACT_SECURE_SYMLINKS | ARCHIVE_EXTRACT_SECURE_NODOTDOT |
                             ARCHIVE_EXTRACT_SECURE_NOABSOLUTEPATHS;

ArchiveWriter NewWriter() {
  ArchiveWriter writer(archive_write_disk_new());
  if (!writer) throw std::bad_alloc();
  // Only the superuser can give files away.
  archive_write_disk_set_options(writer.get(),
                                 kUnpackFlags | (geteuid() == 0 ? ARCHIVE_EXTRACT_OWNER : 0));
  return writer;
}

std::string NameOf(const std::string& image) { return std::filesystem::path(image).filename(); }

std::string PathOf(archive_entry* entry) { return PlainPath(archive_entry_pathname(entry)); }

// Takes a step with the tardisk in `image`; its failure gets the tardisk's name.
template <class Step>
void WithName(const std::string& image, Step step) {
  try {
    step();
  } catch (const HostError& error) {
    throw HostError(error.Code(),
                    StrCat("Unable to unpack tardisk ", NameOf(image), ": ", error.what()));
  }
}

// Compares the file at `path` with the content that an archive has for it, piece by piece.
class ContentComparison {
 public:
  explicit ContentComparison(const std::string& path)
      : file(open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_CLOEXEC | O_NONBLOCK)) {}

  bool HasZerosUpTo(std::uint64_t end) {
    static constexpr char kZeros[4096] = {};
    bool same = true;
    while (same && position < end) {
      same = HasNext({kZeros, static_cast<std::size_t>(
                                  std::min<std::uint64_t>(sizeof kZeros, end - position))});
    }
    return same;
  }

  bool HasNext(std::string_view bytes) {
    buffer.resize(bytes.size());
    const ssize_t count =
        pread(file.Number(), buffer.data(), buffer.size(), static_cast<off_t>(position));
    position += bytes.size();
    return count == static_cast<ssize_t>(bytes.size()) &&
           std::memcmp(buffer.data(), bytes.data(), bytes.size()) == 0;
  }

 private:
  const Descriptor file;
  std::uint64_t position = 0;
  std::vector<char> buffer;
};

// One archive, read to its end.
class Checking {
 public:
  Checking(const std::string& image, ArchiveAdmission& judge, ArchiveInspector& observer)
      : reader(image), admission(judge), inspector(observer) {}

  void Run() {
    while (archive_entry* entry = reader.Next()) {
      if (admission.Admits(entry)) Inspect(entry);
      ContentPiece rest;
      while (reader.ReadContent(&rest)) continue;
    }
  }

 private:
  void Inspect(archive_entry* entry) {
    ArchiveFinding finding{
        .path = PathOf(entry), .type = TypeOf(entry), .present = 0, .differs = false};
    struct statx present;
    if (Examine(finding.path.c_str(), &present)) {
      finding.present = present.stx_mode & S_IFMT;
      finding.differs = !S_ISDIR(finding.present) &&
                        inspector.WantsComparison(finding.path, present) &&
                        Differs(entry, finding, present);
    }
    inspector.Take(finding);
  }

  // A hard link is to a file that the archive brought.
  static mode_t TypeOf(archive_entry* entry) {
    return archive_entry_hardlink(entry) != nullptr ? S_IFREG : archive_entry_filetype(entry);
  }

  bool Differs(archive_entry* entry, const ArchiveFinding& finding, const struct statx& present) {
    if (const char* target = archive_entry_hardlink(entry)) return !IsSameFile(target, present);
    if (finding.type != finding.present) return true;
    if (S_ISLNK(finding.type)) return HasOtherTarget(entry, finding.path);
    return S_ISREG(finding.type) && HasOtherContent(entry, finding.path, present);
  }

  // Then it is compared at the other name.
  static bool IsSameFile(const char* path, const struct statx& present) {
    struct statx other;
    return Examine(path, &other) && other.stx_ino == present.stx_ino &&
           DeviceOf(other) == DeviceOf(present);
  }

  static bool HasOtherTarget(archive_entry* entry, const std::string& path) {
    std::error_code error;
    const std::string target = std::filesystem::read_symlink(path, error);
    return error || target != archive_entry_symlink(entry);
  }

  bool HasOtherContent(archive_entry* entry, const std::string& path, const struct statx& present) {
    const auto size = static_cast<std::uint64_t>(archive_entry_size(entry));
    if (size != present.stx_size) return true;
    ContentComparison comparison(path);
    ContentPiece piece;
    while (reader.ReadContent(&piece)) {
      if (!comparison.HasZerosUpTo(piece.offset) || !comparison.HasNext(piece.bytes)) return true;
    }
    return !comparison.HasZerosUpTo(size);
  }

  TarReader reader;
  ArchiveAdmission& admission;
  ArchiveInspector& inspector;
};

// One archive on its way into the working directory.
class Unpacking {
 public:
  Unpacking(const std::string& image, const TardiskRules& rules, const Arrival& receiver)
      : arrived(receiver), admission(rules), reader(image), writer(NewWriter()) {
    admission.Begin(NameOf(image));
  }

  void Run() {
    while (archive_entry* entry = reader.Next()) {
      // It may have been changed since it was checked.
      if (admission.Admits(entry)) Unpack(entry);
    }
    // Attributes of directories are set last, or they would change while the files are written.
    if (archive_write_close(writer.get()) == ARCHIVE_OK) return;
    const int error = archive_errno(writer.get());
    throw HostError(error > 0 ? error : EINVAL, ReasonOf(writer.get()));
  }

 private:
  void Unpack(archive_entry* entry) {
    const std::string name = archive_entry_pathname(entry);
    try {
      reader.Extract(entry, writer.get());
      Settle(PlainPath(name));
    } catch (const HostError& error) {
      throw HostError(error.Code(), StrCat(name, ": ", error.what()));
    }
  }

  void Settle(const std::string& path) const {
    struct statx status;
    const int error = Examine(path.c_str(), &status) ? arrived(path, status) : errno;
    if (error != 0) throw HostError(error, std::strerror(error));
  }

  const Arrival& arrived;
  ArchiveAdmission admission;
  TarReader reader;
  const ArchiveWriter writer;
};

}  // namespace

void CheckArchives(const std::vector<std::string>& images, const TardiskRules& rules,
                   ArchiveInspector& inspector) {
  ArchiveAdmission admission(rules);
  for (const std::string& image : images) {
    admission.Begin(NameOf(image));
    inspector.Begin(NameOf(image));
    WithName(image, [&] { Checking(image, admission, inspector).Run(); });
  }
}

void UnpackArchive(const std::string& image, const TardiskRules& rules, const Arrival& arrived) {
  WithName(image, [&] { Unpacking(image, rules, arrived).Run(); });
}

}  // namespace LinuxHost
