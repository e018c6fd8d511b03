#pragma once

#include <cstdint>

// What of this kernel, and of the rights of this process, can enforce a policy.
namespace Enforce {

struct Features {
  int landlock = 0;                // the version of its interface; 0 without it
  bool seccomp = false;            // with filters that are programs
  bool notifies = false;           // a filter can ask a supervisor
  std::uint64_t capabilities = 0;  // those that the process may have, by Linux's numbers as bits
  int lastCapability = 0;          // the highest number that the kernel knows
};

// Asks the kernel, and changes nothing.
Features ProbeFeatures();

// How a mount namespace of one's own can be had.
enum class Namespace {
  kNone,
  kPrivileged,  // by CAP_SYS_ADMIN
  kUser,        // within a user namespace
};

// Tries that out in child processes, for which it waits, and changes nothing for the caller.
Namespace ProbeMounts();

// True where this process could lay masks over files, for itself alone. Tries that out likewise.
bool CanMask();

}  // namespace Enforce
