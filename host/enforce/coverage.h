#pragma once

#include <cstddef>
#include <span>
#include <string>
#include <vector>

#include "policy/rule.h"

// What becomes of the rules of a domain where they are enforced.
namespace Enforce {

enum class Fate {
  kEnforced,
  kNarrowed,        // the domain may do less than the rule says
  kNotExpressible,  // the domain could do more than its rules say, or never what the rule is for
};

struct RuleFate {
  Policy::Rule rule;
  Fate fate = Fate::kEnforced;
  std::string how = {};   // what differs, for people; empty when nothing does
  std::size_t place = 0;  // of the rule among those of its domain
};

// Where the rule stands among the rules that it is one of.
std::size_t PlaceOf(const Policy::Rule& rule, std::span<const Policy::Rule> rules);

// Makes the fate narrowed, unless it is worse, for this reason besides.
void Narrow(RuleFate& fate, const std::string& reason);

// "enforced", "narrowed" or "notExpressible".
const char* TextOf(Fate fate);

// A line for people: "narrowed: FILE:LINE: RULE (how it differs)".
std::string LineOf(const RuleFate& fate);

// A line for people about what cannot be refused although no rule is about it.
std::string LineOfGap(const std::string& gap);

}  // namespace Enforce
