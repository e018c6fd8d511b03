#pragma once

#include <vector>

#include "host/enforce/plan/plan.h"

namespace Enforce {

// Moves the process into a mount namespace of its own in which the masks lie over their places;
// what is started there cannot take them away. Without a right to mount, that is within a user
// namespace. Nothing happens without masks. Refuses (refuse.h) when a mask cannot be applied, and
// when one of the descriptors that the program is to have is a directory.
void ApplyMasks(const std::vector<Mask>& masks, const std::vector<int>& descriptors);

}  // namespace Enforce
