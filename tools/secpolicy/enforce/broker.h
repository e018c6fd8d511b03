#pragma once

#include "host/enforce/compile.h"
#include "host/enforce/supervise/file_descriptor.h"

namespace SecPolicyCli {

// Starts the broker for those who run by the plan, where it takes one: in an enforcing domain from
// which another is entered by exec, and that may ask. Returns the descriptor to ask it by; none
// where there is no broker. Throws Braxo::Lib::BraxoException.
Enforce::FileDescriptor KeepBroker(const Enforce::CompiledPlan& compiled);

}  // namespace SecPolicyCli
