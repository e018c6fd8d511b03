#include "word_place.h"

#include <CLI/App.hpp>
#include <algorithm>
#include <set>
#include <span>
#include <utility>

namespace SecPolicyCli {
namespace {

bool IsOption(const std::string& word) { return word.size() > 1 && word.front() == '-'; }

bool TakesValue(const CLI::Option& option) { return option.get_items_expected_max() > 0; }

// An argument that takes all that is there, or an option that may be given again.
bool IsList(const CLI::Option& option) { return option.get_expected_max() > 1; }

// What the usage calls a value, without the words that it is one of: "FORMAT:{text,json}".
std::string ValueName(const CLI::Option& option) {
  if (option.get_positional()) return option.get_name(true);
  const std::string type = option.get_type_name();
  return type.substr(0, type.find(':'));
}

// Walks a command line as the parser does, which refuses one that is not complete.
class Walk {
 public:
  Walk(CLI::App& app, const std::function<void(CLI::App&)>& defineVerb, const Offerings& all)
      : levels{&app}, define(defineVerb), offerings(all) {}

  void Take(const std::string& word) {
    if (expecting != nullptr) {
      TakeValue(*std::exchange(expecting, nullptr), word);
    } else if (word == "--" && !isBehindDashes) {
      isBehindDashes = true;
      argumentsBeforeDashes = arguments.size();
    } else if (IsOption(word) && !isBehindDashes) {
      TakeOption(word);
    } else if (HasKinds()) {
      EnterKind(word);
    } else {
      arguments.push_back(word);
    }
  }

  WordPlace PlaceOf(const std::string& word) {
    if (isLost) return place;
    if (expecting != nullptr) {
      OfferFor(*expecting);
    } else if (word.starts_with('-') && !isBehindDashes) {
      PlaceOfOption(word);
    } else if (HasKinds()) {
      OfferKinds();
    } else if (const CLI::Option* const argument = CurrentArgument()) {
      OfferFor(*argument);
    } else {
      OfferOptions();
    }
    return place;
  }

 private:
  static std::vector<CLI::App*> KindsOf(CLI::App& level) {
    return level.get_subcommands([](CLI::App*) { return true; });
  }

  bool HasKinds() const { return !isBehindDashes && !KindsOf(*levels.back()).empty(); }

  void EnterKind(const std::string& word) {
    if (levels.size() == 1 && word == "help" && !isHelp) {
      isHelp = true;
      return;
    }
    const std::vector<CLI::App*> kinds = KindsOf(*levels.back());
    const auto kind =
        std::ranges::find(kinds, word, [](const CLI::App* each) { return each->get_name(); });
    isLost = kind == kinds.end() || isHelp;
    if (isLost) return;
    levels.push_back(*kind);
    if (levels.size() == 2) define(**kind);
  }

  void TakeValue(const CLI::Option& option, const std::string& value) {
    given.insert(&option);
    if (option.check_lname("root")) place.root = value;
  }

  void TakeOption(const std::string& word) {
    const std::size_t sign = word.find('=');
    const CLI::Option* const option = FindOption(word.substr(0, sign));
    if (option == nullptr) return;
    given.insert(option);
    if (!TakesValue(*option)) return;
    if (sign == std::string::npos) {
      expecting = option;
    } else {
      TakeValue(*option, word.substr(sign + 1));
    }
  }

  const CLI::Option* FindOption(const std::string& name) const {
    for (const CLI::App* level : levels) {
      if (const CLI::Option* const option = level->get_option_no_throw(name)) return option;
    }
    return nullptr;
  }

  void PlaceOfOption(const std::string& word) {
    const std::size_t sign = word.find('=');
    if (sign == std::string::npos) return OfferOptions();
    const CLI::Option* const option = FindOption(word.substr(0, sign));
    if (option == nullptr || !TakesValue(*option)) return;
    place.fixed = word.substr(0, sign + 1);
    OfferFor(*option);
  }

  void OfferFor(const CLI::Option& option) {
    const auto own = offerings.find(&option);
    place.offering = own == offerings.end() ? OfferingFor(ValueName(option)) : own->second;
  }

  void OfferKinds() {
    if (levels.size() == 1 && !isHelp) place.words.push_back({"help", "Explain a verb"});
    for (const CLI::App* kind : KindsOf(*levels.back())) {
      place.words.push_back({kind->get_name(), kind->get_description()});
    }
  }

  // The argument that the next word belongs to, with the words that it has already: behind "--" the
  // last, which is for the words of a command.
  const CLI::Option* CurrentArgument() {
    const std::vector<const CLI::Option*> all =
        std::as_const(*levels.back()).get_options([](const CLI::Option* option) {
          return option->get_positional();
        });
    if (all.empty()) return nullptr;
    if (isBehindDashes) {
      Keep(argumentsBeforeDashes);
      return all.back();
    }
    std::size_t index = 0;
    while (index < arguments.size() && index < all.size() && !IsList(*all[index])) ++index;
    if (index == all.size()) return nullptr;
    Keep(IsList(*all[index]) ? index : 0);
    return all[index];
  }

  void Keep(std::size_t first) {
    const auto words = std::span(arguments).subspan(first);
    place.before.assign(words.begin(), words.end());
  }

  void OfferOptions() {
    std::set<std::string> names;
    for (auto level = levels.rbegin(); level != levels.rend(); ++level) {
      for (const CLI::Option* option : std::as_const(**level).get_options()) {
        if (option->get_positional() || option->get_lnames().empty()) continue;
        if (given.contains(option) && !IsList(*option)) continue;
        const std::string name = "--" + option->get_lnames().front();
        if (names.insert(name).second) place.words.push_back({name, option->get_description()});
      }
    }
  }

  std::vector<CLI::App*> levels;  // the command, its verb, and the kind of that
  const std::function<void(CLI::App&)>& define;
  const Offerings& offerings;
  const CLI::Option* expecting = nullptr;  // a value
  std::set<const CLI::Option*> given;
  std::vector<std::string> arguments;
  std::size_t argumentsBeforeDashes = 0;
  bool isBehindDashes = false;
  bool isHelp = false;
  bool isLost = false;  // behind a word that is nothing
  WordPlace place;
};

}  // namespace

WordPlace FindPlace(CLI::App& app, const std::function<void(CLI::App& verb)>& define,
                    const Offerings& offerings, const std::vector<std::string>& words) {
  Walk walk(app, define, offerings);
  if (words.empty()) return walk.PlaceOf("");
  for (std::size_t index = 0; index + 1 < words.size(); ++index) walk.Take(words[index]);
  return walk.PlaceOf(words.back());
}

}  // namespace SecPolicyCli
