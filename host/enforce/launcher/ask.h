#pragma once

#include "host/enforce/launcher/program.h"

namespace Enforce {

// Asks the broker of the domain that this process is confined to for the program, in the domain
// that its label leads to, and ends as that does. Signals that ask this process to end are handed
// on to it. Refuses (refuse.h) where there is no broker or it refuses.
[[noreturn]] void AskBroker(const Program& program);

// True where the module keeps the domain of this process, and so needs no broker.
bool IsKernelAsked();

// Becomes the program, which the kernel starts in the domain that its label leads to. Refuses when
// it does not.
[[noreturn]] void AskKernel(const Program& program);

}  // namespace Enforce
