#pragma once

#include <string>
#include <vector>

#include "enforce/entry.h"
#include "host/enforce/broker/broker.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {

// The domain that this process enters by executing `command`, whose first word is a path or a name
// that is looked for in PATH, and the very program that this was judged by; of a script its real
// path. Throws Braxo::Lib::BraxoException when there is no such program, and when its own domain
// may not execute it.
Entry EntryByExec(std::vector<std::string> command, SecPolicy::TeskAccessInterfaceImpl& access);

struct DomainReference {
  unsigned int id = 0;
  std::string name;
};

// The entry that somebody in the domain `asker` has asked a broker for: into the domain that the
// label of the program leads to from there. What was asked counts for nothing that is judged but
// the program. Throws Braxo::Lib::BraxoException when that is not to be seen from here, or no -d
// rule leads from `asker` by it.
Entry EntryByBroker(const Enforce::AskedEntry& asked, const DomainReference& asker,
                    SecPolicy::TeskAccessInterfaceImpl& access);

}  // namespace SecPolicyCli
