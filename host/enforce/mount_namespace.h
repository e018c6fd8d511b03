#pragma once

namespace Enforce {

// Moves this process into a mount namespace of its own, of which nothing gets out; within a user
// namespace where it may not change mounts otherwise, in which it has the same user and group.
// Returns nothing, or what failed, for people; errno says why.
const char* EnterMountNamespace();

}  // namespace Enforce
