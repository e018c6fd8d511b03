#pragma once

#include <string>
#include <vector>

#include "command_form.h"

namespace SecPolicyCli {

enum class UsageFault { kMissing, kUnknown, kValues, kOther };

// Why a command line cannot be understood.
struct UsageError {
  UsageFault fault;
  std::vector<CommandForm> levels;   // the command, its verb and the kind of that, as far as given
  std::vector<std::string> unknown;  // words
  std::string message;               // the parser's
};

// The names of the levels: "secpolicy label get".
std::string CommandOf(const std::vector<std::string>& names);

// What is wrong, and where to read on.
std::string ExplainUsage(const UsageError& error);

}  // namespace SecPolicyCli
