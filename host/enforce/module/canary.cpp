#include "host/enforce/module/canary.h"

#include <fcntl.h>
#include <linux/capability.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "braxo/lib/exception.h"
#include "braxo/misc/strcat.h"
#include "host/enforce/supervise/file_descriptor.h"

using Braxo::Lib::BraxoException;
using Braxo::Misc::StrCat;

namespace Enforce {
namespace {

constexpr int kRefused = 1;
constexpr int kAllowed = 0;
constexpr int kUnknown = 2;

[[noreturn]] void ThrowErrno() {
  throw BraxoException(StrCat("whether the module refuses cannot be tried: ", strerror(errno)));
}

// What it gives up is its own alone. The end of `start` is the word to begin.
int UseCapability(int start) {
  char word = 0;
  if (read(start, &word, 1) != 1) return kUnknown;
  if (prctl(PR_CAPBSET_DROP, CAP_WAKE_ALARM, 0, 0, 0) == 0) return kAllowed;
  return errno == EPERM ? kRefused : kUnknown;
}

// Ends a child that waits for its word, by the end of the pipe that it would come from, and returns
// what it told.
int Await(pid_t child) {
  int status = 0;
  while (waitpid(child, &status, 0) < 0) {
    if (errno != EINTR) return kUnknown;
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : kUnknown;
}

}  // namespace

bool IsRefused(const std::function<void(pid_t)>& place) {
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) ThrowErrno();
  FileDescriptor output(ends[0]);
  FileDescriptor input(ends[1]);
  const pid_t child = fork();
  if (child < 0) ThrowErrno();
  if (child == 0) {
    close(ends[1]);
    _exit(UseCapability(ends[0]));
  }
  try {
    place(child);
  } catch (const BraxoException&) {
    input = FileDescriptor();
    Await(child);
    throw;
  }
  const bool isTold = write(input.Number(), "", 1) == 1;
  input = FileDescriptor();
  const int result = Await(child);
  if (!isTold || result == kUnknown)
    throw BraxoException("whether the module refuses cannot be tried: a process for it has failed");
  return result == kRefused;
}

}  // namespace Enforce
