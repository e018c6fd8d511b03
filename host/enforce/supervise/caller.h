#pragma once

#include <sys/stat.h>
#include <sys/types.h>

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>

#include "host/enforce/supervise/file_descriptor.h"

namespace Enforce {

// Where a path of a caller leads, in the supervisor's own root.
struct Place {
  std::string
      path;  // the real one; of what is not there, the real one of its directory and the name
  FileDescriptor file;  // O_PATH; none where nothing is there
  mode_t mode = 0;      // as of stat(2), where something is

  bool Exists() const { return file.IsOpen(); }
  bool IsDirectory() const { return Exists() && S_ISDIR(mode); }
};

enum class LastLink { kFollowed, kKept };

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

  // True when its effective user is root.
  bool IsRoot() const;

  // The path of the program that it runs; empty when it cannot be told.
  std::string Program() const;

 private:
  std::string FileOf(const std::string& name) const;
  std::optional<std::string> ReadLink(const std::string& name) const;
  pid_t Process() const;

  int proc;
  pid_t thread;
};

}  // namespace Enforce
