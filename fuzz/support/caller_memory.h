#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
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

  // How many bytes from the start of the piece at `address` were written to, up to the last one
  // that differs now; 0 for an address of no piece.
  std::size_t Written(std::uint64_t address) const;
  // The size of the writable piece at `address`; 0 for an address of no such piece.
  std::size_t RoomAt(std::uint64_t address) const;

  // Makes room again; ends the process when anything in front of a piece has changed.
  void Clear();

 private:
  struct Region {
    unsigned char* start = nullptr;
    std::string placed;
    bool writable = true;
  };
  static constexpr std::size_t kRegions = 8;

  Region& NextRegion();
  const Region* Find(std::uint64_t address) const;

  Region regions[kRegions];
  std::size_t next = 0;
};

}  // namespace SecPolicyFuzz
