#pragma once

#include <linux/types.h>

#ifdef __cplusplus
namespace Enforce {
#endif

// What the maps of the kernel's programs hold: for these programs, which are C, and for who writes
// the maps.

enum {
  kModuleDomains = 512,
  // Of no policy: who is in it is refused everything, by which is seen that the programs run.
  kCanaryDomain = kModuleDomains,
  kDomainEntries,
};

// The levels of a domain. One that there is not refuses what an enforcing one without rules does.
enum { kLevelAbsent, kLevelEnforcing, kLevelPermissive, kLevelDisabled };

// A domain in 64 bits, which change at once: its level in the lower half, and in the upper one in
// which of its two entries its rules are.
enum { kEntryShift = 32, kEntriesOfDomain = 2 };

// The parameter checks that are kept.
enum { kCheckFamily, kCheckType, kCheckPrctl, kCheckIoctl, kModuleChecks };

enum { kMostModuleRanges = 32 };

enum { kBytesOfEvents = 1 << 18 };

// Both ends included.
struct ModuleRange {
  __u32 first;
  __u32 last;
};

// The values that pass.
struct ModuleCheck {
  __u32 count;
  struct ModuleRange ranges[kMostModuleRanges];
};

struct ModuleRules {
  __u64 capabilities;  // those that are granted, by Linux's numbers as bits
  struct ModuleCheck checks[kModuleChecks];
};

struct ModuleTask {
  __u32 domain;
};

// What rules are about, and what no rule grants.
enum {
  kActUseCapability,  // value: its number
  kActPassValue,      // detail: the check; value: what was passed
  kActReachModule,    // of self-protection
};

// What was refused, or passed in a permissive domain where an enforcing one would have refused it.
struct ModuleEvent {
  __u64 time;   // in nanoseconds since the machine was started
  __u64 value;  // by the act
  __u32 process;
  __u32 domain;
  __u32 act;
  __u32 detail;  // by the act
  __u32 isRefused;
  char program[16];
};

struct ModuleRefusals {
  __u64 refused;
  __u64 passed;  // which an enforcing domain would have refused
};

#ifdef __cplusplus
}  // namespace Enforce
#endif
