#include "recorded_load.h"

#include <sqlite3.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <iostream>
#include <memory>
#include <sstream>
#include <stdexcept>
#include <string_view>

#include "secpolicy/secpolicy.h"
#include "state_content.h"
#include "tools/secpolicy/root.h"

namespace CrashTest {
namespace {

constexpr char kStatePath[] = "/run/secpolicy/host.db";
constexpr char kRecordPath[] = "/record";

// Looks at the state, through a connection of its own, after each statement of the host.
class Recorder {
 public:
  Recorder() : record(kRecordPath, std::ios::binary) {}

  void Look() {
    if (looking) return;
    looking = true;
    if (state == nullptr) state = std::make_unique<StateFile>(kStatePath);
    const std::string current = state->Version();
    if (current != version) Write(state->Content());
    version = current;
    looking = false;
  }

 private:
  void Write(const std::string& content) {
    if (content == last) return;
    record << content << '\0' << std::flush;
    last = content;
  }

  std::ofstream record;
  std::unique_ptr<StateFile> state;
  std::string version;
  std::string last;
  bool looking = false;
};

int AfterStatement(unsigned int /*event*/, void* recorder, void* statement, void* /*time*/) {
  auto* const ended = static_cast<sqlite3_stmt*>(statement);
  // A pragma may leave the file locked.
  if (std::string_view(sqlite3_sql(ended)).starts_with("PRAGMA")) return 0;
  if (sqlite3_get_autocommit(sqlite3_db_handle(ended)) == 0) return 0;
  static_cast<Recorder*>(recorder)->Look();
  return 0;
}

// The engine calls it for each connection that is opened.
int Watch(sqlite3* database, char** /*message*/, const struct sqlite3_api_routines* /*routines*/) {
  static auto* const recorder = new Recorder;
  return sqlite3_trace_v2(database, SQLITE_TRACE_PROFILE, AfterStatement, recorder);
}

[[noreturn]] void LoadAndExit(const std::filesystem::path& root) {
  try {
    SecPolicyCli::EnterRoot(root);
    unsetenv("SECPOLICY_HOST_STATE");
    sqlite3_auto_extension(reinterpret_cast<void (*)()>(Watch));
    SecPolicy::LoadPolicy("/etc/zorvan/secpolicy");
  } catch (const std::exception& failure) {
    std::cerr << failure.what() << std::endl;
    _exit(1);
  }
  _exit(0);
}

}  // namespace

std::vector<std::string> RecordLoad(const HostRoot& root) {
  const pid_t child = fork();
  if (child == 0) LoadAndExit(root.Path());
  int status = -1;
  waitpid(child, &status, 0);
  if (status != 0) throw std::runtime_error("the recorded load failed");

  std::vector<std::string> contents(1);
  std::istringstream record(ReadFile(root.Path() / (kRecordPath + 1)));
  for (std::string content; std::getline(record, content, '\0');) contents.push_back(content);
  root.Forget();
  return contents;
}

}  // namespace CrashTest
