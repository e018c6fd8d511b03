#include "host/enforce/broker/seen_file.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <climits>

#include "host/enforce/kernel.h"

namespace Enforce {
namespace {

std::string PathOf(int file, int procDirectory) {
  const std::string link = "thread-self/fd/" + std::to_string(file);
  std::string path(PATH_MAX, '\0');
  const ssize_t size = readlinkat(procDirectory, link.c_str(), path.data(), path.size());
  path.resize(static_cast<std::size_t>(std::max<ssize_t>(size, 0)));
  return path;
}

FileDescriptor Open(const std::string& path, int flags) {
  return FileDescriptor(Kernel::OpenWithoutLinks(path.c_str(), flags));
}

bool IsSame(const FileDescriptor& seen, int received) {
  struct stat one = {};
  struct stat other = {};
  return fstat(seen.Number(), &one) == 0 && fstat(received, &other) == 0 &&
         one.st_dev == other.st_dev && one.st_ino == other.st_ino;
}

}  // namespace

SeenFile SeeAgain(int received, int procDirectory, int flags) {
  SeenFile seen = {.file = {}, .path = PathOf(received, procDirectory)};
  // To open what has been put in its place could do something.
  if (!IsSame(Open(seen.path, O_PATH), received)) return seen;
  seen.file = Open(seen.path, flags);
  if (!IsSame(seen.file, received)) seen.file = {};
  return seen;
}

}  // namespace Enforce
