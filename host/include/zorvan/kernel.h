#pragma once

#include <sys/types.h>

#include <cstddef>
#include <cstdint>
#include <initializer_list>

/// What the host kernel offers beyond POSIX. Nothing here throws.
namespace Zorvan::Kernel {

/// The two results of a numbered kernel call.
struct CallResult {
  std::uint32_t status;  ///< 0 means success
  std::int32_t error;    ///< 0 or a negative error number
};

/// Makes the kernel call `number` with `args`: pointers travel as addresses, signed values
/// sign-extended. Leaves errno as it was.
__attribute__((visibility("default"))) CallResult Call(std::uint32_t number,
                                                       std::initializer_list<std::uint64_t> args);

/// As setxattr(2), errno included, for the attribute "zorvan.security".
__attribute__((visibility("default"))) int SetXattr(const char* path, const char* name,
                                                    const void* value, std::size_t size, int flags);

/// As getxattr(2), errno included, for the attribute "zorvan.security".
__attribute__((visibility("default"))) ssize_t GetXattr(const char* path, const char* name,
                                                        void* value, std::size_t size);

/// Writes the real path of `path`, NUL-terminated, to `resolved`, which holds 1984 bytes.
/// Returns 0 on success; a path that cannot be resolved, or whose real path does not fit, fails.
__attribute__((visibility("default"))) int RealPath(const char* path, char* resolved);

}  // namespace Zorvan::Kernel
