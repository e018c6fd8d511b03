#pragma once

#include <optional>
#include <string>

#include "policy/decision.h"
#include "program_file.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {

// The question whether the program may be executed, with the label of that very file.
Policy::FileQuestion AskToExecute(const ProgramFile& program,
                                  SecPolicy::TeskAccessInterfaceImpl& access);

// Throws Braxo::Lib::BraxoException with the line that is missing where the domain may not do what
// is asked; `role` says behind the path what the file is for.
void RequireAllowed(const Policy::FileQuestion& asked, const Policy::InstalledDomain& domain,
                    SecPolicy::TeskAccessInterfaceImpl& access, const std::string& role = "");

// The other domain that a program with this label leads to from `domain`; nothing where it stays.
std::optional<std::string> DomainBehind(const std::string& label,
                                        const Policy::InstalledDomain& domain);

// As RequireAllowed() for all that the kernel executes to start what `path` leads to: the program,
// the interpreters of scripts, and the loader, none of which may lead to another domain. What
// cannot be opened or is no program is for who starts it to tell.
void RequireExecutable(const std::string& path, const Policy::InstalledDomain& domain,
                       SecPolicy::TeskAccessInterfaceImpl& access);

}  // namespace SecPolicyCli
