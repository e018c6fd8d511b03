#include "support/caller_memory.h"

#include <sys/mman.h>

#include <cstring>

#include "support/require.h"

namespace SecPolicyFuzz {
namespace {

constexpr std::size_t kPage = 4096;
constexpr std::size_t kRoom = 4 * kPage;
constexpr unsigned char kUntouched = 0xa5;

// A piece ends where its region's room does.
unsigned char* PieceOf(unsigned char* start, std::size_t size) { return start + kRoom - size; }

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
  region.placed = bytes.substr(0, kRoom);
  unsigned char* piece = PieceOf(region.start, region.placed.size());
  std::memcpy(piece, region.placed.data(), region.placed.size());
  return reinterpret_cast<std::uint64_t>(piece);
}

std::uint64_t CallerMemory::PlaceConstant(std::string_view bytes) {
  const std::uint64_t address = Place(bytes);
  Region& region = regions[(next - 1) % kRegions];
  mprotect(region.start, kRoom, PROT_READ);
  region.writable = false;
  return address;
}

std::uint64_t CallerMemory::Nowhere() const {
  return reinterpret_cast<std::uint64_t>(regions[0].start + kRoom);
}

const CallerMemory::Region* CallerMemory::Find(std::uint64_t address) const {
  for (const Region& region : regions) {
    if (region.placed.empty()) continue;
    if (reinterpret_cast<std::uint64_t>(PieceOf(region.start, region.placed.size())) == address) {
      return &region;
    }
  }
  return nullptr;
}

std::size_t CallerMemory::Written(std::uint64_t address) const {
  const Region* region = Find(address);
  if (region == nullptr) return 0;
  const unsigned char* piece = PieceOf(region->start, region->placed.size());
  for (std::size_t size = region->placed.size(); size > 0; --size) {
    if (piece[size - 1] != static_cast<unsigned char>(region->placed[size - 1])) return size;
  }
  return 0;
}

std::size_t CallerMemory::RoomAt(std::uint64_t address) const {
  const Region* region = Find(address);
  return region == nullptr || !region->writable ? 0 : region->placed.size();
}

void CallerMemory::Clear() {
  static const std::string untouched(kRoom, static_cast<char>(kUntouched));
  for (Region& region : regions) {
    const bool intact =
        std::memcmp(region.start, untouched.data(), kRoom - region.placed.size()) == 0;
    Require(intact, "nothing in front of a caller's piece of memory is written");
    if (region.placed.empty()) continue;
    mprotect(region.start, kRoom, PROT_READ | PROT_WRITE);
    std::memset(PieceOf(region.start, region.placed.size()), kUntouched, region.placed.size());
    region.placed.clear();
    region.writable = true;
  }
  next = 0;
}

}  // namespace SecPolicyFuzz
