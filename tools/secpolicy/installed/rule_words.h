#pragma once

#include <optional>
#include <string>
#include <vector>

namespace SecPolicyCli {

// The words of a rule.
struct RuleWords {
  std::string keyword;             // its kind: "-a"
  std::vector<std::string> words;  // of a -r rule: path and permissions, which may be empty
  std::optional<bool> grant;       // no value for a -r rule
};

// Takes apart a rule as it is displayed. The path of a -r rule may hold any letters; a name with a
// blank, which no policy file can make, counts as several words.
RuleWords SplitRule(const std::string& text);

}  // namespace SecPolicyCli
