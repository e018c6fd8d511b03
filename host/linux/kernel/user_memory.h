#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

// The caller's memory as a kernel sees it: an address may be anything, and a bad one is an error
// (HostError with EFAULT), not a crash.
namespace LinuxHost {

// Copies `size` bytes from the caller's `address` to `to`.
void ReadUser(std::uint64_t address, void* to, std::size_t size);

// Copies `size` bytes from `from` to the caller's `address`.
void WriteUser(std::uint64_t address, const void* from, std::size_t size);

// ReadUser and then WriteUser, in one step of the kernel.
void ReadAndWriteUser(std::uint64_t source, void* to, std::size_t size, std::uint64_t target,
                      const void* from, std::size_t sizeBack);

// The text at the caller's `address`, without its NUL. Throws with ENAMETOOLONG when it is longer
// than `maxLength` bytes.
std::string ReadUserText(std::uint64_t address, std::size_t maxLength);

}  // namespace LinuxHost
