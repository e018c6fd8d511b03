#pragma once

#include <ostream>
#include <streambuf>
#include <string_view>

namespace SecPolicyCli {

enum class Color { kBad, kDoubtful, kGood, kPlace };

// Text in a color, where `stream` shows colors; elsewhere the text alone.
struct Painted {
  Color color;
  std::string_view text;
};

std::ostream& operator<<(std::ostream& stream, const Painted& painted);

// Whether colors are wanted by `choice`, which is "auto", "always" or "never": "auto" wants them on
// a terminal, unless NO_COLOR is set, and elsewhere where CLICOLOR_FORCE is.
bool WantsColors(std::string_view choice, bool isTerminal);

// Lets `stream` show colors. What switches them goes to `target` past the guard, to which it is
// like anything else that commands a terminal.
void AllowColors(std::ostream& stream, std::streambuf& target);

}  // namespace SecPolicyCli
