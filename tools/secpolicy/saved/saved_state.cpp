#include "saved_state.h"

#include <algorithm>

namespace SecPolicyCli {
namespace {

constexpr std::size_t kMaxNameSize = 64;

// Letters of other alphabets would depend on the locale.
bool IsAllowed(char letter) {
  return (letter >= 'A' && letter <= 'Z') || (letter >= 'a' && letter <= 'z') ||
         (letter >= '0' && letter <= '9') || letter == '.' || letter == '_' || letter == '-';
}

}  // namespace

std::string WhyNoSavedName(const std::string& name) {
  if (name == "installed") return "'installed' means what is installed now";
  const bool fits = !name.empty() && name.size() <= kMaxNameSize;
  if (fits && name.front() != '.' && name.front() != '-' && std::ranges::all_of(name, IsAllowed)) {
    return "";
  }
  return "'" + name +
         "' cannot be a name: it takes 1 to 64 of A-Z a-z 0-9 . _ -, and begins with "
         "neither . nor -";
}

std::string SavedStatePath(const std::string& name) {
  return std::string(kSavedStatesDir) + "/" + name + ".db";
}

}  // namespace SecPolicyCli
