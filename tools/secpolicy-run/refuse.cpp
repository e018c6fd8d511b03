#include "host/enforce/launcher/refuse.h"

#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "host/enforce/kernel.h"
#include "text/visible.h"

namespace Enforce {
namespace {

constexpr char kPrefix[] = "secpolicy-run: ";

}  // namespace

void Refuse(const std::string& message, int exitStatus) {
  const std::string line = kPrefix + SecPolicyCli::Visible(message) + "\n";
  // Who cannot read it still has the exit status.
  [[maybe_unused]] const ssize_t written = write(STDERR_FILENO, line.data(), line.size());
  _exit(exitStatus);
}

void RefuseForErrno(const std::string& message) {
  const int error = errno;
  Refuse(message + ": " + std::strerror(error));
}

std::string PrepareRefusal(const std::string& message) {
  constexpr std::size_t kLongestError = 100;
  std::string prepared = kPrefix + SecPolicyCli::Visible(message) + ": ";
  prepared.reserve(prepared.size() + kLongestError);
  return prepared;
}

void RefuseForErrno(std::string prepared, std::uint64_t secret) {
  prepared.append(std::strerror(errno)).append("\n");
  Kernel::Tell(prepared.data(), prepared.size(), secret);
  Kernel::End(kRefused, secret);
  _exit(kRefused);
}

}  // namespace Enforce
