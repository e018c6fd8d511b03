#include "scratch_state.h"

#include <sqlite3.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <system_error>

namespace SecPolicyCli {
namespace {

constexpr char kStateVariable[] = "SECPOLICY_HOST_STATE";
constexpr char kInstalledState[] = "/run/secpolicy/host.db";

struct CloseDatabase {
  void operator()(sqlite3* database) const { sqlite3_close(database); }
};
using Database = std::unique_ptr<sqlite3, CloseDatabase>;

// A root that was never booted has none of the usual places.
std::string MakePrivateDirectory() {
  const char* const wanted = secure_getenv("TMPDIR");
  for (const std::string place :
       {wanted == nullptr ? "" : wanted, "/tmp", "/var/tmp", "/run", ""}) {
    std::string directory = place + "/secpolicy-check.XXXXXX";
    if (mkdtemp(directory.data()) != nullptr) return directory;
  }
  throw std::system_error(errno, std::generic_category(),
                          "cannot make a directory for the scratch state; TMPDIR can name a place");
}

std::string InstalledState() {
  const char* const path = secure_getenv(kStateVariable);
  return path != nullptr && *path != '\0' ? path : kInstalledState;
}

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

// Copies a database. Returns why it could not; empty when it could.
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

}  // namespace

ScratchState::ScratchState(bool fresh) : directory(MakePrivateDirectory()) {
  const std::string state = directory + "/host.db";
  const std::string installed = InstalledState();
  if (!fresh && access(installed.c_str(), R_OK) == 0) {
    copyFailure = CopyDatabase(installed, state);
    copied = copyFailure.empty();
    // The host trusts only what nobody else can write, and makes a new one where there is none.
    if (copied) {
      std::filesystem::permissions(state, std::filesystem::perms(0600));
    } else {
      std::filesystem::remove(state);
    }
  } else if (!fresh && errno != ENOENT) {
    copyFailure = std::generic_category().message(errno);
  }
  setenv(kStateVariable, state.c_str(), 1);
}

ScratchState::~ScratchState() {
  std::error_code ignored;
  std::filesystem::remove_all(directory, ignored);
}

}  // namespace SecPolicyCli
