#include "host/enforce/coverage.h"

#include <algorithm>

#include "braxo/misc/strcat.h"

using Braxo::Misc::StrCat;

namespace Enforce {

std::size_t PlaceOf(const Policy::Rule& rule, std::span<const Policy::Rule> rules) {
  return static_cast<std::size_t>(&rule - rules.data());
}

void Narrow(RuleFate& fate, const std::string& reason) {
  fate.fate = std::max(fate.fate, Fate::kNarrowed);
  fate.how += (fate.how.empty() ? "" : "; ") + reason;
}

const char* TextOf(Fate fate) {
  switch (fate) {
    case Fate::kEnforced:
      return "enforced";
    case Fate::kNarrowed:
      return "narrowed";
    case Fate::kNotExpressible:
      break;
  }
  return "notExpressible";
}

std::string LineOf(const RuleFate& fate) {
  const Policy::Origin& origin = fate.rule.origin;
  const std::string place = origin.file.empty() ? "" : StrCat(origin.file, ":", origin.line, ": ");
  const std::string how = fate.how.empty() ? "" : StrCat(" (", fate.how, ")");
  return StrCat(TextOf(fate.fate), ": ", place, fate.rule.Text(), how);
}

std::string LineOfGap(const std::string& gap) {
  return StrCat(TextOf(Fate::kNotExpressible), ": files and calls beyond the rules (", gap, ")");
}

}  // namespace Enforce
