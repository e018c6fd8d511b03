#pragma once

#include <cstddef>
#include <optional>
#include <string>

namespace SecPolicyCli {

struct TerminalSize {
  std::size_t columns = 80;
  std::size_t rows = 24;
};

// The size of the terminal that `descriptor` is, the usual one where it does not tell; nothing
// where it is none.
std::optional<TerminalSize> SizeOfTerminal(int descriptor);

bool IsSameTerminal(int one, int other);

// The text as it fits the terminal that standard output is, wrapped as text/wrap.h does; as it is
// where standard output is none.
std::string FitTerminal(const std::string& text);

}  // namespace SecPolicyCli
