#pragma once

#include <sys/types.h>

#include <array>
#include <concepts>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <string_view>
#include <unordered_map>

struct sqlite3;
struct sqlite3_stmt;

// The one place that knows the database engine. Every failure is a HostError.
namespace LinuxHost {

// Sleeps, as a writer does that waits for others and has waited `waits` times already. Returns 0
// when it is time to give up, after about half a minute. The engine calls it, too.
int WaitForOthers(void* unused, int waits);

// Spares the account that the engine keeps of its memory, a tenth of an installation. For a program
// that owns its process, before it uses any database: the engine is the whole process's.
void KeepNoMemoryAccount();

// Moves the database at `path`, which nobody can use any more, out of the way to `path`.damaged,
// which it replaces, and removes what lies beside it: that must not get into the next one.
void MoveAside(const std::string& path);

// What a database file must be to be used, and what it is made of when it is created.
struct StoreLayout {
  const char* purpose;         // what it is, in messages: "host state"
  const char* remedy;          // what to do with one that cannot be used, a whole sentence
  std::int32_t applicationId;  // marks the file as ours; not 0
  std::int32_t version;        // of the schema; a file of any other one is refused; not 0
  const char* schema;          // SQL statements that fill an empty database
  const char* addition = "";   // and those that a file of the version before is made one of this by
  const char* firstRows = "";  // and those for the rows that it begins with
  bool survivesPowerLoss;      // false: survives any death of its users, not of the machine
};

// The text of a statement. A literal, so that its address can stand for it.
class Sql {
 public:
  template <std::size_t size>
  consteval Sql(const char (&literal)[size]) : text(literal) {}

  const char* Text() const { return text; }

 private:
  const char* text;
};

class Store;

// The result rows of one SELECT; frees the statement for its next use when destroyed. At most one
// for each statement at a time.
class Rows {
 public:
  Rows(Store& source, sqlite3_stmt* running) : store(source), statement(running) {}
  Rows(const Rows&) = delete;
  Rows& operator=(const Rows&) = delete;
  ~Rows();

  // Steps to the next row; false after the last one.
  bool Next();

  // Columns of the current row, from 0. NULL reads as 0 and as the empty string.
  std::int64_t Integer(int column) const;
  std::string Text(int column) const;

 private:
  Store& store;
  sqlite3_stmt* statement;
};

// One open database. Not shared between threads; in a forked child every use fails.
class Store {
 public:
  // Identifies what has been committed so far, by anyone.
  using CommitMark = std::array<std::uint32_t, 12>;

  // Opens the database at the absolute `path`, which messages call `shownAs`; creates it (mode
  // 0600) and its directory (0700) as needed. Refuses what is not `layout`, what another user owns
  // or may write, and links. `tellCommit`, if any, is called before whatever this connection
  // commits; it may neither throw nor use the database, and nothing is committed when it returns
  // false.
  Store(const std::string& path, const StoreLayout& layout, const std::string& shownAs,
        std::function<bool()> tellCommit = {});
  Store(const std::string& path, const StoreLayout& wanted) : Store(path, wanted, path) {}
  Store(const Store&) = delete;
  Store& operator=(const Store&) = delete;
  ~Store();

  const std::string& Path() const { return file; }

  // Refuses the database, as one that is damaged is refused. For what only its user can see.
  [[noreturn]] void TellDamage(const char* reason) const;

  // Looks at every page, and refuses the database when it is damaged.
  void RequireIntegrity();

  // True while a transaction of this connection is open.
  bool IsInTransaction() const { return openTransactions != 0; }

  // True in a child of the process that opened it.
  bool WasForked() const;

  // True when the process was not forked since, and the path still names the open file.
  bool IsCurrent() const;

  // Runs a statement that returns no rows, as a transaction of its own unless one is open.
  // Arguments are integers and texts for ?1, ?2, ...; returns the number of rows changed.
  template <class... Args>
  int Run(Sql sql, const Args&... args) {
    sqlite3_stmt* statement = Prepared(sql);
    BindAll(statement, args...);
    return Execute(statement);
  }

