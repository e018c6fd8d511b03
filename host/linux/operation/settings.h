#pragma once

#include <map>
#include <optional>
#include <string>

#include "host/linux/state/config_database.h"

// The settings that the user wants of the host. They outlive a boot, in
// /var/lib/secpolicy/config.db unless SECPOLICY_HOST_CONFIG names another absolute path. All throw
// Braxo::Lib::BraxoException when the settings cannot be read or stored. Nothing is created to be
// read: without a file there are no settings.
namespace LinuxHost {

// The value that `text` stands for: an integer if it is one in decimal, else the text itself.
OptionValue ParseOptionValue(const std::string& text);

// The advanced option at `path` (such as "/UserVars/Name"), empty when it is not set.
std::optional<OptionValue> FindWantedOption(const std::string& path);

// Sets the advanced option at `path`, which begins with "/".
void StoreWantedOption(const std::string& path, const OptionValue& value);

// All that are set, by their paths.
std::map<std::string, OptionValue> ListWantedOptions();

// Makes the advanced option at `path` one that is not set. False when it was none that is.
bool RemoveWantedOption(const std::string& path);

// The enforcement level that the domain `domain` is to have, empty when none is set.
std::optional<std::string> FindWantedEnforcement(const std::string& domain);

// Sets the level, "enforcing", "permissive" or "disabled" in any case, that the domain `domain`
// gets when enforcement is restored. The domain need not exist yet.
void StoreWantedEnforcement(const std::string& domain, const std::string& level);

// All levels that are set, by the names of the domains.
std::map<std::string, std::string> ListWantedEnforcement();

// Forgets the level of the domain `domain`, which keeps the one that it has. False when none was
// set.
bool RemoveWantedEnforcement(const std::string& domain);

// True when the level of the domain `domain` was applied in this boot.
bool WasEnforcementApplied(const std::string& domain);

}  // namespace LinuxHost
