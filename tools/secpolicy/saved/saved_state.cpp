#include "saved_state.h"

#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <optional>
#include <system_error>
#include <tuple>

#include "command_line.h"
#include "ending.h"
#include "host/linux/common/host_error.h"
#include "root.h"
#include "text/suggestion.h"

namespace SecPolicyCli {
namespace {

constexpr char kEnding[] = ".db";
constexpr std::size_t kMaxNameSize = 64;

// Letters of other alphabets would depend on the locale.
bool IsAllowed(char letter) {
  return (letter >= 'A' && letter <= 'Z') || (letter >= 'a' && letter <= 'z') ||
         (letter >= '0' && letter <= '9') || letter == '.' || letter == '_' || letter == '-';
}

bool IsMissing(const std::error_code& failure) {
  return failure == std::errc::no_such_file_or_directory || failure == std::errc::not_a_directory;
}

[[noreturn]] void ThrowUnreadable(const std::string& path, const std::error_code& failure) {
  throw LinuxHost::HostError(failure.value(), "cannot look for " + path + ": " + failure.message());
}

// What lies at `path`; nothing when nothing does.
std::optional<struct stat> Examine(const std::string& path) {
  struct stat status {};
  if (lstat(path.c_str(), &status) == 0) return status;
  const std::error_code failure(errno, std::generic_category());
  if (!IsMissing(failure)) ThrowUnreadable(path, failure);
  return std::nullopt;
}

// The names of what lies in the directory of the saved states.
std::vector<std::filesystem::path> ListFiles() {
  std::vector<std::filesystem::path> files;
  std::error_code failure;
  std::filesystem::directory_iterator entry(kSavedStatesDir, failure);
  for (; !failure && entry != std::filesystem::directory_iterator(); entry.increment(failure)) {
    files.push_back(entry->path());
  }
  if (failure && !IsMissing(failure)) ThrowUnreadable(kSavedStatesDir, failure);
  return files;
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

std::optional<SavedState> FindSaved(const std::string& name) {
  const std::optional<struct stat> status = Examine(SavedStatePath(name));
  if (!status) return std::nullopt;
  return SavedState{.name = name, .time = status->st_mtim.tv_sec};
}

bool IsSaved(const std::string& name) { return FindSaved(name).has_value(); }

std::vector<SavedState> ListSavedStates() {
  std::vector<SavedState> states;
  for (const std::filesystem::path& file : ListFiles()) {
    const std::string name = file.stem();
    if (file.extension() != kEnding || !WhyNoSavedName(name).empty()) continue;
    const std::optional<struct stat> status = Examine(file);
    // A link is named, so that who uses it tells that it is refused.
    if (!status || !(S_ISREG(status->st_mode) || S_ISLNK(status->st_mode))) continue;
    states.push_back({.name = name, .time = status->st_mtim.tv_sec});
  }
  std::ranges::sort(states, {},
                    [](const SavedState& state) { return std::tie(state.time, state.name); });
  return states;
}

std::string NearestSavedName(const std::string& name) {
  std::vector<std::string> names;
  for (const SavedState& state : ListSavedStates()) names.push_back(state.name);
  return NearestWord(name, names);
}

ExitCode RefuseUnsaved(const std::string& verb, const std::string& name) {
  const std::string nearest = NearestSavedName(name);
  return Refuse(verb, "there is no saved state '" + name + "'. " +
                          (nearest.empty() ? Call("history") + " lists what is saved."
                                           : "Did you mean '" + nearest + "'?"));
}

std::shared_ptr<const std::string> AddSavedName(Syntax& syntax, const std::string& meaning) {
  const auto name = std::make_shared<std::string>();
  syntax.AddOption("NAME", *name, meaning)
      .Require()
      .Check(WhyNoSavedName)
      .Offer(OfferSavedStates());
  return name;
}

}  // namespace SecPolicyCli
