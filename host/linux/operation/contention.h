#pragma once

namespace LinuxHost {

// Waits before the next try of what another process has spoilt, for a while by chance that is
// longer after more `tries`, the first of which is 1: two that kept pace would spoil each other's
// for ever.
void LetOthersGoFirst(int tries);

}  // namespace LinuxHost
