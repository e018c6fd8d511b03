#pragma once

#include <optional>
#include <string>
#include <vector>

namespace SecPolicyRun {

struct Options {
  bool asks = false;  // a broker, which needs no plan
  std::string plan;
  std::optional<int> program;  // its descriptor
  std::vector<int> keptDescriptors;
  std::optional<int> module;  // that keeps the domain, by its descriptor
  char** command = nullptr;   // with at least one word
};

// Reads the command line. Prints what --help and --version ask for and ends the process; refuses
// (refuse.h) what it does not understand.
Options ReadOptions(char** arguments);

}  // namespace SecPolicyRun
