#pragma once

#include <string>
#include <vector>

#include "complete/offer.h"

namespace SecPolicyCli {

// An option or an argument, as far as it is told to users.
struct OptionForm {
  std::vector<std::string> names;  // with their dashes, the long ones first; of an argument none
  std::string description;
  std::string valueName;  // what the usage calls a value
  bool takesValue = false;
  bool isList = false;  // an argument that takes all that is there, or what may be given again
  Offering offering;    // of a value; may be empty

  bool IsArgument() const { return names.empty(); }
};

// The command, one of its verbs, or a kind of that.
struct CommandForm {
  std::string name;
  std::vector<OptionForm> options;
  std::vector<OfferedWord> kinds;  // what has to stand behind it, if anything

  // Null for a name that no option has.
  const OptionForm* FindOption(const std::string& option) const;

  std::vector<std::string> KindNames() const;
};

}  // namespace SecPolicyCli
