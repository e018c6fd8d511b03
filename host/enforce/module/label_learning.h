#pragma once

#include <vector>

#include "host/enforce/module/module.h"
#include "host/enforce/module/module_maps.h"

namespace Enforce {

// What Module::LearnLabels() does, for these maps.
std::vector<UnlabelledMount> LearnLabels(const ModuleMaps& maps);

}  // namespace Enforce
