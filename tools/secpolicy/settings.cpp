#include "host/linux/operation/settings.h"

#include <algorithm>
#include <cctype>
#include <iostream>
#include <iterator>
#include <string_view>
#include <variant>

#include "braxo/lib/exception.h"
#include "command_line.h"
#include "ending.h"
#include "host/linux/operation/state_use.h"
#include "json.h"
#include "policy/installed_policy.h"
#include "query/named.h"
#include "query/question.h"
#include "root.h"
#include "secpolicy/secpolicy.h"
#include "text/shell_word.h"
#include "text/suggestion.h"
#include "text/visible.h"
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
  bool (*remove)(const std::string& key);
  std::string (*whyNot)(const std::string& value);
  Offer (*offerKeys)(const std::vector<std::string>& before);
};

std::string TextOf(const LinuxHost::OptionValue& value) {
  if (const long* number = std::get_if<long>(&value)) return std::to_string(*number);
  return std::get<std::string>(value);
}

constexpr char kTemplateOption[] = "/UserVars/CheckAccessTemplateEnabled";

void RequireOptionPath(const std::string& path) {
  if (path.starts_with('/')) return;
  throw QuestionError("the path of an option begins with a slash, as " +
                      std::string(kTemplateOption));
}

std::optional<std::string> FindOption(const std::string& path) {
  RequireOptionPath(path);
  const auto value = LinuxHost::FindWantedOption(path);
  if (!value) return std::nullopt;
  return TextOf(*value);
}

void StoreOption(const std::string& path, const std::string& value) {
  RequireOptionPath(path);
  LinuxHost::StoreWantedOption(path, LinuxHost::ParseOptionValue(value));
}

// The name of the domain that has the number `word`; any other word names itself.
std::string NameOf(const std::string& word) {
  const bool isNumber = word.find_first_not_of("0123456789") == std::string::npos;
  if (!isNumber || LinuxHost::IsStateMissing()) return word;
  SecPolicy::TeskAccessInterfaceImpl access;
  try {
    return FindDomain(word, access).name;
  } catch (const QuestionError&) {
    return word;
  }
}

// What is stored by a word comes before what the word names: that domain may have gone.
std::optional<std::string> FindEnforcement(const std::string& domain) {
  const auto level = LinuxHost::FindWantedEnforcement(domain);
  return level ? level : LinuxHost::FindWantedEnforcement(NameOf(domain));
}

bool RemoveEnforcement(const std::string& domain) {
  return LinuxHost::RemoveWantedEnforcement(domain) ||
         LinuxHost::RemoveWantedEnforcement(NameOf(domain));
}

// A level may be stored for a domain that a boot is to bring, but hardly for one that none brought.
void StoreEnforcement(const std::string& domain, const std::string& level) {
  const std::string name = NameOf(domain);
  if (!LinuxHost::IsStateMissing()) {
    SecPolicy::TeskAccessInterfaceImpl access;
    std::vector<std::string> names;
    for (const Policy::InstalledDomain& installed : Policy::ListDomains(access)) {
      names.push_back(installed.name);
    }
    if (std::ranges::find(names, name) == names.end()) {
      const std::string nearest = NearestWord(name, names);
      throw QuestionError("there is no domain '" + name + "', so nothing was stored. " +
                          (nearest.empty() ? Call("status") + " counts those that there are"
                                           : "Did you mean '" + nearest + "'?"));
    }
  }
  LinuxHost::StoreWantedEnforcement(name, level);
}

// Any text can be the value of an option.
std::string WhyNoValue(const std::string& /*value*/) { return ""; }

std::string WhyNoLevel(const std::string& value) {
  std::string word = value;
  std::ranges::transform(word, word.begin(),
                         [](unsigned char letter) { return std::tolower(letter); });
  if (Policy::FindLevel(word)) return "";
  return "there is no level '" + value + "': enforcing, permissive or disabled";
}

Offer OfferOptions(const std::vector<std::string>& /*before*/) {
  Offer offer{.words = {{kTemplateOption}}};
  for (const auto& [path, value] : LinuxHost::ListWantedOptions()) offer.words.push_back({path});
  return offer;
}

Offer OfferDomains(const std::vector<std::string>& before) {
  return OfferWordsOf(Policy::WordKind::kDomain)(before);
}

constexpr char kOption[] = "option";
constexpr char kEnforcement[] = "enforcement";

constexpr Setting kSettingKinds[] = {
    {kOption, "An advanced option of the host", "PATH",
     "The option, such as /UserVars/CheckAccessTemplateEnabled", "VALUE",
     "What to store: a whole number, or any other text", FindOption, StoreOption,
     LinuxHost::RemoveWantedOption, WhyNoValue, OfferOptions},
    {kEnforcement, "The level that 'restore' gives a domain", "DOMAIN",
     "The domain, by its name or its number", "LEVEL",
     "What to store: enforcing, permissive or disabled", FindEnforcement, StoreEnforcement,
     RemoveEnforcement, WhyNoLevel, OfferDomains},
};

ExitCode Show(const Setting& setting, const std::string& key) {
  const auto value = setting.find(key);
  if (!value) {
    return Refuse("settings", std::string("nothing is stored for ") + setting.name + " " + key +
                                  ". Store something with " +
                                  Call(std::string("settings ") + setting.name + " " +
                                       ShellWord(key) + " " + setting.value) +
                                  ".");
  }
  return CallLibrary(
      "settings", [&](ErrorList&) { std::cout << *value << std::endl; }, AdviseOnPrivilege);
}

