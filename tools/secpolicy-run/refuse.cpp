#include "host/enforce/launcher/refuse.h"

#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "text/visible.h"

namespace Enforce {

void Refuse(const std::string& message, int exitStatus) {
  const std::string line = "secpolicy-run: " + SecPolicyCli::Visible(message) + "\n";
  // Who cannot read it still has the exit status.
  [[maybe_unused]] const ssize_t written = write(STDERR_FILENO, line.data(), line.size());
  _exit(exitStatus);
}

void RefuseForErrno(const std::string& message) {
  const int error = errno;
  Refuse(message + ": " + std::strerror(error));
}

}  // namespace Enforce
