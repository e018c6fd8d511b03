#pragma once

#include <sys/types.h>

#include <array>
#include <concepts>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <unordered_map>

struct sqlite3;
struct sqlite3_stmt;

// The one place that knows the database engine. Every failure is a HostError.
namespace LinuxHost {

// What a database file must be to be used, and what it is made of when it is created.
struct StoreLayout {
  const char* purpose;         // what it is, in messages: "host state"
  const char* remedy;          // what to do with one that cannot be used, a whole sentence
  std::int32_t applicationId;  // marks the file as ours
  std::int32_t version;        // of the schema; a newer one is refused
  const char* schema;          // SQL statements that fill an empty database
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

// The result rows of one SELECT; frees the statement for its next use when destroyed. At most one
// for each statement at a time.
class Rows {
 public:
  explicit Rows(sqlite3_stmt* running) : statement(running) {}
  Rows(const Rows&) = delete;
  Rows& operator=(const Rows&) = delete;
  ~Rows();

  // Steps to the next row; false after the last one.
  bool Next();

  // Columns of the current row, from 0. NULL reads as 0 and as the empty string.
  std::int64_t Integer(int column) const;
  std::string Text(int column) const;

 private:
  sqlite3_stmt* statement;
};

// One open database. Not shared between threads; useless, and harmless, in a forked child.
class Store {
 public:
  // Identifies what has been committed so far, by anyone.
  using CommitMark = std::array<std::uint32_t, 12>;

  // Opens the database at the absolute `path`; creates it (mode 0600) and its directory (0700) as
  // needed. Refuses what is not `layout`, what another user owns or may write, and links.
  Store(const std::string& path, const StoreLayout& layout);
  Store(const Store&) = delete;
  Store& operator=(const Store&) = delete;
  ~Store();

  const std::string& Path() const { return file; }

  // True when the process was not forked since, and the path still names the open file.
  bool IsCurrent() const;

  // Runs a statement that returns no rows, as a transaction of its own unless one is open.
  // Arguments are integers and texts for ?1, ?2, ...; returns the number of rows changed.
  template <class... Args>
  int Run(Sql sql, const Args&... args) {
    sqlite3_stmt* statement = Prepared(sql);
    [[maybe_unused]] int index = 0;
    (BindArgument(statement, ++index, args), ...);
    return Execute(statement);
  }

  // Runs a SELECT. Text arguments must live until the rows are destroyed.
  template <class... Args>
  [[nodiscard]] Rows Select(Sql sql, const Args&... args) {
    sqlite3_stmt* statement = Prepared(sql);
    [[maybe_unused]] int index = 0;
    (BindArgument(statement, ++index, args), ...);
    return Rows(statement);
  }

  // The row identifier of the last row inserted through this object.
  std::int64_t LastInsertId() const;

  // Writes the current mark to `*mark` and returns true; false while another process is just
  // committing. Costs no system call: two equal marks mean that nothing was committed between.
  bool ReadCommitMark(CommitMark* mark) const;

 private:
  friend class Transaction;

  void BindArgument(sqlite3_stmt* statement, int index, std::string_view value);
  template <std::integral Integer>
  void BindArgument(sqlite3_stmt* statement, int index, Integer value) {
    BindInteger(statement, index, static_cast<std::int64_t>(value));
  }
  void BindInteger(sqlite3_stmt* statement, int index, std::int64_t value);

  sqlite3_stmt* Prepared(Sql sql);
  int Execute(sqlite3_stmt* statement);
  void RunScript(const char* script);
  std::int32_t ReadPragma(const char* pragma);
  void Open(const StoreLayout& layout);
  bool IsReady(const StoreLayout& layout);
  void Create(const StoreLayout& layout);

  std::string file;
  std::string remedy;
  pid_t owner;
  dev_t device = 0;
  ino_t inode = 0;
  sqlite3* database = nullptr;
  const volatile std::uint32_t* commitHeader = nullptr;
  std::unordered_map<const char*, sqlite3_stmt*> statements;
};

// A write transaction: waits for the other writers, and is undone unless committed.
class Transaction {
 public:
  explicit Transaction(Store& target);
  Transaction(const Transaction&) = delete;
  Transaction& operator=(const Transaction&) = delete;
  ~Transaction();

  void Commit();

 private:
  Store& store;
  bool open = true;
};

}  // namespace LinuxHost