  // Runs a SELECT. Text arguments must live until the rows are destroyed.
  template <class... Args>
  [[nodiscard]] Rows Select(Sql sql, const Args&... args) {
    sqlite3_stmt* statement = Prepared(sql);
    BindAll(statement, args...);
    return Rows(*this, statement);
  }

  // Runs statements that are needed once only, and returns the number of rows changed.
  int RunScript(const std::string& script);

  // The first column of the first row, for a query that is needed once only.
  std::int64_t ReadInteger(const std::string& query);

  // Writes the current mark to `*mark` and returns true; false while it cannot be told. Makes no
  // system call. Two equal marks mean that nothing was committed between them.
  bool ReadCommitMark(CommitMark* mark) const;

  // True when nothing was committed since `mark` was read. Makes no system call either.
  bool IsAt(const CommitMark& mark) const;

 private:
  friend class Rows;
  friend class Snapshot;
  friend class Transaction;
  friend class UntoldCommits;

  template <class... Args>
  void BindAll([[maybe_unused]] sqlite3_stmt* statement, const Args&... args) {
    [[maybe_unused]] int index = 0;
    (BindOne(statement, ++index, args), ...);
  }
  template <std::integral Integer>
  void BindOne(sqlite3_stmt* statement, int index, Integer value) {
    BindInteger(statement, index, static_cast<std::int64_t>(value));
  }
  void BindOne(sqlite3_stmt* statement, int index, std::string_view value) {
    BindText(statement, index, value);
  }
  void BindInteger(sqlite3_stmt* statement, int index, std::int64_t value);
  void BindText(sqlite3_stmt* statement, int index, std::string_view value);

  sqlite3_stmt* Prepared(Sql sql);
  int Execute(sqlite3_stmt* statement);
  void RequireUsable() const;
  [[noreturn]] void Fail(int result) const;
  [[noreturn]] void Refuse(int code, const std::string& reason) const;

  static int BeforeCommit(void* store);

  void Open();
  bool IsReady();
  bool IsOfVersionBefore(std::int64_t version) const;
  void RequireStructure();
  void Create();
  void SwitchToWriteAheadLog();
  void FindCommitHeader();
  void Close();

  const StoreLayout& layout;
  std::string file;
  std::string shown;  // what messages call it
  std::string directory;
  unsigned int forks;  // when it was opened
  dev_t device = 0;
  ino_t inode = 0;
  sqlite3* database = nullptr;
  int openTransactions = 0;  // each within the one before it
  std::function<bool()> onCommit;
  bool isCommitTold = true;
  const volatile std::uint32_t* commitHeader = nullptr;
  std::unordered_map<const char*, sqlite3_stmt*> statements;
};

// While it lives, all that is read was there at one moment. Keeps others from nothing. Within
// another one, or a transaction, it is a part of that. What remembers a commit mark must not read
// within it: the mark may be newer.
class Snapshot {
 public:
  explicit Snapshot(Store& source);
  Snapshot(const Snapshot&) = delete;
  Snapshot& operator=(const Snapshot&) = delete;
  ~Snapshot();

 private:
  sqlite3_stmt* end = nullptr;  // prepared before it begins, so that it can always end
};

// A write transaction: waits for the other writers, and is undone unless committed. Within another
// one it is a step of that: undone alone, but committed only together with it.
class Transaction {
 public:
  explicit Transaction(Store& target);
  Transaction(const Transaction&) = delete;
  Transaction& operator=(const Transaction&) = delete;
  ~Transaction();

  void Commit();

 private:
  Store& store;
  const bool isStep;
  bool isOpen = true;
};

// While it lives, commits of the store are not told.
class UntoldCommits {
 public:
  explicit UntoldCommits(Store& quiet) : store(quiet), before(quiet.isCommitTold) {
    store.isCommitTold = false;
  }
  UntoldCommits(const UntoldCommits&) = delete;
  UntoldCommits& operator=(const UntoldCommits&) = delete;
  ~UntoldCommits() { store.isCommitTold = before; }

 private:
  Store& store;
  const bool before;
};

}  // namespace LinuxHost
