#pragma once

#include <sys/stat.h>
#include <sys/types.h>

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "host/enforce/supervise/file_descriptor.h"

namespace Enforce {

// Where a path of a caller leads, in the supervisor's own root.
struct Place {
  std::string
      path;  // the real one; of what is not there, the real one of its directory and the name
  FileDescriptor file;  // O_PATH; none where nothing is there
  std::string base;     // a directory that is entered already, from which the path was looked for
  mode_t mode = 0;      // as of stat(2), where something is
  uid_t owner = 0;
  gid_t group = 0;

  bool Exists() const { return file.IsOpen(); }
  bool IsDirectory() const { return Exists() && S_ISDIR(mode); }
};

enum class LastLink { kFollowed, kKept };

// The numbers of a user or group, as the supervisor's user namespace has them.
struct Identity {
  std::uint32_t real = 0;
  std::uint32_t effective = 0;
  std::uint32_t saved = 0;
  std::uint32_t ofFiles = 0;  // as which files are used

  // True for those that can be taken on without a capability.
  bool Has(std::uint32_t number) const {
    return number == real || number == effective || number == saved;
  }
};

// As whom a thread acts.
struct Credentials {
  Identity user;
  Identity group;
  std::vector<gid_t> moreGroups;
  std::uint64_t capabilities = 0;  // in effect, a bit each; none in a user namespace of its own

  // True for a group as a member of which files are used.
  bool IsMember(gid_t number) const;
};

// A thread that waits in a system call, as its supervisor sees it. It lives on and may be killed
// meanwhile: what is told counts only when the call still waits afterwards.
class Caller {
 public:
  // `procDirectory` is the descriptor of a /proc in which `threadId` is the number of the thread;
  // it has to stay open.
  Caller(int procDirectory, pid_t threadId) : proc(procDirectory), thread(threadId) {}

  // Copies memory of the caller; false where it is not all there.
  bool Read(std::uint64_t address, void* destination, std::size_t size) const;

  // The text up to its zero byte; nothing when it is unreadable or longer than a path may be.
  std::optional<std::string> ReadText(std::uint64_t address) const;

  // What `path` means to the caller, relative to its descriptor `directory` (or AT_FDCWD) and
  // within its root. Nothing when not even the directory of the path is there.
  std::optional<Place> Resolve(int directory, const std::string& path, LastLink lastLink) const;

  // What the caller's descriptor `number` is open for; nothing when that has no path.
  std::optional<std::string> PathOf(int number) const;

  // Another descriptor for the same as the caller's descriptor `number`; none when that fails.
  FileDescriptor Share(int number) const;

  // A descriptor for reading what `place` is; none when that fails.
  FileDescriptor OpenForReading(const Place& place) const;

  // As whom it acts; nothing when it is gone.
  std::optional<Credentials> ActsAs() const;

  // Another thread, by its number for the supervisor.
  Caller Other(pid_t other) const { return {proc, other}; }

  // The process that the thread is of.
  pid_t Process() const;

  // The path of the program that it runs; empty when it cannot be told.
  std::string Program() const;

 private:
  std::string FileOf(const std::string& name) const;
  std::optional<std::string> ReadLink(const std::string& name) const;
  std::string ReadStatus() const;

  int proc;
  pid_t thread;
};

}  // namespace Enforce
