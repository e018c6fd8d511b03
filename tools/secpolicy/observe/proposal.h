#pragma once

#include <map>
#include <string>
#include <utility>
#include <vector>

#include "policy/decision.h"

namespace SecPolicyCli {

// What a program and all that it started has asked the rules, in the order of the first time.
class Observations {
 public:
  struct Observed {
    Policy::Question question;
    unsigned int count = 0;
    std::string program;  // that asked first
  };

  // True for what was not noted before. The question has the label of its file.
  bool Note(const Policy::Question& question, const std::string& program);

  // True for what was noted.
  bool Has(const Policy::Question& question) const;

  const std::vector<Observed>& All() const { return all; }

 private:
  std::vector<Observed> all;
  std::map<std::string, std::size_t> places;
};

// The lines of a policy file by which `domain` may do all that was observed, without what its rules
// grant already; a domain that is new has none. Behind each stands why it is proposed.
std::vector<std::string> Propose(const Observations& observations,
                                 const Policy::InstalledDomain& domain);

}  // namespace SecPolicyCli
