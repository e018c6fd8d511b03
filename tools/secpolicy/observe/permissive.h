#pragma once

#include <string>

#include "enforce/entry.h"
#include "policy/installed_policy.h"
#include "secpolicy/secpolicy.h"
#include "verb.h"

namespace SecPolicyCli {

// Runs the program of the entry for the verb `verb` as RunWatched does, refuses nothing, and tells
// once of everything that the rules of its domain, `domain`, would refuse, here and in the log of
// the host.
ExitCode RunPermissive(const std::string& verb, const Entry& entry,
                       const Policy::InstalledDomain& domain,
                       SecPolicy::TeskAccessInterfaceImpl& access);

}  // namespace SecPolicyCli
