#pragma once

#include <vector>

#include "json.h"
#include "policy/decision.h"
#include "question.h"

namespace SecPolicyCli {

// A domain that may; of a policy that has to outlive it.
struct Found {
  const Policy::InstalledDomain& domain;
  Policy::Decision decision;
};

// All domains of the policy that may do what is asked, in its order.
std::vector<Found> FindDomains(const Question& question, const Policy::InstalledPolicy& policy);

// For programs; see docs/json.md.
Json WhoCanToJson(const Question& question, const std::vector<Found>& found);

}  // namespace SecPolicyCli
