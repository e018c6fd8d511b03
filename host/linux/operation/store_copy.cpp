#include "host/linux/operation/store_copy.h"

#include <fcntl.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <memory>

#include "braxo/misc/strcat.h"
#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/private_file.h"
#include "host/linux/operation/store_seal.h"
#include "host/linux/state/schema.h"

namespace LinuxHost {
namespace {

using Braxo::Misc::StrCat;

struct CloseDatabase {
  void operator()(sqlite3* database) const { sqlite3_close(database); }
};
using Database = std::unique_ptr<sqlite3, CloseDatabase>;

const char* PurposeOf(CopyOf what) {
  switch (what) {
    case CopyOf::kState:
    case CopyOf::kPublicState:
      return "host state";
    case CopyOf::kSettings:
      return "configuration";
    case CopyOf::kSavedState:
      return "saved state";
    case CopyOf::kOwnCopy:
      break;
  }
  return "copy";
}

bool IsAtRest(CopyOf what) { return what == CopyOf::kSavedState || what == CopyOf::kOwnCopy; }

// The path as a name that can say how to open it.
std::string UriOf(const std::string& path, const char* how) {
  std::string name = "file:";
  for (const char letter : path) {
    switch (letter) {
      case '%':
        name += "%25";
        break;
      case '?':
        name += "%3f";
        break;
      case '#':
        name += "%23";
        break;
      default:
        name += letter;
    }
  }
  return name + how;
}

Database Open(const std::string& name, int flags) {
  sqlite3* database = nullptr;
  sqlite3_open_v2(name.c_str(), &database, flags | SQLITE_OPEN_URI, nullptr);
  sqlite3_extended_result_codes(database, 1);
  sqlite3_busy_handler(database, WaitForOthers, nullptr);
  return Database(database);
}

// A database that is at rest is read as it lies. The engine reads any other one as its users do,
// for which it may have to make the log's files anew: they go again when the last user closes it.
Database OpenSource(const std::string& path, bool atRest) {
  if (atRest) return Open(UriOf(path, "?immutable=1"), SQLITE_OPEN_READONLY);
  return Open(UriOf(path, ""), SQLITE_OPEN_READWRITE);
}

// Copies all pages within one look at the source. Returns a result code of the engine.
int CopyPages(sqlite3* source, sqlite3* target) {
  // The copy need not survive anything.
  sqlite3_exec(target, "PRAGMA synchronous = OFF", nullptr, nullptr, nullptr);
  sqlite3_backup* const backup = sqlite3_backup_init(target, "main", source, "main");
  if (backup == nullptr) return sqlite3_extended_errcode(target);
  int result = SQLITE_OK;
  int waits = 0;
  do {
    result = sqlite3_backup_step(backup, -1);
  } while ((result & 0xff) == SQLITE_BUSY && WaitForOthers(nullptr, waits++) != 0);
  const int end = sqlite3_backup_finish(backup);
  return result == SQLITE_DONE ? end : result;
}

// Keeps a log beside a database that this user cannot write, from the first commit on: as long as
// somebody else reads the database, nobody moves the log into it and removes it. So when there is
// no log in the end, the database was at rest all the time.
class LogKeeper {
 public:
  explicit LogKeeper(const std::string& path)
      : log(path + "-wal"), file(open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_CLOEXEC)) {
    // What the engine locks while it reads; the numbers are part of its file format.
    struct flock shared {};
    shared.l_type = F_RDLCK;
    shared.l_whence = SEEK_SET;
    shared.l_start = 0x40000002;
    shared.l_len = 510;
    locked = file.IsOpen() && fcntl(file.Number(), F_OFD_SETLK, &shared) == 0;
  }

  bool IsAtRest() const { return locked && access(log.c_str(), F_OK) != 0 && errno == ENOENT; }

