#include "state_content.h"

#include <sqlite3.h>

#include <array>
#include <stdexcept>

namespace CrashTest {
namespace {

constexpr std::array kQueries = {
    "SELECT 'attribute', label_attribute FROM state",
    "SELECT 'domain', id, name, level, default_rules, created_at_run_time FROM domain ORDER BY id",
    "SELECT 'role', name, domain_id FROM role ORDER BY name",
    "SELECT 'service', domain_id, service FROM guest_service ORDER BY domain_id, service",
    "SELECT 'label', id, name FROM label ORDER BY id",
    "SELECT 'rule', domain_id, kind, word1, word2, word3, granted, line FROM rule ORDER BY id",
    "SELECT 'parameter', domain_id, parameter_check, first_value, last_value, first_word, "
    "last_word, granted, line FROM parameter_rule ORDER BY id",
    // The library does not tell the line of a path: the command records it afterwards.
    "SELECT 'file', domain_id, world, path, permission FROM file_policy ORDER BY id",
    "SELECT 'origin', tardisk, path FROM inode_origin ORDER BY path",
};

int AppendRow(void* text, int columns, char** values, char** /*names*/) {
  auto& lines = *static_cast<std::string*>(text);
  for (int column = 0; column < columns; ++column) {
    if (column > 0) lines += ' ';
    if (values[column] != nullptr) lines += values[column];
  }
  lines += '\n';
  return 0;
}

}  // namespace

StateFile::StateFile(const std::filesystem::path& path) {
  constexpr int kPatience = 10'000;
  if (sqlite3_open_v2(path.c_str(), &database, SQLITE_OPEN_READWRITE, nullptr) != SQLITE_OK) {
    sqlite3_close(database);
    throw std::runtime_error("unable to open " + path.string());
  }
  sqlite3_busy_timeout(database, kPatience);
}

StateFile::~StateFile() { sqlite3_close(database); }

std::string StateFile::Query(const std::string& query) const {
  std::string text;
  char* message = nullptr;
  if (sqlite3_exec(database, query.c_str(), AppendRow, &text, &message) != SQLITE_OK) {
    const std::string problem = message == nullptr ? "unknown" : message;
    sqlite3_free(message);
    throw std::runtime_error(query + ": " + problem);
  }
  return text;
}

std::string StateFile::Content() const {
  if (Query("SELECT count(*) FROM sqlite_schema") == "0\n") return {};
  std::string content;
  Execute("BEGIN");
  for (const char* query : kQueries) content += Query(query);
  Execute("COMMIT");
  return content;
}

std::string StateFile::Integrity() const {
  const std::string answer = Query("PRAGMA integrity_check");
  return answer.substr(0, answer.size() - 1);
}

std::string StateFile::Version() const { return Query("PRAGMA data_version"); }

void StateFile::Execute(const std::string& statement) const { Query(statement); }

std::string ContentOf(const std::filesystem::path& path) {
  return std::filesystem::exists(path) ? StateFile(path).Content() : std::string();
}

}  // namespace CrashTest
