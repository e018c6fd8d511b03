// One database that many processes use at the same time, some of them services that must not wait.
// So it has a write-ahead log: who reads never waits, and who writes waits for other writers alone.
// What one call does is one statement or one transaction; statements are prepared once and kept,
// since a load runs the same one a hundred thousand times. A connection belongs to the process that
// opened it: in a forked child it is neither used nor closed, for that would act on the parent's
// files.
#include "host/linux/state/store.h"

#include <fcntl.h>
#include <sqlite3.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <string_view>
#include <utility>
#include <vector>

#include "braxo/misc/strcat.h"
#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/private_file.h"
#include "host/linux/common/this_process.h"

using Braxo::Misc::StrCat;

namespace LinuxHost {
namespace {

constexpr unsigned int kShortWaitMicroseconds = 100;
constexpr unsigned int kLongWaitMicroseconds = 1000;
constexpr int kShortWaits = 100;
constexpr int kWaits = 30'000;

int ErrorNumber(int result) {
  switch (result & 0xff) {
    case SQLITE_BUSY:
    case SQLITE_LOCKED:
      return EBUSY;
    case SQLITE_FULL:
      return ENOSPC;
    case SQLITE_READONLY:
      return EROFS;
    case SQLITE_NOMEM:
      return ENOMEM;
    case SQLITE_PERM:
    case SQLITE_AUTH:
    case SQLITE_CANTOPEN:
      return EACCES;
    default:
      return EIO;
  }
}

// The statements are our own and fit the schema: one that is wrong has met another schema.
bool IsDamaged(int result) {
  const int kind = result & 0xff;
  return kind == SQLITE_CORRUPT || kind == SQLITE_NOTADB || kind == SQLITE_ERROR;
}

// What to do about a failure that the state itself has no part in. Empty when nothing helps.
const char* RemedyFor(int result) {
  const bool full = (result & 0xff) == SQLITE_FULL || result == SQLITE_IOERR_SHMSIZE;
  return full ? ". Make room there, and run it again" : "";
}

// Connections that a fork left in a child. To close one would act on the parent's files.
void Abandon(sqlite3* database) {
  static auto* abandoned = new std::vector<sqlite3*>;
  abandoned->push_back(database);
}

// Held while a database is set up, so that one process does it and the others wait.
class DirectoryLock {
 public:
  explicit DirectoryLock(const std::string& directory)
      : opened(open(directory.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC)) {
    if (!opened.IsOpen() || flock(opened.Number(), LOCK_EX) != 0) {
      ThrowErrno("Unable to lock ", directory);
    }
  }

