#pragma once

#include "host/linux/state/domain.h"
#include "host/linux/state/store.h"

// What goes along with a domain or a label that goes. Within the transaction of its table; failures
// are HostErrors.
namespace LinuxHost {

// Removes the domain, all that is of it, the transitions into it, and the rules that name it.
void RemoveWithRules(Store& store, const Domain& domain);

// Removes the rules that name a label or a domain that is gone.
void RemoveUnnamedRules(Store& store);

}  // namespace LinuxHost
