#pragma once

#include <fcntl.h>
#include <linux/bpf.h>
#include <linux/capability.h>
#include <linux/filter.h>
#include <linux/openat2.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cstddef>
#include <cstdint>

// System calls that the C library has no function for, or whose headers are older than the kernel.
// They return what the kernel does, -1 with errno for a failure.
namespace Enforce::Kernel {

// ---- Landlock

struct RulesetAttributes {
  std::uint64_t handledFiles = 0;
  std::uint64_t handledPorts = 0;
  std::uint64_t scopes = 0;
};

inline constexpr std::uint64_t kBindPort = 1 << 0;
inline constexpr std::uint64_t kConnectPort = 1 << 1;

inline constexpr std::uint64_t kScopeAbstractSockets = 1 << 0;
inline constexpr std::uint64_t kScopeSignals = 1 << 1;

// The versions of the interface that these came with.
inline constexpr int kPortsVersion = 4;
inline constexpr int kScopesVersion = 6;

// 0 where the kernel has no Landlock or was started without it.
inline int LandlockVersion() {
  constexpr unsigned int kAskVersion = 1;
  const long version = syscall(SYS_landlock_create_ruleset, nullptr, 0, kAskVersion);
  return version < 0 ? 0 : static_cast<int>(version);
}

// A descriptor, closed on execution.
inline int CreateRuleset(const RulesetAttributes& attributes) {
  return static_cast<int>(syscall(SYS_landlock_create_ruleset, &attributes, sizeof(attributes), 0));
}

// `place` is the descriptor of a file or a directory.
inline int AddPath(int ruleset, int place, std::uint64_t rights) {
  struct {
    std::uint64_t rights;
    std::int32_t place;
  } __attribute__((packed)) const rule = {rights, place};
  constexpr int kPathBeneath = 1;
  return static_cast<int>(syscall(SYS_landlock_add_rule, ruleset, kPathBeneath, &rule, 0));
}

inline int AddPort(int ruleset, std::uint16_t port, std::uint64_t rights) {
  struct {
    std::uint64_t rights;
    std::uint64_t port;
  } const rule = {rights, port};
  constexpr int kNetPort = 2;
  return static_cast<int>(syscall(SYS_landlock_add_rule, ruleset, kNetPort, &rule, 0));
}

inline int RestrictSelf(int ruleset) {
  return static_cast<int>(syscall(SYS_landlock_restrict_self, ruleset, 0));
}

// ---- seccomp

// True when a filter may answer so (SECCOMP_RET_...).
inline bool KnowsAnswer(std::uint32_t answer) {
  return syscall(SYS_seccomp, SECCOMP_GET_ACTION_AVAIL, 0, &answer) == 0;
}

inline int SetFilter(sock_filter* instructions, std::size_t count) {
  const sock_fprog program = {static_cast<unsigned short>(count), instructions};
  return static_cast<int>(syscall(SYS_seccomp, SECCOMP_SET_MODE_FILTER, 0, &program));
}

// ---- The module

// Asks for this process, which has one thread, to be in the domain from the next program on that it
// executes. `map` is the descriptor of Module::EnteringMap().
inline int EnterWithNextProgram(int map, unsigned int domain) {
  const int process = static_cast<int>(syscall(SYS_pidfd_open, getpid(), 0));
  if (process < 0) return -1;
  const std::uint32_t next = domain + 1;
  bpf_attr change = {};
  change.map_fd = static_cast<std::uint32_t>(map);
  change.key = reinterpret_cast<std::uintptr_t>(&process);
  change.value = reinterpret_cast<std::uintptr_t>(&next);
  const long result = syscall(SYS_bpf, BPF_MAP_UPDATE_ELEM, &change, sizeof(change));
  close(process);
  return static_cast<int>(result);
}

// ---- Capabilities, by their numbers as bits

struct Capabilities {
  std::uint64_t effective = 0;
  std::uint64_t permitted = 0;
  std::uint64_t inheritable = 0;
};

inline bool HasCapability(std::uint64_t set, int number) { return (set >> number & 1) != 0; }

inline int GetCapabilities(Capabilities* capabilities) {
  __user_cap_header_struct header = {_LINUX_CAPABILITY_VERSION_3, 0};
  __user_cap_data_struct halves[_LINUX_CAPABILITY_U32S_3] = {};
  if (syscall(SYS_capget, &header, halves) != 0) return -1;
  const auto join = [](std::uint32_t lower, std::uint32_t upper) {
    return static_cast<std::uint64_t>(upper) << 32 | lower;
  };
  *capabilities = {join(halves[0].effective, halves[1].effective),
                   join(halves[0].permitted, halves[1].permitted),
                   join(halves[0].inheritable, halves[1].inheritable)};
  return 0;
}

inline int SetCapabilities(const Capabilities& capabilities) {
  __user_cap_header_struct header = {_LINUX_CAPABILITY_VERSION_3, 0};
  __user_cap_data_struct halves[_LINUX_CAPABILITY_U32S_3] = {};
  for (int half = 0; half < _LINUX_CAPABILITY_U32S_3; ++half) {
    halves[half] = {static_cast<std::uint32_t>(capabilities.effective >> 32 * half),
                    static_cast<std::uint32_t>(capabilities.permitted >> 32 * half),
                    static_cast<std::uint32_t>(capabilities.inheritable >> 32 * half)};
  }
  return static_cast<int>(syscall(SYS_capset, &header, halves));
}

// The highest number of a capability that the kernel knows.
inline int LastCapability() {
  int number = 0;
  while (prctl(PR_CAPBSET_READ, number + 1, 0, 0, 0) >= 0) ++number;
  return number;
}

// ---- Files and programs

// Refuses a path of which any part is a link. `flags` are those of open(2); the descriptor is
// closed on execution.
inline int OpenWithoutLinks(const char* path, int flags) {
  open_how how = {};
  how.flags = static_cast<std::uint64_t>(flags | O_CLOEXEC);
  how.resolve = RESOLVE_NO_SYMLINKS;
  return static_cast<int>(syscall(SYS_openat2, AT_FDCWD, path, &how, sizeof(how)));
}

// A descriptor that stands for the place and can do nothing with it.
inline int OpenPlace(const char* path) { return OpenWithoutLinks(path, O_PATH); }

// No way of opening a file waits, and no terminal becomes this process's.
inline constexpr int kForReading = O_RDONLY | O_NONBLOCK | O_NOCTTY;

// execve and execveat with `secret` where a filter looks for it. They return only when they fail.
inline int Execute(const char* path, char* const* arguments, char* const* environment,
                   std::uint64_t secret) {
  return static_cast<int>(syscall(SYS_execve, path, arguments, environment, 0, 0, secret));
}

inline int ExecuteDescriptor(int program, char* const* arguments, char* const* environment,
                             std::uint64_t secret) {
  return static_cast<int>(
      syscall(SYS_execveat, program, "", arguments, environment, AT_EMPTY_PATH, secret));
}

// write to standard error, and exit_group, likewise.
inline void Tell(const char* text, std::size_t size, std::uint64_t secret) {
  syscall(SYS_write, STDERR_FILENO, text, size, 0, 0, secret);
}

inline void End(int exitStatus, std::uint64_t secret) {
  syscall(SYS_exit_group, exitStatus, 0, 0, 0, 0, secret);
}

}  // namespace Enforce::Kernel
