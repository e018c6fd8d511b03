#pragma once

#include "host/enforce/launcher/program.h"
#include "host/enforce/plan/plan.h"

namespace Enforce {

// Refuses (refuse.h) a program that the plan lets do nothing but end by a signal before its own
// first line, so that somebody is told why. What merely may fail is for the program to tell.
void RequireStartable(const Plan& plan, const Program& program);

}  // namespace Enforce
