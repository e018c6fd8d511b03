#include "host/linux/operation/store_seal.h"

#include <sha2.h>
#include <sqlite3.h>

#include <array>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <string_view>
#include <vector>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"

namespace LinuxHost {
namespace {

using Braxo::Misc::StrCat;

constexpr char kDamaged[] = "it is damaged";

// A database that nobody else knows.
class PrivateDatabase {
 public:
  explicit PrivateDatabase(const std::string& file) : path(file) {
    if (sqlite3_open_v2(path.c_str(), &database, SQLITE_OPEN_READWRITE, nullptr) != SQLITE_OK) {
      Fail();
    }
    // What is sealed is flushed as a whole by who gives it a name.
    Run("PRAGMA synchronous = OFF");
  }
  PrivateDatabase(const PrivateDatabase&) = delete;
  PrivateDatabase& operator=(const PrivateDatabase&) = delete;
  ~PrivateDatabase() { sqlite3_close_v2(database); }

  void Run(const char* sql) {
    if (sqlite3_exec(database, sql, nullptr, nullptr, nullptr) != SQLITE_OK) Fail();
  }

  // Hands every row of the query to `take`.
  template <class Take>
  void ForEachRow(const std::string& sql, const Take& take) {
    sqlite3_stmt* statement = nullptr;
    int result = sqlite3_prepare_v2(database, sql.c_str(), -1, &statement, nullptr);
    if (result != SQLITE_OK) Fail();
    while ((result = sqlite3_step(statement)) == SQLITE_ROW) take(statement);
    sqlite3_finalize(statement);
    if (result != SQLITE_DONE) Fail();
  }

  std::string FirstText(const char* sql) {
    std::string text;
    ForEachRow(sql, [&](sqlite3_stmt* row) {
      const unsigned char* const found = sqlite3_column_text(row, 0);
      if (text.empty() && found != nullptr) text = reinterpret_cast<const char*>(found);
    });
    return text;
  }

 private:
  [[noreturn]] void Fail() {
    const int kind = sqlite3_errcode(database);
    const bool isDamaged = kind == SQLITE_CORRUPT || kind == SQLITE_NOTADB || kind == SQLITE_ERROR;
    const int systemError = sqlite3_system_errno(database);
    const std::string reason =
        systemError != 0 ? std::strerror(systemError) : sqlite3_errmsg(database);
    throw HostError(isDamaged ? EIO : EBUSY, StrCat("Unable to use ", path, ": ", reason));
  }

  const std::string path;
  sqlite3* database = nullptr;
};

// Every part goes in with its length, so that no two contents give the same bytes.
class Digest {
 public:
  Digest() { SHA256Init(&context); }

  void Add(std::string_view bytes) {
    AddNumber(bytes.size());
    AddBytes(bytes.data(), bytes.size());
  }

  void AddNumber(std::uint64_t number) { AddBytes(&number, sizeof number); }

  std::string Text() {
    std::array<char, SHA256_DIGEST_STRING_LENGTH> text{};
    SHA256End(&context, text.data());
    return text.data();
  }

 private:
  void AddBytes(const void* bytes, std::size_t size) {
    SHA256Update(&context, static_cast<const std::uint8_t*>(bytes), size);
  }

  SHA2_CTX context{};
};

void AddValue(Digest& digest, sqlite3_stmt* row, int column) {
  const int type = sqlite3_column_type(row, column);
  digest.AddNumber(static_cast<std::uint64_t>(type));
  if (type == SQLITE_INTEGER) {
    return digest.AddNumber(static_cast<std::uint64_t>(sqlite3_column_int64(row, column)));
  }
  const void* const bytes = sqlite3_column_blob(row, column);
  const auto size = static_cast<std::size_t>(sqlite3_column_bytes(row, column));
  digest.Add({static_cast<const char*>(bytes), size});
}

void AddRows(Digest& digest, PrivateDatabase& database, const std::string& sql) {
  database.ForEachRow(sql, [&](sqlite3_stmt* row) {
    const int columns = sqlite3_column_count(row);
    for (int column = 0; column < columns; ++column) AddValue(digest, row, column);
  });
}

// Over what is stored, not over how it lies in the file.
std::string DigestOf(PrivateDatabase& database) {
  Digest digest;
  std::vector<std::string> tables;
  AddRows(digest, database, "PRAGMA application_id");
  AddRows(digest, database, "PRAGMA user_version");
  AddRows(digest, database,
          "SELECT type, name, tbl_name, sql FROM sqlite_schema WHERE tbl_name <> 'seal' "
          "ORDER BY type, name");
  database.ForEachRow(
      "SELECT name FROM sqlite_schema WHERE type = 'table' AND name <> 'seal' ORDER BY name",
      [&](sqlite3_stmt* row) {
        tables.emplace_back(reinterpret_cast<const char*>(sqlite3_column_text(row, 0)));
      });
  for (const std::string& table : tables) {
    digest.Add(table);
    // In the order of the table itself, whatever indexes it has.
    AddRows(digest, database, "SELECT * FROM \"" + table + "\" NOT INDEXED");
  }
  return digest.Text();
}

constexpr char kCheckAll[] = "PRAGMA integrity_check(1)";
constexpr char kCheckPages[] = "PRAGMA quick_check(1)";

std::string FindDamageIn(PrivateDatabase& database, const char* check) {
  return database.FirstText(check) == "ok" ? "" : kDamaged;
}

std::string FindDamageBy(const char* check, const std::string& path) {
  try {
    PrivateDatabase database(path);
    return FindDamageIn(database, check);
  } catch (const HostError& failure) {
    if (failure.Code() != EIO) throw;
    return kDamaged;
  }
}

}  // namespace

std::string FindDamage(const std::string& path) { return FindDamageBy(kCheckAll, path); }

std::string FindDamagedPages(const std::string& path) { return FindDamageBy(kCheckPages, path); }

void Seal(const std::string& path) {
  PrivateDatabase database(path);
  const std::string digest = DigestOf(database);
  database.Run("CREATE TABLE seal (digest TEXT NOT NULL)");
  database.Run(("INSERT INTO seal VALUES ('" + digest + "')").c_str());
}

std::string FindBrokenSeal(const std::string& path) {
  try {
    PrivateDatabase database(path);
    std::string damage = FindDamageIn(database, kCheckAll);
    if (!damage.empty()) return damage;
    return database.FirstText("SELECT digest FROM seal") == DigestOf(database) ? "" : kDamaged;
  } catch (const HostError& failure) {
    if (failure.Code() != EIO) throw;
    return kDamaged;
  }
}

void RemoveSeal(const std::string& path) { PrivateDatabase(path).Run("DROP TABLE seal"); }

std::int32_t StoredVersion(const std::string& path) {
  return std::stoi(PrivateDatabase(path).FirstText("PRAGMA user_version"));
}

}  // namespace LinuxHost
