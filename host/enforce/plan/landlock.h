#pragma once

#include <cstdint>
#include <string>

// Rights to files by the numbers that Landlock has for them. The headers of a stable system are
// older than its kernel, so they stand here.
namespace Enforce {

namespace Landlock {

inline constexpr std::uint64_t kExecute = 1 << 0;
inline constexpr std::uint64_t kWriteFile = 1 << 1;
inline constexpr std::uint64_t kReadFile = 1 << 2;
inline constexpr std::uint64_t kReadDir = 1 << 3;
inline constexpr std::uint64_t kRemoveDir = 1 << 4;
inline constexpr std::uint64_t kRemoveFile = 1 << 5;
inline constexpr std::uint64_t kMakeChar = 1 << 6;
inline constexpr std::uint64_t kMakeDir = 1 << 7;
inline constexpr std::uint64_t kMakeReg = 1 << 8;
inline constexpr std::uint64_t kMakeSock = 1 << 9;
inline constexpr std::uint64_t kMakeFifo = 1 << 10;
inline constexpr std::uint64_t kMakeBlock = 1 << 11;
inline constexpr std::uint64_t kMakeSym = 1 << 12;
inline constexpr std::uint64_t kRefer = 1 << 13;
inline constexpr std::uint64_t kTruncate = 1 << 14;
inline constexpr std::uint64_t kIoctlDev = 1 << 15;

// Those that a file can have; the others are about directories.
inline constexpr std::uint64_t kOfFiles = kExecute | kWriteFile | kReadFile | kTruncate | kIoctlDev;

// All rights that this version of its interface knows.
constexpr std::uint64_t AllRights(int version) {
  std::uint64_t rights = version >= 1 ? kRefer - 1 : 0;
  if (version >= 2) rights |= kRefer;
  if (version >= 3) rights |= kTruncate;
  if (version >= 5) rights |= kIoctlDev;
  return rights;
}

}  // namespace Landlock

// Rights to a file, or to a directory and everything beneath it.
struct PathRight {
  std::string path;
  std::uint64_t rights = 0;
  // What is away when the domain is entered, or behind a link, or where its user does not get,
  // gives nothing then.
  bool mayBeMissing = false;

  bool operator==(const PathRight&) const = default;
};

}  // namespace Enforce
