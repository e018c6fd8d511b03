#pragma once

#include <string>

#include "host/enforce/compile.h"
#include "json.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {

// The plan of an installed domain on this kernel, from the label index. Throws QuestionError when
// there is no such domain, and what the host throws.
Enforce::CompiledPlan PlanOf(const std::string& domain, SecPolicy::TeskAccessInterfaceImpl& access);

// The same plan, for people.
std::string ExplanationOf(const std::string& domain, SecPolicy::TeskAccessInterfaceImpl& access);

Json FatesToJson(const std::vector<Enforce::RuleFate>& fates);

}  // namespace SecPolicyCli
