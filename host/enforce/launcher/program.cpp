#include "host/enforce/launcher/program.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <string_view>

#include "host/enforce/interpreter.h"
#include "host/enforce/kernel.h"
#include "host/enforce/launcher/refuse.h"

namespace Enforce {
namespace {

constexpr char kUsualPath[] = "/bin:/usr/bin";
constexpr mode_t kExecutable = S_IXUSR | S_IXGRP | S_IXOTH;

// True for a program that only a mount keeps from being executed: a broker outside may start it.
bool IsMasked(const std::string& path, const struct stat& status) {
  struct statvfs mount = {};
  return (status.st_mode & kExecutable) != 0 && statvfs(path.c_str(), &mount) == 0 &&
         (mount.f_flag & ST_NOEXEC) != 0;
}

// 0 when the path leads to a program, else the system error that tells why not.
int ReasonAgainst(const std::string& path, Executed where) {
  struct stat status = {};
  if (stat(path.c_str(), &status) != 0) return errno;
  if (!S_ISREG(status.st_mode)) return EACCES;
  if (access(path.c_str(), X_OK) == 0) return 0;
  const int reason = errno;
  const bool mayBeMasked = where == Executed::kOutside && reason == EACCES;
  return mayBeMasked && IsMasked(path, status) ? 0 : reason;
}

// A part of PATH that is empty is the working directory.
std::string PathIn(std::string_view directory, const std::string& name) {
  return directory.empty() ? "./" + name : std::string(directory) + "/" + name;
}

struct Found {
  std::string path;
  int reason;  // 0, or why it is none
};

// In the first directory of PATH that has it. One that may not be executed is passed over.
Found SearchPath(const std::string& name, Executed where) {
  if (name.empty()) return {name, ENOENT};
  const char* const given = std::getenv("PATH");
  std::string_view unread = given == nullptr ? kUsualPath : given;
  Found refused = {name, ENOENT};
  while (true) {
    const std::size_t end = std::min(unread.find(':'), unread.size());
    const std::string path = PathIn(unread.substr(0, end), name);
    const int reasonHere = ReasonAgainst(path, where);
    if (reasonHere == 0) return {path, 0};
    if (reasonHere == EACCES) refused = {path, EACCES};
    if (end == unread.size()) return refused;
    unread.remove_prefix(end + 1);
  }
}

// True for a file that nobody may execute.
bool IsPlainFile(const std::string& path) {
  struct stat status = {};
  return stat(path.c_str(), &status) == 0 && S_ISREG(status.st_mode) &&
         (status.st_mode & kExecutable) == 0;
}

[[noreturn]] void RefuseProgram(const std::string& name, const Found& found) {
  const int reason = found.reason;
  if (reason == ENOENT || reason == ENOTDIR) Refuse("there is no program " + name, kNotFound);
  const bool isPlain = reason == EACCES && IsPlainFile(found.path);
  Refuse("cannot execute " + name + ": " +
         (isPlain ? "it is not executable; 'chmod +x' makes it so" : std::strerror(reason)));
}

}  // namespace

Program FindProgram(char* const* arguments, char* const* environment, Executed where) {
  const std::string name = arguments[0];
  const bool isPath = name.find('/') != std::string::npos;
  const Found found = isPath ? Found{name, ReasonAgainst(name, where)} : SearchPath(name, where);
  if (found.reason != 0) RefuseProgram(name, found);
  return {found.path, -1, arguments, environment};
}

Program ProgramOf(int descriptor, char* const* arguments, char* const* environment) {
  const int flags = IsScript(descriptor) ? 0 : FD_CLOEXEC;
  const std::string name = arguments[0];
  if (fcntl(descriptor, F_SETFD, flags) != 0) RefuseForErrno("cannot execute " + name);
  return {name, descriptor, arguments, environment};
}

void Start(const Program& program, std::uint64_t secret) {
  if (program.descriptor >= 0) {
    Kernel::ExecuteDescriptor(program.descriptor, program.arguments, program.environment, secret);
  } else {
    Kernel::Execute(program.path.c_str(), program.arguments, program.environment, secret);
  }
}

}  // namespace Enforce
