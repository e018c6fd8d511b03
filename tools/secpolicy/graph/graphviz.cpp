#include "graphviz.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <stdexcept>

#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/write_all.h"

namespace SecPolicyCli {
namespace {

using LinuxHost::Descriptor;
using LinuxHost::ThrowErrno;

constexpr int kNotFound = 127;  // as a shell says it
constexpr int kNoFile = -1;

int systemRoot = kNoFile;

// Leaves `text` to be read from the start in `file`.
void Fill(const Descriptor& file, const std::string& text) {
  if (!LinuxHost::WriteAll(file.Number(), text) || lseek(file.Number(), 0, SEEK_SET) != 0) {
    ThrowErrno("cannot keep the graph in memory");
  }
}

// Going back takes the rights that entering took; without another root there is nothing to do.
bool ReturnToSystemRoot() {
  struct stat now {};
  struct stat kept {};
  if (systemRoot == kNoFile) return true;
  if (stat("/", &now) != 0 || fstat(systemRoot, &kept) != 0) return false;
  if (now.st_dev == kept.st_dev && now.st_ino == kept.st_ino) return true;
  return fchdir(systemRoot) == 0 && chroot(".") == 0;
}

// The child: becomes Graphviz, or says that there is none.
[[noreturn]] void BecomeGraphviz(const Descriptor& input) {
  if (dup2(input.Number(), STDIN_FILENO) == STDIN_FILENO && ReturnToSystemRoot()) {
    execlp("dot", "dot", "-Tsvg", static_cast<char*>(nullptr));
  }
  _exit(kNotFound);
}

int WaitFor(pid_t child) {
  int status = 0;
  while (waitpid(child, &status, 0) < 0) {
    if (errno != EINTR) ThrowErrno("cannot wait for Graphviz");
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : kNoFile;
}

}  // namespace

void KeepSystemRoot() { systemRoot = open("/", O_PATH | O_DIRECTORY | O_CLOEXEC); }

void DrawSvg(const std::string& dot) {
  const Descriptor input(memfd_create("graph.dot", MFD_CLOEXEC));
  Fill(input, dot);
  const pid_t child = fork();
  if (child < 0) ThrowErrno("cannot start Graphviz");
  if (child == 0) BecomeGraphviz(input);
  const int status = WaitFor(child);
  if (status == 0) return;
  throw std::runtime_error(
      status == kNotFound
          ? "Graphviz, which draws the picture, is not installed: apt-get install graphviz. "
            "'secpolicy graph' without --format svg needs no Graphviz"
          : "Graphviz could not draw the picture");
}

}  // namespace SecPolicyCli
