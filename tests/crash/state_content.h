#pragma once

#include <filesystem>
#include <string>

struct sqlite3;

namespace CrashTest {

// One connection to the database of a state, beside those of the host.
class StateFile {
 public:
  explicit StateFile(const std::filesystem::path& path);
  StateFile(const StateFile&) = delete;
  StateFile& operator=(const StateFile&) = delete;
  ~StateFile();

  // What is installed: one line for each record, in the order of installation, as of one moment.
  // Empty for a database that has not been set up. Numbers that only count are left out.
  std::string Content() const;

  // "ok", or what the engine finds wrong with the file.
  std::string Integrity() const;

  // Another number after each commit of somebody else.
  std::string Version() const;

  // Runs a statement.
  void Execute(const std::string& statement) const;

 private:
  std::string Query(const std::string& query) const;

  sqlite3* database = nullptr;
};

// The content of the state at `path`; empty when there is none.
std::string ContentOf(const std::filesystem::path& path);

}  // namespace CrashTest
