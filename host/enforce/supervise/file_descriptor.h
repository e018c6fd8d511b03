#pragma once

#include <unistd.h>

#include <utility>

namespace Enforce {

// Owns a file descriptor; a negative number is none.
class FileDescriptor {
 public:
  FileDescriptor() = default;
  explicit FileDescriptor(long opened) : number(static_cast<int>(opened)) {}
  FileDescriptor(FileDescriptor&& other) noexcept : number(std::exchange(other.number, -1)) {}
  FileDescriptor& operator=(FileDescriptor&& other) noexcept {
    std::swap(number, other.number);
    return *this;
  }
  FileDescriptor(const FileDescriptor&) = delete;
  FileDescriptor& operator=(const FileDescriptor&) = delete;
  ~FileDescriptor() {
    if (number >= 0) close(number);
  }

  bool IsOpen() const { return number >= 0; }
  int Number() const { return number; }

  // The number, whose owner is the caller from now on.
  int Release() { return std::exchange(number, -1); }

 private:
  int number = -1;
};

}  // namespace Enforce
