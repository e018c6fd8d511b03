#include "host/enforce/features.h"

#include <linux/seccomp.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>

#include "host/enforce/kernel.h"
#include "host/enforce/mount_namespace.h"

namespace Enforce {
namespace {

// True where this process may change mounts. What is no mount point has passed that check.
bool MayMount() {
  return mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0 || errno == EINVAL;
}

// True when a child process does it well.
template <class Action>
bool Succeeds(Action action) {
  const pid_t child = fork();
  if (child < 0) return false;
  if (child == 0) _exit(action() ? 0 : 1);
  int status = -1;
  while (waitpid(child, &status, 0) < 0) {
    if (errno != EINTR) return false;
  }
  return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

// With namespaces of these kinds: some systems give a user namespace that has no rights.
bool CanMount(int namespaces) {
  return Succeeds([namespaces] { return unshare(namespaces) == 0 && MayMount(); });
}

}  // namespace

Features ProbeFeatures() {
  Kernel::Capabilities capabilities;
  static_cast<void>(Kernel::GetCapabilities(&capabilities));
  return {Kernel::LandlockVersion(),
          Kernel::KnowsAnswer(SECCOMP_RET_ERRNO) && Kernel::KnowsAnswer(SECCOMP_RET_KILL_PROCESS),
          Kernel::KnowsAnswer(SECCOMP_RET_USER_NOTIF), capabilities.permitted,
          Kernel::LastCapability()};
}

Namespace ProbeMounts() {
  if (CanMount(CLONE_NEWNS)) return Namespace::kPrivileged;
  return CanMount(CLONE_NEWUSER | CLONE_NEWNS) ? Namespace::kUser : Namespace::kNone;
}

bool CanMask() {
  return Succeeds([] { return EnterMountNamespace() == nullptr; });
}

}  // namespace Enforce
