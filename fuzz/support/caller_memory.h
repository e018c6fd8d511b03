#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

namespace SecPolicyFuzz {

// The memory of one program that calls the kernel: pieces that end where memory ends, so that a
// byte too much is a bad address.
class CallerMemory {
 public:
  CallerMemory();
  CallerMemory(const CallerMemory&) = delete;
  CallerMemory& operator=(const CallerMemory&) = delete;
  ~CallerMemory();

  // A piece that holds `bytes`, cut to what there is room for; for one call, with the others.
  std::uint64_t Place(std::string_view bytes);
  // The same, not writable.
  std::uint64_t PlaceConstant(std::string_view bytes);
  // An address at which nothing can be read or written.
  std::uint64_t Nowhere() const;

  // Makes room again; ends the process when anything in front of a piece has changed.
  void Clear();

 private:
  struct Region {
    unsigned char* start = nullptr;
    std::size_t used = 0;
  };
  static constexpr std::size_t kRegions = 8;

  Region& NextRegion();

  Region regions[kRegions];
  std::size_t next = 0;
};

}  // namespace SecPolicyFuzz
