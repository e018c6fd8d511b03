#include "saved_state.h"

#include <sys/stat.h>

#include <algorithm>
#include <filesystem>
#include <tuple>

#include "host/linux/saved_policy.h"

namespace SecPolicyCli {
namespace {

constexpr char kEnding[] = ".db";
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
  return std::string(kSavedStatesDir) + "/" + name + kEnding;
}

std::string TrustedStatePath(const std::string& name) {
  std::string path = SavedStatePath(name);
  LinuxHost::RequireTrustedState(path);
  return path;
}

bool IsSaved(const std::string& name) {
  struct stat status {};
  return stat(SavedStatePath(name).c_str(), &status) == 0;
}

std::vector<SavedState> ListSavedStates() {
  std::vector<SavedState> states;
  if (!std::filesystem::exists(kSavedStatesDir)) return states;
  for (const auto& entry : std::filesystem::directory_iterator(kSavedStatesDir)) {
    struct stat status {};
    const std::string name = entry.path().stem();
    if (entry.path().extension() != kEnding || !WhyNoSavedName(name).empty()) continue;
    if (stat(entry.path().c_str(), &status) != 0 || !S_ISREG(status.st_mode)) continue;
    states.push_back({.name = name, .time = status.st_mtim.tv_sec});
  }
  std::ranges::sort(states, {},
                    [](const SavedState& state) { return std::tie(state.time, state.name); });
  return states;
}

}  // namespace SecPolicyCli
