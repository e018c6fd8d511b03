#pragma once

#include <map>
#include <optional>
#include <string>

#include "host/linux/operation/change_mark.h"
#include "json.h"
#include "policy/installed_policy.h"
#include "refusals/gathering.h"
#include "refusals/refused_act.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyLog {

// A refusal, and what the rules say to it.
struct ExplainedRefusal {
  SecPolicyCli::RefusedAct refused = {};
  std::string reason = {};         // the rule behind it, or that there is none
  std::string file = {};           // where that rule is written, or is missing
  unsigned int line = 0;           // 0 where none is written
  SecPolicyCli::Json answer = {};  // of `why`; null where no question can be asked
};

// Says of numbers what they stand for, and of refusals which rule decided, by what is installed.
class Explainer {
 public:
  // Nothing for what was granted in another way. Where the state cannot be read, numbers stay
  // numbers.
  std::optional<ExplainedRefusal> Explain(const SecPolicyCli::GatheredRefusal& gathered);

  // The domain's name, or its number where it has gone.
  std::string NameOfDomain(unsigned int domain);

 private:
  // Forgets what is known when anything was installed since.
  void Renew();
  const Policy::InstalledDomain* FindDomain(unsigned int id);

  std::optional<LinuxHost::ChangeMark> mark;
  std::map<unsigned int, std::optional<Policy::InstalledDomain>> domains;
};

}  // namespace SecPolicyLog
