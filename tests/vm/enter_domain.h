#pragma once

#include <unistd.h>

#include <cstdlib>

#include "braxo/lib/exception.h"
#include "host/enforce/module/module.h"

namespace EnforceTest {

// Puts the current process into the domain with this number, which is in decimal. Throws
// Braxo::Lib::BraxoException where the module does not run, and as it does.
inline void EnterDomain(const char* number) {
  auto module = Enforce::Module::FindRunning();
  if (!module) throw Braxo::Lib::BraxoException("the module does not run");
  module->Place(getpid(), static_cast<unsigned int>(std::strtoul(number, nullptr, 10)));
}

}  // namespace EnforceTest
