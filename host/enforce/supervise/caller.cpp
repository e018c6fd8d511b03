#include "host/enforce/supervise/caller.h"

#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/syscall.h>
#include <sys/uio.h>

#include <algorithm>
#include <array>
#include <climits>
#include <cstdlib>
#include <sstream>
#include <string_view>

namespace Enforce {
namespace {

FileDescriptor OpenWithin(int root, const std::string& path, LastLink lastLink) {
  open_how how = {};
  how.flags = O_PATH | O_CLOEXEC;
  if (lastLink == LastLink::kKept) how.flags |= O_NOFOLLOW;
  how.resolve = RESOLVE_IN_ROOT;
  return FileDescriptor(syscall(SYS_openat2, root, path.c_str(), &how, sizeof how));
}

std::string Join(const std::string& directory, const std::string& name) {
  return (directory == "/" ? "" : directory) + "/" + name;
}

// The path as seen from `root`, below which it is.
std::string Within(const std::string& root, const std::string& path) {
  const bool isBelow = root != "/" && path.starts_with(root + "/");
  return isBelow ? path.substr(root.size()) : path;
}

std::string WithoutTrailingSlashes(std::string path) {
  while (path.size() > 1 && path.ends_with('/')) path.pop_back();
  return path;
}

// What stands behind a name of /proc/PID/status, up to the end of the line.
std::string FactOf(const std::string& status, const std::string& name) {
  const std::size_t line = ("\n" + status).find("\n" + name);
  if (line == std::string::npos) return "";
  const std::size_t place = line + name.size();
  return status.substr(place, status.find('\n', place) - place);
}

bool ReadIdentity(const std::string& text, Identity* identity) {
  std::istringstream numbers(text);
  numbers >> identity->real >> identity->effective >> identity->saved >> identity->ofFiles;
  return !numbers.fail();
}

}  // namespace

bool Credentials::IsMember(gid_t number) const {
  return number == group.ofFiles || std::ranges::count(moreGroups, number) > 0;
}

bool Caller::Read(std::uint64_t address, void* destination, std::size_t size) const {
  const iovec local = {destination, size};
  // NOLINTNEXTLINE(performance-no-int-to-ptr): an address of another process
  const iovec remote = {reinterpret_cast<void*>(address), size};
  return process_vm_readv(thread, &local, 1, &remote, 1, 0) == static_cast<ssize_t>(size);
}

std::optional<std::string> Caller::ReadText(std::uint64_t address) const {
  // A piece never reaches over the end of a page: the next one may not be there.
  std::array<char, 256> piece = {};
  std::string text;
  while (text.size() < PATH_MAX) {
    const std::size_t size = piece.size() - address % piece.size();
    if (!Read(address, piece.data(), size)) return std::nullopt;
    const std::string_view read(piece.data(), size);
    const std::size_t end = read.find('\0');
    text += read.substr(0, end);
    if (end != std::string_view::npos) return text;
    address += size;
  }
  return std::nullopt;
}

std::optional<Place> Caller::Resolve(int directory, const std::string& path,
                                     LastLink lastLink) const {
  const FileDescriptor root(openat(proc, FileOf("root").c_str(), O_PATH | O_CLOEXEC | O_DIRECTORY));
  if (!root.IsOpen() || path.empty()) return std::nullopt;
  std::string sought = path;
  std::string base = "/";
  if (!path.starts_with('/')) {
    const auto start = directory == AT_FDCWD ? ReadLink("cwd") : PathOf(directory);
    if (!start) return std::nullopt;
    base = *start;
    sought = Join(Within(ReadLink("root").value_or("/"), base), path);
  }
  const Caller self(proc, getpid());
  FileDescriptor file = OpenWithin(root.Number(), sought, lastLink);
  if (file.IsOpen()) {
    struct stat facts = {};
    const auto real = self.PathOf(file.Number());
    if (!real || fstat(file.Number(), &facts) != 0) return std::nullopt;
    return Place{.path = *real,
                 .file = std::move(file),
                 .base = base,
                 .mode = facts.st_mode,
                 .owner = facts.st_uid,
                 .group = facts.st_gid};
  }
  sought = WithoutTrailingSlashes(sought);
  const std::size_t slash = sought.rfind('/');
  const FileDescriptor above =
      OpenWithin(root.Number(), sought.substr(0, slash + 1), LastLink::kFollowed);
  const auto real = above.IsOpen() ? self.PathOf(above.Number()) : std::nullopt;
  if (!real) return std::nullopt;
  return Place{.path = Join(*real, sought.substr(slash + 1)), .file = {}, .base = base};
}

std::optional<std::string> Caller::PathOf(int number) const {
  auto path = ReadLink("fd/" + std::to_string(number));
  return path && path->starts_with('/') ? path : std::nullopt;
}

FileDescriptor Caller::Share(int number) const {
  const FileDescriptor process(syscall(SYS_pidfd_open, Process(), 0));
  return FileDescriptor(syscall(SYS_pidfd_getfd, process.Number(), number, 0));
}

FileDescriptor Caller::OpenForReading(const Place& place) const {
  const std::string name = "self/fd/" + std::to_string(place.file.Number());
  return FileDescriptor(openat(proc, name.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
}

std::optional<Credentials> Caller::ActsAs() const {
  const std::string status = ReadStatus();
  Credentials found;
  if (!ReadIdentity(FactOf(status, "Uid:"), &found.user)) return std::nullopt;
  if (!ReadIdentity(FactOf(status, "Gid:"), &found.group)) return std::nullopt;
  std::istringstream groups(FactOf(status, "Groups:"));
  for (gid_t group = 0; groups >> group;) found.moreGroups.push_back(group);
  constexpr int kHexadecimal = 16;
  const bool isHere = ReadLink("ns/user") == Other(getpid()).ReadLink("ns/user");
  if (isHere) {
    found.capabilities = std::strtoull(FactOf(status, "CapEff:").c_str(), nullptr, kHexadecimal);
  }
  return found;
}

std::string Caller::Program() const { return ReadLink("exe").value_or(""); }

std::string Caller::FileOf(const std::string& name) const {
  return std::to_string(thread) + "/" + name;
}

std::optional<std::string> Caller::ReadLink(const std::string& name) const {
  std::array<char, PATH_MAX> target = {};
  const ssize_t size = readlinkat(proc, FileOf(name).c_str(), target.data(), target.size());
  if (size < 0) return std::nullopt;
  return std::string(target.data(), static_cast<std::size_t>(size));
}

std::string Caller::ReadStatus() const {
  const FileDescriptor file(openat(proc, FileOf("status").c_str(), O_RDONLY | O_CLOEXEC));
  std::string text;
  std::array<char, 4096> piece = {};
  ssize_t size = 0;
  while (file.IsOpen() && (size = read(file.Number(), piece.data(), piece.size())) > 0) {
    text.append(piece.data(), static_cast<std::size_t>(size));
  }
  return text;
}

// The kernel takes descriptors from processes, and tells of threads.
pid_t Caller::Process() const {
  constexpr int kDecimal = 10;
  const std::string process = FactOf(ReadStatus(), "Tgid:");
  if (process.empty()) return thread;
  return static_cast<pid_t>(std::strtol(process.c_str(), nullptr, kDecimal));
}

}  // namespace Enforce
