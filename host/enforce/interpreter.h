#pragma once

#include <optional>
#include <string>

namespace Enforce {

// What the kernel opens beside a program to execute it, and executes in its place.
struct Interpreter {
  std::string path;
  bool isLoader = false;  // of a program that is linked dynamically, and needs no other
};

// Scripts may be interpreted by scripts, as often as the kernel goes along with.
inline constexpr int kMostInterpreters = 5;

// That of a script or a program that is open for reading; nothing where it needs none.
std::optional<Interpreter> InterpreterOf(int program);

// True for a script that is open for reading.
bool IsScript(int program);

}  // namespace Enforce
