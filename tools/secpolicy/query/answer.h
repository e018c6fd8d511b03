#pragma once

#include <ostream>

#include "json.h"
#include "policy/decision.h"
#include "question.h"

namespace SecPolicyCli {

// Writes for people whether the domain may do what is asked, and why: first the answer, then the
// rules behind it, and of a file its label.
void WriteAnswer(const Question& question, const Policy::InstalledDomain& domain,
                 const Policy::Decision& decision, std::ostream& output);

// One line for a domain that may: its name, and the first rule behind it.
void WriteAnswerLine(const Policy::InstalledDomain& domain, const Policy::Decision& decision,
                     std::ostream& output);

// The policy file, as the policy names it, in which rules of the domain are written.
std::string PolicyFileOf(const Policy::InstalledDomain& domain);

// The rule behind its place, in the form that editors and grep know: "FILE:LINE: RULE".
std::string Cite(const Policy::Rule& rule);

// The same for programs; see docs/json.md.
Json QuestionToJson(const Question& question);
Json AnswerToJson(const Policy::InstalledDomain& domain, const Policy::Decision& decision);
Json WhyToJson(const Question& question, const Policy::InstalledDomain& domain,
               const Policy::Decision& decision);

}  // namespace SecPolicyCli
