#include "store_copy.h"

#include <sqlite3.h>
#include <unistd.h>

#include <memory>

namespace LinuxHost {
namespace {

struct CloseDatabase {
  void operator()(sqlite3* database) const { sqlite3_close(database); }
};
using Database = std::unique_ptr<sqlite3, CloseDatabase>;

// The path as a name that says how to open it. A database that nobody has open is read as it lies:
// otherwise the engine would leave files of its own beside it.
std::string ReadOnlyName(const std::string& path) {
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
  name += "?mode=ro";
  if (access((path + "-wal").c_str(), F_OK) != 0) name += "&immutable=1";
  return name;
}

Database Open(const std::string& name, int flags) {
  sqlite3* database = nullptr;
  sqlite3_open_v2(name.c_str(), &database, flags, nullptr);
  return Database(database);
}

}  // namespace

std::string CopyDatabase(const std::string& from, const std::string& to) {
  const Database source = Open(ReadOnlyName(from), SQLITE_OPEN_READONLY | SQLITE_OPEN_URI);
  if (sqlite3_errcode(source.get()) != SQLITE_OK) return sqlite3_errmsg(source.get());
  const Database target = Open(to, SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE);
  if (sqlite3_errcode(target.get()) != SQLITE_OK) return sqlite3_errmsg(target.get());
  // The copy need not survive anything.
  sqlite3_exec(target.get(), "PRAGMA synchronous = OFF", nullptr, nullptr, nullptr);
  sqlite3_backup* const backup = sqlite3_backup_init(target.get(), "main", source.get(), "main");
  if (backup == nullptr) return sqlite3_errmsg(target.get());
  sqlite3_backup_step(backup, -1);
  if (sqlite3_backup_finish(backup) != SQLITE_OK) return sqlite3_errmsg(target.get());
  return "";
}

}  // namespace LinuxHost
