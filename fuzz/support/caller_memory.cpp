#include "support/caller_memory.h"

#include <sys/mman.h>

#include <algorithm>
#include <cstring>

#include "support/require.h"

namespace SecPolicyFuzz {
namespace {

constexpr std::size_t kPage = 4096;
constexpr std::size_t kRoom = 4 * kPage;
constexpr unsigned char kUntouched = 0xa5;

}  // namespace

CallerMemory::CallerMemory() {
  for (Region& region : regions) {
    void* start =
        mmap(nullptr, kRoom + kPage, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    Require(start != MAP_FAILED, "there is memory for a caller");
    region.start = static_cast<unsigned char*>(start);
    std::memset(region.start, kUntouched, kRoom);
    mprotect(region.start + kRoom, kPage, PROT_NONE);
  }
}

CallerMemory::~CallerMemory() {
  for (const Region& region : regions) munmap(region.start, kRoom + kPage);
}

CallerMemory::Region& CallerMemory::NextRegion() { return regions[next++ % kRegions]; }

std::uint64_t CallerMemory::Place(std::string_view bytes) {
  Region& region = NextRegion();
  region.used = std::min(bytes.size(), kRoom);
  unsigned char* piece = region.start + kRoom - region.used;
  std::memcpy(piece, bytes.data(), region.used);
  return reinterpret_cast<std::uint64_t>(piece);
}

std::uint64_t CallerMemory::PlaceConstant(std::string_view bytes) {
  const std::uint64_t address = Place(bytes);
  mprotect(regions[(next - 1) % kRegions].start, kRoom, PROT_READ);
  return address;
}

std::uint64_t CallerMemory::Nowhere() const {
  return reinterpret_cast<std::uint64_t>(regions[0].start + kRoom);
}

void CallerMemory::Clear() {
  for (Region& region : regions) {
    const unsigned char* end = region.start + kRoom - region.used;
    const bool intact = std::all_of(static_cast<const unsigned char*>(region.start), end,
                                    [](unsigned char byte) { return byte == kUntouched; });
    Require(intact, "nothing in front of a caller's piece of memory is written");
    mprotect(region.start, kRoom, PROT_READ | PROT_WRITE);
    std::memset(region.start + kRoom - region.used, kUntouched, region.used);
    region.used = 0;
  }
  next = 0;
}

}  // namespace SecPolicyFuzz
