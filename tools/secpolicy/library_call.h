#pragma once

#include <functional>
#include <string>

#include "verb.h"

namespace SecPolicyCli {

// Makes the library call `call` for the verb `verb` and ends it with one summary line on standard
// error. An error that the library reports counts as a failure even when the call returns normally.
// `advice` is asked after a failure for what the user can do about it; it may return nothing.
// `ending` is asked after a success for what the summary says; without it, that is "done".
//
// After a load that did not end well, the summary is preceded by the files that failed and by what
// is installed; a call with an empty `policyDir` is no load.
//
// When the library ends the process because a well-known domain is missing under `policyDir`, the
// summary says so and the process exits with kStopped.
ExitCode CallLibrary(const std::string& verb, const std::string& policyDir,
                     const std::function<void()>& call, const std::function<std::string()>& advice,
                     const std::function<std::string()>& ending = {});

// Tells the running call that its errors so far are those of the early policy.
void EndEarlyLoad();

// Prints the summary line of a verb that was not done.
ExitCode Refuse(const std::string& verb, const std::string& why);

// Refuses what needs an installed state where there is none.
ExitCode RefuseWithoutState(const std::string& verb);

}  // namespace SecPolicyCli
