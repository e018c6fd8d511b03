#include "color.h"

#include <cstdlib>
#include <string>

namespace SecPolicyCli {
namespace {

// Where a stream keeps its target.
int Slot() {
  static const int slot = std::ios_base::xalloc();
  return slot;
}

std::string_view SequenceOf(Color color) {
  switch (color) {
    case Color::kBad:
      return "\x1b[1;31m";
    case Color::kDoubtful:
      return "\x1b[1;33m";
    case Color::kGood:
      return "\x1b[32m";
    case Color::kPlace:
      break;
  }
  return "\x1b[36m";
}

constexpr std::string_view kPlain = "\x1b[0m";

void Switch(std::streambuf& target, std::string_view sequence) {
  target.sputn(sequence.data(), static_cast<std::streamsize>(sequence.size()));
}

// Set to anything but nothing or "0".
bool IsSet(const char* name) {
  const char* const value = std::getenv(name);
  return value != nullptr && *value != '\0' && std::string_view(value) != "0";
}

bool IsDumb() {
  const char* const terminal = std::getenv("TERM");
  return terminal == nullptr || std::string_view(terminal) == "dumb";
}

}  // namespace

std::ostream& operator<<(std::ostream& stream, const Painted& painted) {
  auto* const target = static_cast<std::streambuf*>(stream.pword(Slot()));
  if (target == nullptr) return stream << painted.text;
  Switch(*target, SequenceOf(painted.color));
  stream << painted.text;
  Switch(*target, kPlain);
  return stream;
}

bool WantsColors(std::string_view choice, bool isTerminal) {
  if (choice != "auto") return choice == "always";
  const char* const refused = std::getenv("NO_COLOR");
  if (refused != nullptr && *refused != '\0') return false;
  return IsSet("CLICOLOR_FORCE") || (isTerminal && !IsDumb());
}

void AllowColors(std::ostream& stream, std::streambuf& target) { stream.pword(Slot()) = &target; }

}  // namespace SecPolicyCli
