#pragma once

#include "host/enforce/plan/plan.h"
#include "host/enforce/supervise/file_descriptor.h"

namespace SecPolicyCli {

// Starts the broker for those who run by the plan, where it keeps one: it enters domains as this
// process does. Returns the descriptor to ask it by; none where there is no broker. Throws
// Braxo::Lib::BraxoException.
Enforce::FileDescriptor KeepBroker(const Enforce::Plan& plan);

}  // namespace SecPolicyCli