 private:
  const Descriptor opened;
};

}  // namespace

void KeepNoMemoryAccount() { sqlite3_config(SQLITE_CONFIG_MEMSTATUS, 0); }

void MoveAside(const std::string& path) {
  const DirectoryLock lock(path.substr(0, path.rfind('/') + 1));
  const std::string aside = path + ".damaged";
  if (rename(path.c_str(), aside.c_str()) != 0) ThrowErrno("Unable to move ", path);
  unlink((path + "-wal").c_str());
  unlink((path + "-shm").c_str());
}

// The first waits are short, since most calls hold the database for one row only; a batch may hold
// it far longer. Gives up after half a minute.
int WaitForOthers(void* /*unused*/, int waits) {
  usleep(waits < kShortWaits ? kShortWaitMicroseconds : kLongWaitMicroseconds);
  return waits < kWaits ? 1 : 0;
}

Rows::~Rows() { sqlite3_reset(statement); }

bool Rows::Next() {
  const int result = sqlite3_step(statement);
  if (result == SQLITE_ROW) return true;
  if (result != SQLITE_DONE) store.Fail(result);
  return false;
}

std::int64_t Rows::Integer(int column) const { return sqlite3_column_int64(statement, column); }

std::string Rows::Text(int column) const {
  const unsigned char* text = sqlite3_column_text(statement, column);
  if (text == nullptr) return {};
  return {reinterpret_cast<const char*>(text),
          static_cast<std::size_t>(sqlite3_column_bytes(statement, column))};
}

Store::Store(const std::string& path, const StoreLayout& wanted, const std::string& shownAs,
             std::function<bool()> tellCommit)
    : layout(wanted),
      file(path),
      shown(shownAs),
      forks(ForksUntilNow()),
      onCommit(std::move(tellCommit)) {
  PreparePrivateFile(file, layout.purpose);
  const auto slash = file.rfind('/');
  directory = slash == 0 ? "/" : file.substr(0, slash);
  try {
    Open();
    if (!IsReady()) Create();
    FindCommitHeader();
  } catch (...) {
    Close();
    throw;
  }
}

Store::~Store() { Close(); }

bool Store::WasForked() const { return forks != ForksUntilNow(); }

void Store::Close() {
  if (database == nullptr) return;
  if (WasForked()) {
    Abandon(database);
    return;
  }
  // The log is found by name: that of a file which is no longer there belongs to another database.
  if (!IsCurrent()) sqlite3_db_config(database, SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 1, nullptr);
  for (const auto& [text, statement] : statements) sqlite3_finalize(statement);
  sqlite3_close_v2(database);
  database = nullptr;
}

bool Store::IsCurrent() const {
  struct stat status {};
  return !WasForked() && stat(file.c_str(), &status) == 0 && status.st_dev == device &&
         status.st_ino == inode;
}

int Store::BeforeCommit(void* store) {
  const auto& committing = *static_cast<const Store*>(store);
  if (!committing.isCommitTold || committing.onCommit()) return 0;
  return 1;
}

void Store::Open() {
  const int result =
      sqlite3_open_v2(file.c_str(), &database,
                      SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOFOLLOW | SQLITE_OPEN_NOMUTEX, nullptr);
  if (result != SQLITE_OK) Fail(result);
  struct stat status {};
  if (stat(file.c_str(), &status) != 0) Fail(SQLITE_CANTOPEN);
  device = status.st_dev;
  inode = status.st_ino;
  sqlite3_extended_result_codes(database, 1);
  sqlite3_busy_handler(database, WaitForOthers, nullptr);
  if (onCommit) sqlite3_commit_hook(database, BeforeCommit, this);
  if (sqlite3_db_readonly(database, "main") == 1) {
    throw HostError(EROFS, StrCat("Unable to use the ", layout.purpose, " ", shown,
                                  ": it cannot be written. Make it writable, or choose another "
                                  "place"));
  }
  RunScript(layout.survivesPowerLoss ? "PRAGMA synchronous = FULL" : "PRAGMA synchronous = OFF");
  // A load of a hundred thousand rules, in KiB: what does not fit is written twice.
  RunScript("PRAGMA cache_size = -32768");
}

bool Store::IsReady() {
  // Another process may be setting the file up.
  const Snapshot snapshot(*this);
  const auto applicationId = ReadInteger("PRAGMA application_id");
  // Known only now that the head of the file was read.
  if (sqlite3_db_readonly(database, "main") == 1) Refuse(EPROTO, "is of a format for reading only");
  const auto version = ReadInteger("PRAGMA user_version");
  const bool isEmpty =
      applicationId == 0 && version == 0 && ReadInteger("SELECT count(*) FROM sqlite_schema") == 0;
  if (isEmpty) return false;
  if (applicationId != layout.applicationId) Refuse(EPROTO, "is the database of something else");
  if (version == layout.version) {
    RequireStructure();
    return true;
  }
  if (IsOfVersionBefore(version)) return false;
  Refuse(EPROTO, StrCat("has schema ", version, ", this program works with schema ", layout.version,
                        ": it was made by another version of it"));
}

bool Store::IsOfVersionBefore(std::int64_t version) const {
  return *layout.addition != '\0' && version == layout.version - 1;
}

// The engine keeps the text of each statement that made something.
void Store::RequireStructure() {
  constexpr std::string_view kCreate = "CREATE ";
  const std::string schema = StrCat(layout.schema, layout.addition);
  std::int64_t wanted = 0;
  for (auto at = schema.find(kCreate); at != std::string::npos; at = schema.find(kCreate, at + 1)) {
    ++wanted;
  }
  Rows rows = Select("SELECT count(*) FROM sqlite_schema WHERE instr(?1, sql) > 0", schema);
  if (!rows.Next() || rows.Integer(0) != wanted) {
    TellDamage("its tables are not those of this program");
  }
}

void Store::RequireIntegrity() {
  Rows rows = Select("PRAGMA integrity_check(1)");
  const std::string found = rows.Next() ? rows.Text(0) : "";
  if (found != "ok") TellDamage(found.c_str());
}

void Store::Create() {
  const DirectoryLock lock(directory);
  if (IsReady()) return;
  SwitchToWriteAheadLog();
  const bool isNew = ReadInteger("PRAGMA user_version") == 0;
  Transaction transaction(*this);
  if (isNew) RunScript(StrCat(layout.schema, layout.firstRows));
  RunScript(StrCat(layout.addition, ";PRAGMA application_id = ", layout.applicationId,
                   ";PRAGMA user_version = ", layout.version));
  transaction.Commit();
}

void Store::SwitchToWriteAheadLog() {
  sqlite3_stmt* statement = nullptr;
  int result = sqlite3_prepare_v2(database, "PRAGMA journal_mode = WAL", -1, &statement, nullptr);
  // While others read the file the engine refuses at once instead of waiting.
  for (int waits = 0; result == SQLITE_OK || (result & 0xff) == SQLITE_BUSY; ++waits) {
    sqlite3_reset(statement);
    result = sqlite3_step(statement);
    if ((result & 0xff) == SQLITE_BUSY && WaitForOthers(nullptr, waits) == 0) break;
  }
  const bool switched =
      result == SQLITE_ROW &&
      std::strcmp(reinterpret_cast<const char*>(sqlite3_column_text(statement, 0)), "wal") == 0;
  sqlite3_finalize(statement);
  if (result != SQLITE_ROW) Fail(result);
  if (switched) return;
  throw HostError(ENOTSUP,
                  StrCat("Unable to use the ", layout.purpose, " ", shown,
                         ": it lies on a file system without shared memory. ", layout.remedy));
}

// The log's index is a file that every user of the database maps. It begins with two copies of a
// header that each commit rewrites, and by which the engine itself tells whether its cache is
// valid; the format is part of the engine's published file formats.
//
// PRAGMA data_version tells the same, but of the commits of others alone, and at a price: 1.6
// microseconds and two system calls beside 7 nanoseconds and none, measured by 200,000 calls of
// each in a row. Each check of a word asks.
void Store::FindCommitHeader() {
  sqlite3_file* main = nullptr;
  if (sqlite3_file_control(database, "main", SQLITE_FCNTL_FILE_POINTER, &main) != SQLITE_OK) return;
  if (main->pMethods == nullptr || main->pMethods->iVersion < 2) return;
  constexpr int kRegionSize = 32'768;
  volatile void* region = nullptr;
  if (main->pMethods->xShmMap(main, 0, kRegionSize, 0, &region) != SQLITE_OK) return;
  commitHeader = static_cast<const volatile std::uint32_t*>(region);
}

bool Store::ReadCommitMark(CommitMark* mark) const {
  if (commitHeader == nullptr) return false;
  CommitMark second;
  for (std::size_t word = 0; word < mark->size(); ++word) (*mark)[word] = commitHeader[word];
  std::atomic_thread_fence(std::memory_order_acquire);
  for (std::size_t word = 0; word < second.size(); ++word) {
    second[word] = commitHeader[mark->size() + word];
  }
  return *mark == second;
}

// The copy that is written last is enough: as long as it stands, no commit has ended.
bool Store::IsAt(const CommitMark& mark) const {
  if (commitHeader == nullptr) return false;
  return std::equal(mark.begin(), mark.end(), commitHeader);
}

sqlite3_stmt* Store::Prepared(Sql sql) {
  RequireUsable();
  auto& statement = statements[sql.Text()];
  if (statement != nullptr) return statement;
  const int result =
      sqlite3_prepare_v3(database, sql.Text(), -1, SQLITE_PREPARE_PERSISTENT, &statement, nullptr);
  if (result != SQLITE_OK) Fail(result);
  return statement;
}

// After some failures, a full disk for one, the engine undoes a transaction by itself. What
// followed would then be installed without what came before.
void Store::RequireUsable() const {
  if (WasForked()) {
    throw HostError(EBADF, StrCat("The ", layout.purpose,
                                  " was opened before this process was forked: open it again"));
  }
  if (openTransactions == 0 || sqlite3_get_autocommit(database) == 0) return;
  throw HostError(EIO,
                  StrCat("Unable to use the ", layout.purpose, " ", shown,
                         ": a failure has undone what was to be installed as a whole. Mend its "
                         "cause, and run it again"));
}

void Store::BindInteger(sqlite3_stmt* statement, int index, std::int64_t value) {
  const int result = sqlite3_bind_int64(statement, index, value);
  if (result != SQLITE_OK) Fail(result);
}

void Store::BindText(sqlite3_stmt* statement, int index, std::string_view value) {
  const int result = sqlite3_bind_text64(statement, index, value.empty() ? "" : value.data(),
                                         value.size(), SQLITE_STATIC, SQLITE_UTF8);
  if (result != SQLITE_OK) Fail(result);
}

int Store::Execute(sqlite3_stmt* statement) {
  const int before = sqlite3_total_changes(database);
  const int result = sqlite3_step(statement);
  if (result != SQLITE_DONE) {
    // Built while the engine still knows what went wrong.
    try {
      Fail(result);
    } catch (const HostError&) {
      sqlite3_reset(statement);
      throw;
    }
  }
  sqlite3_reset(statement);
  return sqlite3_total_changes(database) - before;
}

int Store::RunScript(const std::string& script) {
  RequireUsable();
  const int before = sqlite3_total_changes(database);
  const int result = sqlite3_exec(database, script.c_str(), nullptr, nullptr, nullptr);
  if (result != SQLITE_OK) Fail(result);
  return sqlite3_total_changes(database) - before;
}

std::int64_t Store::ReadInteger(const std::string& query) {
  RequireUsable();
  sqlite3_stmt* statement = nullptr;
  int result = sqlite3_prepare_v2(database, query.c_str(), -1, &statement, nullptr);
  if (result == SQLITE_OK) result = sqlite3_step(statement);
  const std::int64_t value = result == SQLITE_ROW ? sqlite3_column_int64(statement, 0) : 0;
  sqlite3_finalize(statement);
  if (result != SQLITE_ROW) Fail(result);
  return value;
}

void Store::Fail(int result) const {
  const char* reason = database != nullptr ? sqlite3_errmsg(database) : sqlite3_errstr(result);
  const int systemError = database != nullptr ? sqlite3_system_errno(database) : 0;
  if (systemError == EMFILE || systemError == ENFILE) {
    throw HostError(systemError, StrCat("Unable to use the ", layout.purpose, " ", shown, ": ",
                                        std::strerror(systemError)));
  }
  if (IsDamaged(result)) TellDamage(reason);
  throw HostError(ErrorNumber(result), StrCat("Unable to use the ", layout.purpose, " ", shown,
                                              ": ", reason, RemedyFor(result)));
}

void Store::TellDamage(const char* reason) const {
  Refuse(EIO, StrCat("is damaged or no such thing (", reason, ")"));
}

void Store::Refuse(int code, const std::string& reason) const {
  throw UnusableContent(code, StrCat("Unable to use the ", layout.purpose, " ", shown, ": it ",
                                     reason, ". ", layout.remedy));
}

Snapshot::Snapshot(Store& source) {
  if (sqlite3_get_autocommit(source.database) == 0) return;
  end = source.Prepared("COMMIT");
  source.Run("BEGIN");
}

Snapshot::~Snapshot() {
  if (end == nullptr) return;
  sqlite3_step(end);
  sqlite3_reset(end);
}

Transaction::Transaction(Store& target) : store(target), isStep(target.openTransactions != 0) {
  if (isStep) {
    store.Run("SAVEPOINT step");
  } else {
    store.Run("BEGIN IMMEDIATE");
  }
  ++store.openTransactions;
}

Transaction::~Transaction() {
  if (!isOpen) return;
  --store.openTransactions;
  if (sqlite3_get_autocommit(store.database) != 0) return;
  sqlite3_exec(store.database, isStep ? "ROLLBACK TO step; RELEASE step" : "ROLLBACK", nullptr,
               nullptr, nullptr);
}

void Transaction::Commit() {
  if (isStep) {
    store.Run("RELEASE step");
  } else {
    store.Run("COMMIT");
  }
  isOpen = false;
  --store.openTransactions;
}

}  // namespace LinuxHost
