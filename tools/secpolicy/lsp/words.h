#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "file_role.h"
#include "policy/rule_kind.h"
#include "text_document.h"

namespace SecPolicyCli {

// A word of a line, and where in the line it stands.
struct PlacedWord {
  std::string text;
  Span span;
  std::optional<Policy::WordKind> kind = {};  // none: the keyword or what a rule decides
};

// The words of a line as the library reads them. What they stand for goes by the first of them;
// whether they are right is not asked.
std::vector<PlacedWord> PlaceWords(FileRole role, std::string_view line);

// Whether it is "grant" or "revoke".
bool IsGrantWord(const std::string& word);

// What of a line the library looks at, without a comment.
std::string_view ReadPart(std::string_view line);

// What can stand behind `before`, the words at the beginning of a line.
struct Expected {
  bool keyword = false;
  std::optional<Policy::WordKind> kind = {};
  bool verdict = false;
  bool permissions = false;
};
Expected ExpectedAfter(FileRole role, const std::vector<PlacedWord>& before);

}  // namespace SecPolicyCli