// Whose programs read the other options, nobody knows here.
std::string DescribeStored(const Setting& setting, const std::string& key) {
  const bool isRead = std::string_view(setting.name) != kOption || key == kTemplateOption;
  return isRead ? "done" : std::string("done; a load reads no option but ") + kTemplateOption;
}

ExitCode Store(const Setting& setting, const std::string& key, const std::string& value) {
  return CallLibrary(
      "settings", [&](ErrorList&) { setting.store(key, value); }, AdviseOnPrivilege,
      [&] { return DescribeStored(setting, key); });
}

Action DefineSetting(const Setting& setting, Syntax& syntax) {
  const auto key = std::make_shared<std::string>();
  const auto value = std::make_shared<std::string>();
  syntax.AddOption(setting.key, *key, setting.keyMeaning).Require().Offer(setting.offerKeys);
  const Option stored =
      syntax.AddOption(setting.value, *value, setting.valueMeaning).Check(setting.whyNot);
  return [=, &setting] {
    return stored.IsGiven() ? Store(setting, *key, *value) : Show(setting, *key);
  };
}

ExitCode Unset(const std::string& kind, const std::string& key) {
  const auto setting = std::ranges::find(kSettingKinds, kind, &Setting::name);
  if (!setting->find(key)) {
    return Refuse("settings unset", "nothing is stored for " + kind + " " + key);
  }
  return CallLibrary(
      "settings unset", [&](ErrorList&) { setting->remove(key); }, AdviseOnPrivilege);
}

std::string CheckSettingKind(const std::string& kind) {
  if (std::ranges::find(kSettingKinds, kind, &Setting::name) != std::end(kSettingKinds)) return "";
  return "'" + kind + "' is no kind of setting: option or enforcement";
}

Offer OfferKeys(const std::vector<std::string>& before) {
  const std::string kind = before.empty() ? "" : before.front();
  Offer offer;
  if (kind != kEnforcement) offer = OfferOptions(before);
  if (kind == kOption) return offer;
  for (const auto& [domain, level] : LinuxHost::ListWantedEnforcement()) {
    offer.words.push_back({domain});
  }
  return offer;
}

Action DefineUnset(Syntax& syntax) {
  const auto kind = std::make_shared<std::string>();
  const auto key = std::make_shared<std::string>();
  syntax.AddOption("KIND", *kind, "option or enforcement")
      .Check(CheckSettingKind)
      .Require()
      .Offer(OfferWords({kOption, kEnforcement}));
  syntax.AddOption("KEY", *key, "The path of the option, or the name of the domain")
      .Require()
      .Offer(OfferKeys);
  return [=] { return Unset(*kind, *key); };
}

void ListAsText() {
  for (const auto& [path, value] : LinuxHost::ListWantedOptions()) {
    std::cout << "option " << Visible(path) << ' ' << Visible(TextOf(value)) << '\n';
  }
  for (const auto& [domain, level] : LinuxHost::ListWantedEnforcement()) {
    std::cout << "enforcement " << Visible(domain) << ' ' << level << '\n';
  }
}

void ListAsJson() {
  Json options = Json::Object();
  for (const auto& option : LinuxHost::ListWantedOptions()) {
    std::visit([&](const auto& value) { options[option.first] = value; }, option.second);
  }
  Json levels = Json::Object();
  for (const auto& [domain, level] : LinuxHost::ListWantedEnforcement()) levels[domain] = level;
  const Json list = {
      {"schema", "secpolicy.settings/1"}, {"option", options}, {"enforcement", levels}};
  std::cout << list.Text();
}

Action DefineList(Syntax& syntax) {
  const auto format = std::make_shared<std::string>();
  syntax.AddFormat(*format, "them", {"text", "json"});
  return [format] {
    return CallLibrary(
        "settings list", [&](ErrorList&) { (*format == "json" ? ListAsJson : ListAsText)(); },
        AdviseOnPrivilege);
  };
}

const Kind kList = {"list", "Print all that is stored",
                    "Prints each setting as the words that store it.\n"
                    "\n"
                    "Examples:\n"
                    "  secpolicy settings list\n"
                    "  secpolicy settings list --format json | jq .enforcement",
                    DefineList};

const Kind kUnset = {
    "unset", "Forget a setting",
    "Forgets what is stored. What was applied stays as it is until the next boot.\n"
    "\n"
    "Example:\n"
    "  secpolicy settings unset enforcement appDom",
    DefineUnset};

Action Define(Syntax& syntax) {
  std::vector<Kind> kinds = {kList, kUnset};
  for (const Setting& setting : kSettingKinds) {
    kinds.push_back({setting.name, setting.summary, nullptr,
                     [&setting](Syntax& kind) { return DefineSetting(setting, kind); }});
  }
  return syntax.AddKinds(kinds);
}

}  // namespace

const Verb kSettings = {
    "settings", "Read or store what the host is wanted to do",
    "Without a value prints what is stored; with one, stores it for the next load or restore. A\n"
    "level is stored for a domain that is installed, and before the first boot for any.\n"
    "\n"
    "Examples:\n"
    "  secpolicy settings list                               what is stored?\n"
    "  secpolicy settings enforcement appDom                 which level is stored?\n"
    "  secpolicy settings enforcement appDom permissive      store one; 'restore' applies it\n"
    "  secpolicy settings option /UserVars/CheckAccessTemplateEnabled 1\n"
    "                                                        the next load makes the template "
    "domain",
    Define};

}  // namespace SecPolicyCli
