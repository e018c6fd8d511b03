#pragma once

#include <functional>
#include <memory>
#include <string>

#include "policy/rule_kind.h"
#include "query/named.h"
#include "verb.h"

// What the verbs of the runtime interface share.
namespace SecPolicyCli {

// Makes one call that changes what is installed, and ends `verb` with a summary. After a failure,
// `whyNot` is asked for its cause and what to do, of which it may know nothing.
ExitCode Change(
    const std::string& verb, const std::function<void()>& change,
    const std::function<std::string()>& whyNot = [] { return std::string(); });

// Adds the required argument DOMAIN, a name or a number, to `syntax`.
std::shared_ptr<const std::string> AddDomain(Syntax& syntax);

// True for "grant", false for "revoke". Throws QuestionError for any other word.
bool ReadGrant(const std::string& word);

// The number of a process. Throws QuestionError for a word that is none.
int ReadProcess(const std::string& word);

// A word of a table of the host, and the number by which the runtime interface knows it.
struct NumberedWord {
  std::string word;
  unsigned int number = 0;
};

// The word that `word` stands for. Throws QuestionError for one that is not in the table.
NumberedWord FindNumberedWord(Policy::WordKind kind, const std::string& word,
                              SecPolicy::TeskAccessInterfaceImpl& access);

}  // namespace SecPolicyCli
