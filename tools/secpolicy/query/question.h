#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

#include "host/linux/operation/rule_origins.h"
#include "policy/decision.h"
#include "refusal.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {

// A kind of question. The words are those of the rule that answers it, in the same order.
struct QuestionForm {
  const char* action;
  const char* usage;
  std::vector<Policy::WordKind> words;
  Policy::RuleKind kind;           // of the rules that answer it
  Policy::FileAccess access = {};  // to a file
};

std::span<const QuestionForm> QuestionForms();

// What is known of the file that a question is about, or of the directory that one is to be made
// in.
struct FileFacts {
  bool exists = false;
  std::vector<std::string> paths;  // as it is written and, where that is another, as it resolves
  std::string label;               // empty when it has none
  bool labelIsBuiltIn = false;
  bool labelIsInherited = false;
  std::optional<LinuxHost::LabelOrigin> labelOrigin;  // empty when no policy file gave it
};

struct Question {
  const QuestionForm* form = nullptr;
  std::vector<std::string> words;
  Policy::Question asked;
  std::optional<FileFacts> file;  // of a question about one

  // "read /etc/ssh"
  std::string Text() const;
};

// Reads a question: the action and its words. Throws QuestionError for a word that nobody knows.
Question ReadQuestion(const std::vector<std::string>& words,
                      SecPolicy::TeskAccessInterfaceImpl& access);

// The words that can stand for a word of this kind in a question: those of the host's table, if
// there is one. The name of a domain is a label, too.
std::vector<std::string> KnownWords(Policy::WordKind kind,
                                    SecPolicy::TeskAccessInterfaceImpl& access);

// Throws QuestionError: there is no `noun` with the word `word`, but those in `known`.
[[noreturn]] void RefuseWord(const std::string& noun, const std::string& word,
                             const std::vector<std::string>& known);

// What there is at `path`, which has no slash at its end but for the root's.
FileFacts ExamineFile(const std::string& path, SecPolicy::TeskAccessInterfaceImpl& access);

// `path` without slashes at its end.
std::string WithoutTrailingSlashes(std::string path);

// The word of the host's table, or the domain, that `word` stands for: itself, but that domains and
// objects may be named by their numbers, and that capabilities may lack the prefix that policy
// files write, as they do in other tools. Throws QuestionError for a word that is not known.
std::string FindWord(Policy::WordKind kind, const std::string& word,
                     SecPolicy::TeskAccessInterfaceImpl& access);

// Throws QuestionError for a path that does not begin at the root.
void RequirePath(const std::string& path);

// Throws QuestionError: there is no domain `name`.
[[noreturn]] void RefuseDomain(const std::string& name, SecPolicy::TeskAccessInterfaceImpl& access);

}  // namespace SecPolicyCli
