#include "host/enforce/coverage.h"

namespace Enforce {

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

}  // namespace Enforce
