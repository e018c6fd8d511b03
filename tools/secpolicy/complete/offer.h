#pragma once

#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include "policy/rule_kind.h"

// What completion offers for the values of arguments and options.
namespace SecPolicyCli {

struct OfferedWord {
  std::string word;
  std::string meaning = {};  // may be empty
};

// What of the file system can stand there, too.
enum class OfferedFiles { kNone, kFiles, kDirectories, kPrograms };

struct Offer {
  std::vector<OfferedWord> words;
  OfferedFiles files = OfferedFiles::kNone;
};

// Says what can stand for a value, below the root that was entered. `before` are the words of the
// same argument that stand before or, of one that takes a single word, of the arguments before. May
// throw what the host throws.
using Offering = std::function<Offer(const std::vector<std::string>& before)>;

Offering OfferWords(const std::vector<std::string>& words);
Offering OfferNothing();

// The words of rules that this kind can stand for: those of the host's tables, domains and paths.
Offering OfferWordsOf(Policy::WordKind kind);

// The labels that files can be given; the name of a domain is none of them.
Offering OfferObjects();

Offering OfferFiles();
Offering OfferSavedStates();
Offering OfferTardisks();

// The names of what `check` finds, or only those of warnings.
Offering OfferCodes(bool onlyWarnings);

// What is offered for a value with this name in the usage ("DOMAIN"), where nothing else is said of
// it: a name means the same everywhere. Empty for a name that tells nothing.
Offering OfferingFor(std::string_view valueName);

}  // namespace SecPolicyCli
