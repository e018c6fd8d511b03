#pragma once

#include <functional>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "offer.h"

namespace CLI {
class App;
class Option;
}  // namespace CLI

namespace SecPolicyCli {

// What can stand where the last word of a command line stands.
struct WordPlace {
  std::optional<std::string> root;  // that the words before give
  std::string fixed;                // what of the word stays as it is, as "--format="
  std::vector<OfferedWord> words;   // verbs, kinds and options
  Offering offering;                // of a value; may be empty
  std::vector<std::string> before;  // the words of the same argument
};

using Offerings = std::map<const CLI::Option*, Offering>;

// Finds out where the last of `words`, which are those behind the command's name, stands. `define`
// adds its options to the verb that it is given.
WordPlace FindPlace(CLI::App& app, const std::function<void(CLI::App& verb)>& define,
                    const Offerings& offerings, const std::vector<std::string>& words);

}  // namespace SecPolicyCli
