#pragma once

#include "host/enforce/launcher/program.h"

namespace Enforce {

// Asks the broker of the domain that this process is confined to for the program, in the domain
// that its label leads to, and ends as that does. Signals that ask this process to end are handed
// on to it. Refuses (refuse.h) where there is no broker or it refuses.
[[noreturn]] void AskBroker(const Program& program);

}  // namespace Enforce
