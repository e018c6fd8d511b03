#include "replace_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <filesystem>

#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/write_all.h"

namespace SecPolicyCli {
namespace {

using LinuxHost::Descriptor;

constexpr char kCannotWrite[] = "cannot write ";

bool IsStandardOutput(const struct stat& file) {
  struct stat output = {};
  return fstat(STDOUT_FILENO, &output) == 0 && output.st_dev == file.st_dev &&
         output.st_ino == file.st_ino;
}

// By /dev/stdout one reaches files, too, which are then written where they are and go on.
bool WriteInto(const std::string& path, const struct stat& there, const std::string& text) {
  const Descriptor file(IsStandardOutput(there) ? dup(STDOUT_FILENO)
                                                : open(path.c_str(), O_WRONLY | O_CLOEXEC));
  return file.IsOpen() && LinuxHost::WriteAll(file.Number(), text);
}

void RequireDirectory(const std::string& path, const std::filesystem::path& directory) {
  if (path.empty()) throw Braxo::Lib::BraxoException("cannot write a file without a name");
  std::error_code error;
  if (directory.empty() || std::filesystem::exists(directory, error) || error) return;
  throw Braxo::Lib::BraxoException(kCannotWrite + path + ": there is no directory " +
                                   directory.native());
}

bool WriteBeside(const std::string& path, const std::string& text) {
  constexpr mode_t kForAll = 0644;
  const std::filesystem::path wanted = path;
  // Collectors pass over a name without their ending.
  std::string name = wanted.parent_path() / ("." + wanted.filename().string() + ".XXXXXX");
  const Descriptor file(mkostemp(name.data(), O_CLOEXEC));
  if (!file.IsOpen()) return false;
  if (LinuxHost::WriteAll(file.Number(), text) && fchmod(file.Number(), kForAll) == 0 &&
      rename(name.c_str(), path.c_str()) == 0) {
    return true;
  }
  const int error = errno;
  unlink(name.c_str());
  errno = error;
  return false;
}

}  // namespace

void ReplaceFile(const std::string& path, const std::string& text) {
  RequireDirectory(path, std::filesystem::path(path).parent_path());
  struct stat there = {};
  const bool isKept =
      stat(path.c_str(), &there) == 0 && (!S_ISREG(there.st_mode) || IsStandardOutput(there));
  const bool isWritten = isKept ? WriteInto(path, there, text) : WriteBeside(path, text);
  if (!isWritten) LinuxHost::ThrowErrno(kCannotWrite, path);
}

}  // namespace SecPolicyCli
