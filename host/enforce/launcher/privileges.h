#pragma once

#include <cstdint>

namespace Enforce {

// The capabilities that this process may have, as bits.
std::uint64_t OwnCapabilities();

// Gives up, for good, all capabilities but `kept`, which the next program has too, whoever its user
// is. Refuses (refuse.h) when the kernel does not let it. Who may not change the bounding set and
// the securebits keeps them, and gets nothing by them after no_new_privs.
void KeepCapabilities(std::uint64_t kept);

}  // namespace Enforce
