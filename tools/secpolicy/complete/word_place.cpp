#include "word_place.h"

#include <algorithm>
#include <deque>
#include <set>
#include <span>
#include <utility>

namespace SecPolicyCli {
namespace {

bool IsOption(const std::string& word) { return word.size() > 1 && word.front() == '-'; }

using Enter = std::function<CommandForm(const std::vector<std::string>&)>;

// Walks a command line as the parser does, which refuses one that is not complete.
class Walk {
 public:
  Walk(const CommandForm& command, const Enter& enterKind) : levels{command}, enter(enterKind) {}

  void Take(const std::string& word) {
    if (isLost) return;
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
    } else if (const OptionForm* const argument = CurrentArgument()) {
      OfferFor(*argument);
    } else {
      OfferOptions();
    }
    return place;
  }

 private:
  bool HasKinds() const { return !isBehindDashes && !levels.back().kinds.empty(); }

  void EnterKind(const std::string& word) {
    if (levels.size() == 1 && word == "help" && !isHelp) {
      isHelp = true;
      return;
    }
    const std::vector<OfferedWord>& kinds = levels.back().kinds;
    isLost = isHelp || std::ranges::find(kinds, word, &OfferedWord::word) == kinds.end();
    if (!isLost) Descend(word);
  }

  void Descend(const std::string& kind) {
    path.push_back(kind);
    levels.push_back(enter(path));
  }

  void TakeValue(const OptionForm& option, const std::string& value) {
    given.insert(&option);
    if (option.names.front() == "--root") place.root = value;
  }

  void TakeOption(const std::string& word) {
    const std::size_t sign = word.find('=');
    const OptionForm* const option = FindOption(word.substr(0, sign));
    if (option == nullptr) return;
    given.insert(option);
    if (!option->takesValue) return;
    if (sign == std::string::npos) {
      expecting = option;
    } else {
      TakeValue(*option, word.substr(sign + 1));
    }
  }

  const OptionForm* FindOption(const std::string& name) const {
    for (const CommandForm& level : levels) {
      if (const OptionForm* const option = level.FindOption(name)) return option;
    }
    return nullptr;
  }

  void PlaceOfOption(const std::string& word) {
    const std::size_t sign = word.find('=');
    if (sign == std::string::npos) return OfferOptions();
    const OptionForm* const option = FindOption(word.substr(0, sign));
    if (option == nullptr || !option->takesValue) return;
    place.fixed = word.substr(0, sign + 1);
    OfferFor(*option);
  }

  void OfferFor(const OptionForm& option) {
    place.offering = option.offering ? option.offering : OfferingFor(option.valueName);
  }

  void OfferKinds() {
    if (levels.size() == 1 && !isHelp) place.words.push_back({"help", "Explain a verb"});
    const std::vector<OfferedWord>& kinds = levels.back().kinds;
    place.words.insert(place.words.end(), kinds.begin(), kinds.end());
  }

  // The argument that the next word belongs to, with the words that it has already: behind "--" the
  // last, which is for the words of a command.
  const OptionForm* CurrentArgument() {
    std::vector<const OptionForm*> all;
    for (const OptionForm& option : levels.back().options) {
      if (option.IsArgument()) all.push_back(&option);
    }
    if (all.empty()) return nullptr;
    if (isBehindDashes) {
      Keep(argumentsBeforeDashes);
      return all.back();
    }
    std::size_t index = 0;
    while (index < arguments.size() && index < all.size() && !all[index]->isList) ++index;
    if (index == all.size()) return nullptr;
    Keep(all[index]->isList ? index : 0);
    return all[index];
  }

  void Keep(std::size_t first) {
    const auto words = std::span(arguments).subspan(first);
    place.before.assign(words.begin(), words.end());
  }

  void OfferOptions() {
    std::set<std::string> names;
    for (auto level = levels.rbegin(); level != levels.rend(); ++level) {
      for (const OptionForm& option : level->options) {
        if (option.IsArgument() || !option.names.front().starts_with("--")) continue;
        if (given.contains(&option) && !option.isList) continue;
        const std::string& name = option.names.front();
        if (names.insert(name).second) place.words.push_back({name, option.description});
      }
    }
  }

  std::deque<CommandForm>
      levels;                     // the command, its verb, and the kind of that; they stay in place
  std::vector<std::string> path;  // the names of the latter
  const Enter& enter;
  const OptionForm* expecting = nullptr;  // a value
  std::set<const OptionForm*> given;
  std::vector<std::string> arguments;
  std::size_t argumentsBeforeDashes = 0;
  bool isBehindDashes = false;
  bool isHelp = false;
  bool isLost = false;  // behind a word that is nothing
  WordPlace place;
};

}  // namespace

WordPlace FindPlace(const CommandForm& command, const Enter& enter,
                    const std::vector<std::string>& words) {
  Walk walk(command, enter);
  if (words.empty()) return walk.PlaceOf("");
  for (std::size_t index = 0; index + 1 < words.size(); ++index) walk.Take(words[index]);
  return walk.PlaceOf(words.back());
}

}  // namespace SecPolicyCli
