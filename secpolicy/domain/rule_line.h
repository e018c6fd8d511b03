#pragma once

#include <cstddef>
#include <queue>
#include <string>
#include <utility>

#include "secpolicy/observed/policy_observer.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {

// A line of a domain's policy while its words are taken, without the keyword. Whoever reads it
// notes in its problem what is looked at, so that it is known what a failure was about.
class RuleLine {
 public:
  // `domainName` and `problem` are only borrowed.
  RuleLine(unsigned int line, const std::string& domainName, unsigned int domainId,
           std::queue<std::string> words, Problem& problem);

  // Throws the failure of a line with the wrong number of words unless so many are left.
  void RequireCount(std::size_t least, std::size_t most) const;
  void RequireCount(std::size_t count) const { RequireCount(count, count); }

  std::size_t Left() const { return words.size(); }

  // Takes the next word.
  std::string Take();

  // Takes all words that are left.
  std::queue<std::string> TakeAll() { return std::exchange(words, {}); }

  // Takes the last word, "grant" or "revoke"; throws for any other.
  bool TakeGrant();

  // Asks the host for the domain that the word just taken names. Throws when there is none.
  unsigned int FindDomain(const std::string& name, TeskAccessInterfaceImpl& access) const;

  // Asks the host for `text`, the word `word` of the line. Throws what the host throws for one that
  // is not in its table.
  void Validate(const std::string& text, std::size_t word,
                TeskCtl::Security::TeskAccess_KeywordType table,
                TeskAccessInterfaceImpl& access) const;

  // Throws the parse error that names the domain and the line.
  [[noreturn]] void Refuse(const std::string& reason) const;

  const unsigned int line;
  const std::string& domainName;
  const unsigned int domainId;

 private:
  void Note(Fault fault, std::size_t word) const;

  std::queue<std::string> words;
  std::size_t taken = 0;
  Problem& problem;
};

}  // namespace SecPolicy
