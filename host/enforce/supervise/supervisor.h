#pragma once

#include <sys/types.h>
#include <unistd.h>

#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include "policy/decision.h"

// Watches what a program and all that it starts does, and refuses none of it.
namespace Enforce {

// One system call that is about to be made.
struct Attempt {
  std::string_view call;  // lives as long as this program
  pid_t thread = 0;       // that makes it
  std::string program;    // that it runs; empty when it cannot be told
  bool isStart = false;   // of the program that is supervised, by which it is only entered
  std::vector<Policy::Question> asked;  // beside its number, see asked.h
};

struct Supervision {
  int procDirectory = -1;  // of the /proc of this process's own PID namespace
  int program = -1;        // what to execute, closed on execution; else the command says what it is
  char* const* environment = environ;  // of the program
  bool isKilledAlong = false;          // the program, when this process is

  // Which calls are told. `write` never is, and so has to be said no to.
  std::function<bool(std::string_view call)> isNoticed;

  // Told of each of them, before it is made. May not throw.
  std::function<void(const Attempt&)> notice;
};

struct SupervisedEnd {
  int startError = 0;  // why the program could not be started, as errno has it; 0 when it was
  int exitStatus = 0;  // of the program, as a shell has it: 128 and the signal that ended it
};

// Runs `command`, whose first word is a path or looked for in PATH, and returns when it and all
// that it has started are gone. Signals that ask this process to end are handed on. Calls that are
// not known, and clone3, answer as in a domain: there are none.
//
// The calls that are noticed depend on this process: when it is killed they end with ENOSYS.
//
// For all that it starts, this process is the parent when theirs has gone, also afterwards. Who may
// not install filters otherwise loses the right to gain rights by executing a program. Throws
// Braxo::Lib::BraxoException when nothing could be supervised: then nothing was started.
SupervisedEnd Supervise(const std::vector<std::string>& command, const Supervision& supervision);

}  // namespace Enforce
