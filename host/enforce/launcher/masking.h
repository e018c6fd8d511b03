#pragma once

#include <vector>

#include "host/enforce/plan/plan.h"

namespace Enforce {

// Moves the process into a mount namespace of its own in which the masks lie over their places;
// what is started there cannot take them away. Without a right to mount, that is within a user
// namespace. Nothing happens without masks. Refuses (refuse.h) when a mask cannot be applied.
void ApplyMasks(const std::vector<Mask>& masks);

}  // namespace Enforce
