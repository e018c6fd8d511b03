#pragma once

#include <cstddef>

#include "host/enforce/module/module_maps.h"

namespace Enforce {

// What Module::WriteLabels() does, for these maps.
std::size_t WriteLabels(const ModuleMaps& maps);

}  // namespace Enforce
