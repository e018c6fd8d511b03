#pragma once

#include <optional>
#include <string>

namespace SecPolicyLog {

struct Options {
  bool isOnce = false;
  bool isJson = false;
};

// Reads the command line. Nothing where there is nothing to do: what was asked for was printed, or
// what is wrong, and `exitCode` says with what to end.
std::optional<Options> ReadOptions(int argc, char** argv, int* exitCode);

}  // namespace SecPolicyLog
