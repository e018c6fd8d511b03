#pragma once

#include <ostream>

#include "decision.h"
#include "installed/installed_policy.h"
#include "json.h"
#include "question.h"

namespace SecPolicyCli {

// Writes for people whether the domain may do what is asked, and why: first the answer, then the
// rules behind it, and of a file its label.
void WriteAnswer(const Question& question, const InstalledDomain& domain, const Decision& decision,
                 std::ostream& output);

// One line for a domain that may: its name, and the first rule behind it.
void WriteAnswerLine(const InstalledDomain& domain, const Decision& decision, std::ostream& output);

// The same for programs; see docs/json.md.
Json QuestionToJson(const Question& question);
Json AnswerToJson(const InstalledDomain& domain, const Decision& decision);

}  // namespace SecPolicyCli
