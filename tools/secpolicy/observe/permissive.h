#pragma once

#include <string>
#include <vector>

#include "host/linux/common/descriptor.h"
#include "secpolicy/secpolicy.h"
#include "verb.h"

namespace SecPolicyCli {

// Runs `command` for the verb `verb` as RunWatched does, refuses nothing, and tells once of
// everything that the rules of the domain with the name `name` would refuse, here and in the log of
// the host. Where `program` is open, that is what is started.
ExitCode RunPermissive(const std::string& verb, const std::string& name,
                       const std::vector<std::string>& command,
                       const LinuxHost::Descriptor& program,
                       SecPolicy::TeskAccessInterfaceImpl& access);

}  // namespace SecPolicyCli
