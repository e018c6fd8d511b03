#include "host/linux/operation/settings.h"

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <charconv>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "policy/level.h"

namespace LinuxHost {
namespace {

using Braxo::Misc::StrCat;
using OrinConfigStore::ConfigStoreObjectId;

constexpr char kLevelKey[] = "enforcement_level";

// The object that enforcement is restored from.
ConfigStoreObjectId DomainSettings(const std::string& domain) {
  return {"domain_settings", "security", "orin", domain};
}

std::string LowerCase(std::string text) {
  std::transform(text.begin(), text.end(), text.begin(),
                 [](unsigned char letter) { return static_cast<char>(std::tolower(letter)); });
  return text;
}

}  // namespace

OptionValue ParseOptionValue(const std::string& text) {
  long number = 0;
  const char* end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, number);
  if (error == std::errc() && stop == end) return number;
  return text;
}

std::optional<OptionValue> FindWantedOption(const std::string& path) {
  ConfigDatabase* database = ConfigDatabase::Find();
  if (database == nullptr) return std::nullopt;
  return database->FindOption(path);
}

void StoreWantedOption(const std::string& path, const OptionValue& value) {
  if (!path.starts_with('/')) {
    throw HostError(EINVAL, StrCat("The path of an advanced option begins with \"/\": ", path));
  }
  ConfigDatabase::Current().StoreOption(path, value);
}

std::map<std::string, OptionValue> ListWantedOptions() {
  ConfigDatabase* database = ConfigDatabase::Find();
  if (database == nullptr) return {};
  return database->ListOptions();
}

bool RemoveWantedOption(const std::string& path) {
  ConfigDatabase* database = ConfigDatabase::Find();
  return database != nullptr && database->RemoveOption(path);
}

std::optional<std::string> FindWantedEnforcement(const std::string& domain) {
  ConfigDatabase* database = ConfigDatabase::Find();
  if (database == nullptr) return std::nullopt;
  return database->FindValue(DomainSettings(domain), kLevelKey);
}

void StoreWantedEnforcement(const std::string& domain, const std::string& level) {
  const std::string word = LowerCase(level);
  if (!Policy::FindLevel(word)) {
    throw HostError(EINVAL, StrCat("Unknown enforcement level ", level,
                                   ": use enforcing, permissive or disabled"));
  }
  ConfigDatabase::Current().StoreValue(DomainSettings(domain), kLevelKey, word);
}

std::map<std::string, std::string> ListWantedEnforcement() {
  ConfigDatabase* database = ConfigDatabase::Find();
  if (database == nullptr) return {};
  return database->ListValues(DomainSettings(""), kLevelKey);
}

bool RemoveWantedEnforcement(const std::string& domain) {
  ConfigDatabase* database = ConfigDatabase::Find();
  return database != nullptr && database->RemoveValue(DomainSettings(domain), kLevelKey);
}

bool WasEnforcementApplied(const std::string& domain) {
  ConfigDatabase* database = ConfigDatabase::Find();
  return database != nullptr && database->BootStatus(DomainSettings(domain));
}

}  // namespace LinuxHost
