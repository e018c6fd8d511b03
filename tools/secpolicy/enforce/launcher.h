#pragma once

#include <string>
#include <vector>

#include "enforce/entry.h"
#include "host/enforce/plan/plan.h"
#include "host/enforce/supervise/file_descriptor.h"

namespace SecPolicyCli {

// Opens the launcher, which lies outside of any root: to be called before one is entered. Without
// it, StartConfined() throws.
void OpenLauncher();

// Becomes the program of the entry, confined by `plan`; where a broker is kept, it is told to ask
// at this descriptor. Returns only by throwing Braxo::Lib::BraxoException.
[[noreturn]] void StartConfined(const Enforce::Plan& plan, const Entry& entry,
                                const Enforce::FileDescriptor& broker);

// The same in a domain that the module keeps: only system calls are filtered, where the plan has a
// level for that. `module` is the descriptor of its map for who enters.
[[noreturn]] void StartKept(const Enforce::Plan& plan, const Entry& entry, int module);

// True where this process is confined and has a broker to ask.
bool HasBroker();

// Becomes the launcher, which asks the broker to start `command`. Throws
// Braxo::Lib::BraxoException when it cannot be started.
[[noreturn]] void AskBroker(const std::vector<std::string>& command);

}  // namespace SecPolicyCli
