#pragma once

#include <cstddef>
#include <queue>
#include <string>

#include "secpolicy/observed/policy_observer.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {

// A line of a domain's policy while its words are taken, without the keyword. It notes what is
// looked at, so that it is known what a failure was about.
class RuleLine {
 public:
  // `name`, `args` and `host` are only borrowed.
  RuleLine(unsigned int line, const std::string& name, unsigned int id,
           std::queue<std::string>& args, TeskAccessInterfaceImpl& host)
      : number(line), domainName(name), domainId(id), words(args), access(host) {}

  // Throws the failure of a line with the wrong number of words unless so many are left.
  void RequireCount(std::size_t least, std::size_t most);
  void RequireCount(std::size_t count) { RequireCount(count, count); }

  std::size_t Left() const { return words.size(); }

  // Takes the next word.
  std::string Take();

  // Takes the last word, "grant" or "revoke"; throws for any other.
  bool TakeGrant();

  // Asks the host for the domain that the word just taken names. Throws when there is none.
  unsigned int FindDomain(const std::string& domain);

  // Asks the host for `text`, the word `word` of the line. Throws what the host throws for one that
  // is not in its table.
  void Validate(const std::string& text, std::size_t word,
                TeskCtl::Security::TeskAccess_KeywordType table);

  // Throws the parse error that names the domain and the line.
  [[noreturn]] void Refuse(const std::string& reason) const;

  const unsigned int number;
  const std::string& domainName;
  const unsigned int domainId;

 private:
  void Note(Fault fault, std::size_t word);

  std::queue<std::string>& words;
  TeskAccessInterfaceImpl& access;
  std::size_t taken = 0;
  Fault notedFault = Fault::kArgumentCount;
  std::size_t notedWord = Problem::kWholeLine;
};

}  // namespace SecPolicy
