#pragma once

#include <cstdint>
#include <string>

namespace Enforce {

// What is to be started.
struct Program {
  std::string path;     // or what it is called
  int descriptor = -1;  // of the program itself; without one it is what the path leads to
  char* const* arguments = nullptr;
  char* const* environment = nullptr;
};

// Who executes the program: this process, or another outside of its mounts.
enum class Executed { kHere, kOutside };

// Looks the program up by its first argument, in PATH when it has no slash, as a shell does.
// Refuses (refuse.h) one that is not there or cannot be executed.
Program FindProgram(char* const* arguments, char* const* environment,
                    Executed where = Executed::kHere);

// The program that a descriptor stands for; the first argument is only its name. It is closed when
// the program starts. Not so where it can be read and is a script: the interpreter opens it again,
// by the descriptor, and so is given what was meant here.
Program ProgramOf(int descriptor, char* const* arguments, char* const* environment);

// Becomes the program, with `secret` where a filter looks for it. Returns only when that fails,
// with errno set.
void Start(const Program& program, std::uint64_t secret);

}  // namespace Enforce
