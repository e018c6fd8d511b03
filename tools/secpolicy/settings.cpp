#include "host/linux/settings.h"

#include <CLI/App.hpp>
#include <functional>
#include <iostream>
#include <variant>

#include "library_call.h"
#include "root.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

// One kind of setting: what names it, and how the host reads and stores it as text.
struct Kind {
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

constexpr Kind kKinds[] = {
    {"option", "An advanced option of the host", "PATH",
     "The option, such as /UserVars/CheckAccessTemplateEnabled", "VALUE",
     "What to store: a whole number, or any other text", FindOption, StoreOption},
    {"enforcement", "The level that 'restore' gives a domain", "DOMAIN", "The name of the domain",
     "LEVEL", "What to store: enforcing, permissive or disabled", LinuxHost::FindWantedEnforcement,
     LinuxHost::StoreWantedEnforcement},
};

ExitCode Show(const Kind& kind, const std::string& key) {
  const auto value = kind.find(key);
  if (!value) {
    return Refuse("settings", std::string("nothing is stored for ") + kind.name + " " + key +
                                  ". Store something with 'secpolicy settings " + kind.name + " " +
                                  key + " " + kind.value + "'.");
  }
  return CallLibrary(
      "settings", "", [&] { std::cout << *value << std::endl; }, AdviseOnPrivilege);
}

ExitCode Store(const Kind& kind, const std::string& key, const std::string& value) {
  return CallLibrary(
      "settings", "", [&] { kind.store(key, value); }, AdviseOnPrivilege);
}

Action Define(CLI::App& app) {
  app.require_subcommand(1);
  const auto key = std::make_shared<std::string>();
  const auto value = std::make_shared<std::string>();
  const auto action = std::make_shared<Action>();
  for (const Kind& kind : kKinds) {
    CLI::App* const subcommand = app.add_subcommand(kind.name, kind.summary);
    subcommand->add_option(kind.key, *key, kind.keyMeaning)->required();
    const CLI::Option* const stored = subcommand->add_option(kind.value, *value, kind.valueMeaning);
    subcommand->parse_complete_callback([=, &kind] {
      *action = [=, &kind] {
        return stored->count() == 0 ? Show(kind, *key) : Store(kind, *key, *value);
      };
    });
  }
  return [action] { return (*action)(); };
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
