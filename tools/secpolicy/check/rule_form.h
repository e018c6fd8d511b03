#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

#include "check_run.h"

// What a line of each kind looks like, for hints and for who uses what; whether it is right is the
// library's to say.
namespace SecPolicyCli {

struct LineForm {
  const char* usage;
  std::span<const Policy::WordKind> words;  // behind the keyword, up to what the rule decides
};

// The form of the lines with this first word; nothing when there is none.
std::optional<LineForm> FindLineForm(const std::string& keyword);

// All words of the kind that a rule may have; none of paths and numbers.
std::vector<std::string> WordsOf(CheckRun& run, Policy::WordKind kind);

// A hint for the word `index` of a line that the library refused with `code`; may be empty.
Hint HintForRule(CheckRun& run, const Code& code, const SourceFile::Words& words,
                 std::size_t index);

// "did you mean 'WORD'?" for the label that is nearest to `word`, or nothing.
Hint HintForLabel(CheckRun& run, const std::string& word);

}  // namespace SecPolicyCli
