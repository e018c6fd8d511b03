#pragma once

#include "host/enforce/module/entry_point.h"

// The kernel's programs are told what is installed behind each commit to the state that they keep.
// The state is the truth: who is killed between the two has left a state by which the next commit,
// or "secpolicy module start", sees that they are behind. Failures are HostErrors, or what the
// module throws.
namespace LinuxHost {

// True while the state in use is the one that the module keeps, whether it runs or not.
bool IsStateOfModule();

// True while the running module was told all that is installed in that state.
bool IsPublishedTo(const Enforce::RunningModule& running);

// Makes the state in use the one that the module keeps, and tells the module all of it.
void BeginPublishing(Enforce::RunningModule& running);

// Ends that. Commits are told nobody from here on.
void EndPublishing();

// Tells the module what is installed, if this thread has committed anything since it was told and
// the state is the one that it keeps. While that lasts, nobody can commit.
void PublishCommitted();

// While one lives, what this thread commits is not told the module; the last of them tells it all
// at its end. What fails then is logged: the commit stays, and the module is behind.
class CommitFollower {
 public:
  CommitFollower() noexcept;
  CommitFollower(const CommitFollower&) = delete;
  CommitFollower& operator=(const CommitFollower&) = delete;
  ~CommitFollower();
};

// The same, for whoever calls PublishCommitted() itself.
class HeldPublication {
 public:
  HeldPublication() noexcept;
  HeldPublication(const HeldPublication&) = delete;
  HeldPublication& operator=(const HeldPublication&) = delete;
  ~HeldPublication();
};

}  // namespace LinuxHost
