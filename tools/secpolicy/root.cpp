#include "root.h"

#include <sched.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <optional>
#include <system_error>

#include "host/linux/common/host_error.h"
#include "text/shell_word.h"

namespace SecPolicyCli {
namespace {

namespace fs = std::filesystem;
using LinuxHost::ThrowErrno;

// As it was given; nothing while none was entered.
std::optional<std::string> enteredRoot;

std::vector<std::string> placesOfRoot;

// Whether another user has that directory; to be asked before a namespace hides who.
bool isRootOfOther = false;

void WriteProcFile(const char* path, const std::string& text) {
  std::ofstream file(path);
  file << text << std::flush;
  if (!file) ThrowErrno("cannot write ", path);
}

// Inside a namespace of its own every user may change the root. The user and the group keep their
// numbers, so files made below the root belong to who ran the command.
void EnterUserNamespace() {
  const std::string user = std::to_string(geteuid());
  const std::string group = std::to_string(getegid());
  if (unshare(CLONE_NEWUSER) != 0) {
    ThrowErrno("cannot enter a root without being root where user namespaces are forbidden");
  }
  WriteProcFile("/proc/self/setgroups", "deny");
  WriteProcFile("/proc/self/uid_map", user + " " + user + " 1");
  WriteProcFile("/proc/self/gid_map", group + " " + group + " 1");
}

bool MakeRoot() { return chroot(".") == 0 && chdir("/") == 0; }

}  // namespace

void EnterRoot(const std::string& directory) {
  std::error_code unknown;
  const std::string given = fs::absolute(directory, unknown).lexically_normal();
  if (chdir(directory.c_str()) != 0) ThrowErrno("cannot enter the root ", directory);
  placesOfRoot = {given, fs::current_path(unknown)};
  struct stat status {};
  isRootOfOther = stat(".", &status) == 0 && status.st_uid != geteuid();
  if (!MakeRoot()) {
    if (errno != EPERM) ThrowErrno("cannot enter the root ", directory);
    EnterUserNamespace();
    if (!MakeRoot()) ThrowErrno("cannot enter the root ", directory);
  }
  enteredRoot = directory;
}

std::string Call(const std::string& words) {
  const std::string root = enteredRoot ? "--root " + ShellWord(*enteredRoot) + " " : "";
  return "'secpolicy " + root + words + "'";
}

std::string OutsidePath(const std::string& path) {
  if (!enteredRoot) return path;
  return (*enteredRoot + "/").append(path, path.starts_with('/') ? 1 : 0);
}

std::string AdviseOnForeignRoot() {
  if (geteuid() == 0 || !isRootOfOther) return "";
  return "This root is another user's: run it as that user, or as root.";
}

std::string PathBelowRoot(const std::string& path) {
  if (!enteredRoot) return "";
  const fs::path root = (fs::path(*enteredRoot) / "").lexically_normal();
  const fs::path inside = fs::path(path).lexically_normal().lexically_relative(root);
  if (inside.empty() || *inside.begin() == "..") return "";
  std::error_code unknown;
  const fs::path found = "/" / inside;
  return fs::exists(found, unknown) && found != path ? found.string() : "";
}

const std::vector<std::string>& PlacesOfRoot() { return placesOfRoot; }

std::string AdviseOnPrivilege() {
  if (geteuid() == 0) return "";
  if (isRootOfOther) return AdviseOnForeignRoot();
  if (enteredRoot) return "";
  return "You are not root: run it as root, or give --root DIR to work below a directory of yours.";
}

std::string WithAdvice(const std::string& failure) {
  const std::string advice = AdviseOnPrivilege();
  return advice.empty() ? failure : failure + ". " + advice;
}

}  // namespace SecPolicyCli
