#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "verb.h"

namespace SecPolicyCli {

// Where the saved states lie. They outlive a boot.
inline constexpr char kSavedStatesDir[] = "/var/lib/secpolicy/saved";

struct SavedState {
  std::string name;
  std::int64_t time = 0;  // when it was saved, in seconds since 1970
};

// Why `name` cannot be the name of a saved state; empty when it can.
std::string WhyNoSavedName(const std::string& name);

// The file of the saved state `name`, which may not be there.
std::string SavedStatePath(const std::string& name);

// The saved state `name`; nothing when there is none. Throws HostError when this user may not look.
std::optional<SavedState> FindSaved(const std::string& name);
bool IsSaved(const std::string& name);

// The saved states, the oldest first. Throws HostError when they cannot be listed.
std::vector<SavedState> ListSavedStates();

// The name of a saved state that `name` may be meant for; empty when none is near. Throws as that.
std::string NearestSavedName(const std::string& name);

// Refuses what needs the saved state `name` where there is none.
ExitCode RefuseUnsaved(const std::string& verb, const std::string& name);

// Adds the required argument NAME, the name of a saved state, to `syntax`.
std::shared_ptr<const std::string> AddSavedName(Syntax& syntax, const std::string& meaning);

}  // namespace SecPolicyCli
