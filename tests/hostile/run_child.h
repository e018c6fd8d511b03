#pragma once

#include <string>
#include <vector>

namespace HostileTest {

// What a process of its own did.
struct ChildOutcome {
  int status;          // as waitpid gives it
  std::string output;  // its standard output
};

// Runs the program `hostile_child` (see child.cpp) with `arguments`.
ChildOutcome RunChild(const std::vector<std::string>& arguments);

}  // namespace HostileTest
