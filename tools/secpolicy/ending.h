#pragma once

#include <functional>
#include <string>

#include "verb.h"

namespace SecPolicyCli {

// Ends a verb, or a part of it, with a line "secpolicy: VERB: TEXT" on standard error, after what
// went to standard output.
void Summarize(const std::string& verb, const std::string& text);

class ErrorList;

// Makes the call `call` for the verb `verb`, which is no load, and ends it with one summary line on
// standard error. An error that is added to `errors` counts as a failure even when the call returns
// normally; what cannot be understood is thrown on. `advice` is asked after a failure for what the
// user can do about it; it may return nothing. `ending` is asked after a success for what the
// summary says; without it, that is "done".
ExitCode CallLibrary(const std::string& verb, const std::function<void(ErrorList& errors)>& call,
                     const std::function<std::string()>& advice,
                     const std::function<std::string()>& ending = {});

// Prints the summary line of a verb that was not done.
ExitCode Refuse(const std::string& verb, const std::string& why);

// What is said of a root that was not booted.
std::string WhyWithoutState();

// Refuses what needs an installed state where there is none.
ExitCode RefuseWithoutState(const std::string& verb);

}  // namespace SecPolicyCli