 private:
  const std::string log;
  const Descriptor file;
  bool locked = false;
};

// For a source that this user may not use as a writer does. Its own descriptor must not be closed
// while this process has the database open otherwise.
int CopyUnwritable(const std::string& path, sqlite3* target, int otherwise) {
  const LogKeeper keeper(path);
  if (!keeper.IsAtRest()) return otherwise;
  const int result = CopyPages(OpenSource(path, true).get(), target);
  return keeper.IsAtRest() ? result : otherwise;
}

bool MayWrite(const std::string& path) {
  return faccessat(AT_FDCWD, path.c_str(), W_OK, AT_EACCESS) == 0 &&
         faccessat(AT_FDCWD, path.substr(0, path.rfind('/') + 1).c_str(), W_OK, AT_EACCESS) == 0;
}

int Copy(const std::string& from, CopyOf what, sqlite3* target, int* systemError) {
  const Database source = OpenSource(from, IsAtRest(what));
  int result = sqlite3_extended_errcode(source.get());
  if (result == SQLITE_OK) result = CopyPages(source.get(), target);
  *systemError = sqlite3_system_errno(source.get());
  if (result == SQLITE_OK || IsAtRest(what) || MayWrite(from)) return result;
  return CopyUnwritable(from, target, result);
}

[[noreturn]] void ThrowNotCopied(const std::string& from, CopyOf what, const std::string& reason,
                                 int code) {
  throw HostError(code, StrCat("Unable to copy the ", PurposeOf(what), " ", from, ": ", reason));
}

bool LacksDescriptors(int systemError) { return systemError == EMFILE || systemError == ENFILE; }

std::string ReasonOf(int result, int sourceError, int targetError) {
  if (LacksDescriptors(sourceError)) return std::strerror(sourceError);
  if (LacksDescriptors(targetError)) return std::strerror(targetError);
  return sqlite3_errstr(result);
}

// Makes the copy of a saved state a state again. Returns what is wrong with it; what is of another
// version tells so itself when it is used.
std::string Unseal(const std::string& copy) {
  if (StoredVersion(copy) != kStateLayout.version) return FindDamage(copy);
  std::string damage = FindBrokenSeal(copy);
  if (damage.empty()) RemoveSeal(copy);
  return damage;
}

std::string DamageOf(const std::string& copy, CopyOf what) {
  switch (what) {
    case CopyOf::kSavedState:
      return Unseal(copy);
    case CopyOf::kPublicState:
      return FindDamagedPages(copy);
    case CopyOf::kState:
    case CopyOf::kSettings:
    case CopyOf::kOwnCopy:
      break;
  }
  return FindDamage(copy);
}

// Leaves no file behind unless it is kept.
class TargetFile {
 public:
  explicit TargetFile(const std::string& target)
      : path(target),
        made(open(path.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR)) {
    if (made.IsOpen()) return;
    ThrowErrno("Unable to write ", path);
  }
  TargetFile(const TargetFile&) = delete;
  TargetFile& operator=(const TargetFile&) = delete;
  ~TargetFile() {
    if (!kept) unlink(path.c_str());
  }

  void Keep() { kept = true; }

 private:
  const std::string path;
  const Descriptor made;
  bool kept = false;
};

}  // namespace

void CopyDatabase(const std::string& from, CopyOf what, const std::string& to) {
  const struct stat trusted = RequirePrivateFile(from, PurposeOf(what));
  // The engine takes a file of one byte for an empty one.
  if (what == CopyOf::kSavedState && trusted.st_size <= 1) {
    ThrowNotCopied(from, what, "it is no saved state", EPROTO);
  }
  TargetFile file(to);
  {
    const Database target = Open(UriOf(to, ""), SQLITE_OPEN_READWRITE);
    int sourceError = 0;
    const int result = Copy(from, what, target.get(), &sourceError);
    if (result != SQLITE_OK) {
      const int targetError = sqlite3_system_errno(target.get());
      ThrowNotCopied(from, what, ReasonOf(result, sourceError, targetError), EIO);
    }
  }
  const std::string damage = DamageOf(to, what);
  if (!damage.empty()) ThrowNotCopied(from, what, damage, EIO);
  file.Keep();
}

}  // namespace LinuxHost
