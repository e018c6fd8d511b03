#pragma once

#include <string>
#include <vector>

#include "check_run.h"

// What a rule of each kind looks like, for hints and for who uses what; whether a line is right is
// the library's to say.
namespace SecPolicyCli {

// What a word of a rule stands for.
enum class WordKind {
  kLabel,
  kDomain,
  kObjectAccess,
  kCapability,
  kTransition,
  kFileKind,
  kParameterCheck,
  kSystemCall,
  kSocketKind,
  kFree,
};

struct RuleForm {
  const char* keyword;
  const char* usage;
  std::vector<WordKind> words;  // behind the keyword, without "grant" or "revoke"
};

// The form of the rules with this first word; null when there is none.
const RuleForm* FindRuleForm(const std::string& keyword);

// A hint for the word `index` of a line that the library refused with `code`; may be empty.
std::string HintForRule(CheckRun& run, const Code& code, const SourceFile::Words& words,
                        std::size_t index);

// "did you mean 'WORD'?" for the label that is nearest to `word`, or nothing.
std::string HintForLabel(CheckRun& run, const std::string& word);

// The word of a refused line that the message is about, counted from 0; `words.size()` when it is
// about the whole line.
std::size_t FindBlamedWord(const Code& code, const std::string& message,
                           const SourceFile::Words& words);

}  // namespace SecPolicyCli
