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

// A line for each rule: its fate, its place, the rule and how it differs.
std::string FateText(const Enforce::RuleFate& fate);

// A line for what cannot be refused although no rule is about it.
std::string GapText(const std::string& gap);

Json FatesToJson(const std::vector<Enforce::RuleFate>& fates);

}  // namespace SecPolicyCli
