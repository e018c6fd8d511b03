#pragma once

#include <unistd.h>

#include <utility>

namespace LinuxHost {

// Owns a file descriptor.
class Descriptor {
 public:
  // Takes what open(2) and its like returned; a negative number is nobody's.
  explicit Descriptor(int opened) : number(opened) {}
  Descriptor(Descriptor&& other) noexcept : number(std::exchange(other.number, -1)) {}
  Descriptor& operator=(Descriptor&& other) noexcept {
    std::swap(number, other.number);
    return *this;
  }
  Descriptor(const Descriptor&) = delete;
  Descriptor& operator=(const Descriptor&) = delete;
  ~Descriptor() {
    if (number >= 0) close(number);
  }

  bool IsOpen() const { return number >= 0; }
  int Number() const { return number; }

 private:
  int number;
};

}  // namespace LinuxHost
