#include "command_form.h"

#include <algorithm>

namespace SecPolicyCli {

const OptionForm* CommandForm::FindOption(const std::string& option) const {
  const auto has = [&](const OptionForm& each) {
    return std::ranges::find(each.names, option) != each.names.end();
  };
  const auto found = std::ranges::find_if(options, has);
  return found == options.end() ? nullptr : &*found;
}

std::vector<std::string> CommandForm::KindNames() const {
  std::vector<std::string> names;
  for (const OfferedWord& kind : kinds) names.push_back(kind.word);
  return names;
}

}  // namespace SecPolicyCli
