#include "host/enforce/launcher/plan_source.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>

#include "host/enforce/launcher/number.h"
#include "host/enforce/launcher/refuse.h"
#include "host/enforce/plan_file.h"

namespace Enforce {
namespace {

int Open(const std::string& source) {
  const std::optional<int> descriptor = ReadNumber(source);
  if (descriptor) return *descriptor;
  // Without waiting for the other end, should it be a fifo.
  const int opened = open(source.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
  if (opened < 0) RefuseForErrno("cannot open the plan " + source);
  return opened;
}

// Whoever may change a plan has all that its domain is kept from.
void RequireOwnFile(int plan, const std::string& source) {
  struct stat status = {};
  if (fstat(plan, &status) != 0) RefuseForErrno("cannot open the plan " + source);
  if (!S_ISREG(status.st_mode)) Refuse("the plan " + source + " is no regular file");
  if (status.st_uid != 0 && status.st_uid != geteuid()) {
    Refuse("the plan " + source + " belongs to user " + std::to_string(status.st_uid) +
           "; only root's plans and your own count");
  }
  if ((status.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
    Refuse("the plan " + source +
           " can be changed by others; only its owner may write it (chmod go-w)");
  }
}

// From the beginning on, wherever the descriptor stands. At most one byte too many.
std::string ReadBytes(int plan, const std::string& source) {
  std::string bytes;
  char block[1 << 16];
  while (bytes.size() <= kMostPlanBytes) {
    const ssize_t size = pread(plan, block, sizeof(block), static_cast<off_t>(bytes.size()));
    if (size == 0) break;
    if (size < 0 && errno == EINTR) continue;
    if (size < 0) RefuseForErrno("cannot read the plan " + source);
    bytes.append(block, static_cast<std::size_t>(size));
  }
  return bytes;
}

}  // namespace

Plan ReadPlan(const std::string& source) {
  const int file = Open(source);
  RequireOwnFile(file, source);
  const std::string bytes = ReadBytes(file, source);
  close(file);
  Plan plan;
  const char* whyNot = nullptr;
  if (Parse(bytes, &plan, &whyNot)) return plan;
  Refuse("the plan " + source + " cannot be used: " + whyNot + ". 'secpolicy run' makes a new one");
}

}  // namespace Enforce
