#include "graphviz.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <stdexcept>
#include <system_error>

namespace SecPolicyCli {
namespace {

constexpr int kNotFound = 127;  // as a shell says it
constexpr int kNoFile = -1;

int systemRoot = kNoFile;

// A descriptor that is closed at the end of its life.
class File {
 public:
  explicit File(int opened) : descriptor(opened) {}
  File(const File&) = delete;
  File& operator=(const File&) = delete;
  ~File() { close(descriptor); }

  int Descriptor() const { return descriptor; }

 private:
  int descriptor;
};

[[noreturn]] void RaiseSystemError(const char* what) {
  throw std::system_error(errno, std::generic_category(), what);
}

// Leaves `text` to be read from the start in `file`.
void Fill(const File& file, const std::string& text) {
  std::size_t written = 0;
  while (written < text.size()) {
    const ssize_t count = write(file.Descriptor(), text.data() + written, text.size() - written);
    if (count < 0) RaiseSystemError("cannot keep the graph in memory");
    written += static_cast<std::size_t>(count);
  }
  if (lseek(file.Descriptor(), 0, SEEK_SET) != 0) {
    RaiseSystemError("cannot keep the graph in memory");
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
[[noreturn]] void BecomeGraphviz(const File& input) {
  if (dup2(input.Descriptor(), STDIN_FILENO) == STDIN_FILENO && ReturnToSystemRoot()) {
    execlp("dot", "dot", "-Tsvg", static_cast<char*>(nullptr));
  }
  _exit(kNotFound);
}

int WaitFor(pid_t child) {
  int status = 0;
  while (waitpid(child, &status, 0) < 0) {
    if (errno != EINTR) RaiseSystemError("cannot wait for Graphviz");
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : kNoFile;
}

}  // namespace

void KeepSystemRoot() { systemRoot = open("/", O_PATH | O_DIRECTORY | O_CLOEXEC); }

void DrawSvg(const std::string& dot) {
  const File input(memfd_create("graph.dot", MFD_CLOEXEC));
  Fill(input, dot);
  const pid_t child = fork();
  if (child < 0) RaiseSystemError("cannot start Graphviz");
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
