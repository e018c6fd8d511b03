#pragma once

#include <sys/types.h>

#include <filesystem>
#include <string>
#include <vector>

namespace CrashTest {

// What came of a command.
struct Outcome {
  int exitStatus;  // -1 when a signal ended it
  std::string output;
  std::string errors;
};

// The command `secpolicy`, running in a process of its own below a root. Its state lies where it
// lies by default.
class Command {
 public:
  Command(const std::filesystem::path& root, const std::vector<std::string>& arguments);
  Command(const Command&) = delete;
  Command& operator=(const Command&) = delete;
  ~Command();

  // Ends it with SIGKILL, if it still runs.
  void Kill() const;

  // Waits for its end; once.
  Outcome Wait();

 private:
  pid_t id = -1;
  int output = -1;
  int errors = -1;
};

// Runs the command to its end.
Outcome RunCommand(const std::filesystem::path& root, const std::vector<std::string>& arguments);

// True when SECPOLICY_LONG_TESTS asks for the long forms of the tests.
bool LongTests();

}  // namespace CrashTest
