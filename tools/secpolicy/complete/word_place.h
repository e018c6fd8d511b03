#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "command_form.h"
#include "offer.h"

namespace SecPolicyCli {

// What can stand where the last word of a command line stands.
struct WordPlace {
  std::optional<std::string> root;  // that the words before give
  std::string fixed;                // what of the word stays as it is, as "--format="
  std::vector<OfferedWord> words;   // verbs, kinds and options
  Offering offering;                // of a value; may be empty
  std::vector<std::string> before;  // the words of the same argument
};

// Finds out where the last of `words`, which are those behind the command's name, stands. `enter`
// tells of a verb or of a kind of it, by their names, what can stand behind it.
WordPlace FindPlace(const CommandForm& command,
                    const std::function<CommandForm(const std::vector<std::string>& names)>& enter,
                    const std::vector<std::string>& words);

}  // namespace SecPolicyCli
