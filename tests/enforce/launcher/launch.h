#pragma once

#include <functional>
#include <string>
#include <vector>

#include "host/enforce/plan/plan.h"

// Runs the launcher with plans made by hand, on trees of its own.
namespace EnforceTest {

enum class User { kRoot, kNobody };

// True when this process can start others as the user. Nobody may also be who runs the tests.
bool CanBe(User user);

// What this kernel lacks for any of these tests, for people; nullptr when it has all.
const char* Lacks();

// Makes this process the user's; false when that fails.
bool Become(User user);

// For the names of tests.
std::string NameOf(User user);

// Acts in a child process with mounts of its own, which only root can make. A failure there is one
// here.
void InOwnMounts(const std::function<void()>& act);

// Acts in a child process that these system calls answer with EPERM. A failure there is one here.
void WithoutCalls(const std::vector<int>& calls, const std::function<void()>& act);

// A tree below which a test plays, the same at each making, all of it the user's:
//   open/file, open/directory, kept/file, kept/directory, kept/program (a probe)
class Tree {
 public:
  explicit Tree(User owner);
  Tree(const Tree&) = delete;
  Tree& operator=(const Tree&) = delete;
  ~Tree();

  const std::string& Path() const { return path; }
  std::string operator/(const std::string& name) const { return path + "/" + name; }

  // Each "@" of the text is where the tree is.
  std::string Resolve(std::string text) const;

 private:
  std::string path;
};

struct Launch {
  User user = User::kRoot;
  std::vector<std::string> options;  // of the launcher
  std::vector<std::string> command;
  std::vector<std::string> environment = {};  // besides PATH
  std::vector<int> descriptors = {};          // that are left open, by their numbers here
};

struct Outcome {
  int status = -1;  // as waitpid gives it
  std::string output;
  std::string errors;
};

// The programs, where every user can execute them.
std::string ToolsDirectory();
std::string ProbePath();

// Starts the launcher as it says and waits for its end.
Outcome RunLauncher(const Launch& launch);

// Writes the plan to a file in the tree that every user may read and only root may write.
std::string WritePlan(const Tree& tree, const Enforce::Plan& plan);

// What the probe prints that is started with the plan: one line for each operation.
Outcome Probe(User user, const Tree& tree, const Enforce::Plan& plan,
              const std::vector<std::string>& operations);

// What becomes of one operation of that probe: "ok" or the name of an error. Throws when the probe
// does not run.
std::string AnswerOf(User user, const Tree& tree, const Enforce::Plan& plan,
                     const std::string& operation);

// All rights to files that the kernel knows.
std::uint64_t AllRights();

// Enforces all rights to files that the kernel knows, of which it gives those that the probe needs
// to start; all capabilities are kept, and nothing else is refused.
Enforce::Plan PlanOfNothing();

// The same with all rights to the tree.
Enforce::Plan PlanOf(const Tree& tree);

// Answers these system calls with EPERM, kills whoever calls by another table, and allows the rest.
std::vector<sock_filter> FilterWithout(const std::vector<int>& calls);

// Allows all but execve and execveat, which need the launcher's secret, or this one.
constexpr std::uint32_t kKnownSecret = 0x5eed;
void AddSecretFilter(Enforce::Plan* plan);

}  // namespace EnforceTest
