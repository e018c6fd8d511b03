#pragma once

#include <string>

// Copies of the state that outlive it. Everything throws Braxo::Lib::BraxoException.
namespace LinuxHost {

// Copies the state at `from`, which is only read and may be in use, to the file `to` (mode 0600) in
// a directory of its own (0700), which is made if it is missing. The file is there whole, and to
// stay, or not at all, and holds a digest of its contents. Throws when there is such a file
// already, unless `replace` is set.
void SaveState(const std::string& from, const std::string& to, bool replace);

// Puts the domains, their roles, services and rules, the file policies, the labels, and the origins
// of rules back as they are in `copy`, in one step: whoever dies on the way leaves the old or the
// new. Worlds stay in the domains that they are in, by name, and keep their own file policies;
// labels that are still there keep their numbers, since files carry them, and those that are gone
// come back with new ones; where inodes came from stays.
//
// `copy` is a copy for this alone, made by CopyDatabase. Changes nothing and throws, with a reason
// that goes on a sentence about the copy, when it cannot be used, and when worlds run in a domain
// that it does not have.
void RestorePolicy(const std::string& copy);

}  // namespace LinuxHost
