#pragma once

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
  std::string how;  // what differs, for people; empty when nothing does
};

// "enforced", "narrowed" or "notExpressible".
const char* TextOf(Fate fate);

}  // namespace Enforce
