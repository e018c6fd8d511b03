#include "host/linux/operation/settings.h"

#include <iostream>
#include <variant>

#include "command_line.h"
#include "ending.h"
#include "root.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

// A kind of setting: what names it, and how the host reads and stores it as text.
struct Setting {
  const char* name;
  const char* summary;
  const char* key;
  const char* keyMeaning;
  const char* value;
  const char* valueMeaning;
  std::optional<std::string> (*find)(const std::string& key);
  void (*store)(const std::string& key, const std::string& value);
};

std::optional<std::string> FindOption(const std::string& path) {
  const auto value = LinuxHost::FindWantedOption(path);
  if (!value) return std::nullopt;
  if (const long* number = std::get_if<long>(&*value)) return std::to_string(*number);
  return std::get<std::string>(*value);
}

void StoreOption(const std::string& path, const std::string& value) {
  LinuxHost::StoreWantedOption(path, LinuxHost::ParseOptionValue(value));
}

constexpr Setting kSettingKinds[] = {
    {"option", "An advanced option of the host", "PATH",
     "The option, such as /UserVars/CheckAccessTemplateEnabled", "VALUE",
     "What to store: a whole number, or any other text", FindOption, StoreOption},
    {"enforcement", "The level that 'restore' gives a domain", "DOMAIN", "The name of the domain",
     "LEVEL", "What to store: enforcing, permissive or disabled", LinuxHost::FindWantedEnforcement,
     LinuxHost::StoreWantedEnforcement},
};

ExitCode Show(const Setting& setting, const std::string& key) {
  const auto value = setting.find(key);
  if (!value) {
    return Refuse(
        "settings",
        std::string("nothing is stored for ") + setting.name + " " + key +
            ". Store something with " +
            Call(std::string("settings ") + setting.name + " " + key + " " + setting.value) + ".");
  }
  return CallLibrary(
      "settings", [&](ErrorList&) { std::cout << *value << std::endl; }, AdviseOnPrivilege);
}

ExitCode Store(const Setting& setting, const std::string& key, const std::string& value) {
  return CallLibrary(
      "settings", [&](ErrorList&) { setting.store(key, value); }, AdviseOnPrivilege);
}

Action DefineSetting(const Setting& setting, Syntax& syntax) {
  const auto key = std::make_shared<std::string>();
  const auto value = std::make_shared<std::string>();
  syntax.AddOption(setting.key, *key, setting.keyMeaning).Require();
  const Option stored = syntax.AddOption(setting.value, *value, setting.valueMeaning);
  return [=, &setting] {
    return stored.IsGiven() ? Store(setting, *key, *value) : Show(setting, *key);
  };
}

Action Define(Syntax& syntax) {
  std::vector<Kind> kinds;
  for (const Setting& setting : kSettingKinds) {
    kinds.push_back({setting.name, setting.summary, nullptr,
                     [&setting](Syntax& kind) { return DefineSetting(setting, kind); }});
  }
  return syntax.AddKinds(kinds);
}

}  // namespace

const Verb kSettings = {
    "settings", "Read or store what the host is wanted to do",
    "Without a value prints what is stored; with one, stores it for the next load or restore.\n"
    "\n"
    "Examples:\n"
    "  secpolicy settings enforcement appDom                 which level is stored?\n"
    "  secpolicy settings enforcement appDom permissive      store one; 'restore' applies it\n"
    "  secpolicy settings option /UserVars/CheckAccessTemplateEnabled 1\n"
    "                                                        the next load makes the template "
    "domain",
    Define};

}  // namespace SecPolicyCli
