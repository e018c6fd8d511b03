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
enum {
  kCheckFamily,
  kCheckType,
  kCheckPrctl,
  kCheckIoctl,
  kCheckBindPort,
  kCheckConnectPort,
  kCheckUser,
  kCheckGroup,
  kModuleChecks
};

enum { kMostModuleRanges = 32 };

enum { kBytesOfEvents = 1 << 20 };

// What follows an event that is about a file: its path, which ends in a zero.
enum { kBytesOfShortPath = 256, kBytesOfPath = 4096 };

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

// What rules are about, and what no rule grants. Of files the event has the label, and the path
// where the hook knows it; of those that are made, the label of the directory and the path of the
// entry.
enum {
  kActUseCapability,  // value: its number
  kActPassValue,      // detail: the check; value: what was passed
  kActReachModule,    // of self-protection
  kActUseFile,        // detail: bits of kUse..., all that was asked for at once
  kActMakeFile,       // detail: kMake...
  kActMakeSocket,     // detail: kSocket..., of a unix socket that has a path
  kActCall,           // value: the number of the system call, of this machine's own architecture
  kActEnter,          // value: the domain; the label and the path are the program's
  kActPassPorts,      // detail: the type of a socket whose ports nobody sees; value: its family
  kModuleActs,
};

// Ways to use a file, as bits.
enum {
  kUseRead = 1 << 0,
  kUseWrite = 1 << 1,
  kUseExecute = 1 << 2,
  kUseList = 1 << 3,
  kUseRemove = 1 << 4,
  kUseTruncate = 1 << 5,
};

enum { kMakeRegular, kMakeDirectory, kMakeSymlink, kMakeFifo, kMakeCharDevice, kMakeBlockDevice };

enum { kSocketStream, kSocketDatagram, kSocketSeqpacket };

// Labels are numbered from 2 on.
enum { kNoModuleLabel };

// What was refused, or passed in a permissive domain where an enforcing one would have refused it.
struct ModuleEvent {
  __u64 time;     // in nanoseconds since the machine was started
  __u64 started;  // when the process was: who has its number and started then is the same
  __u64 value;    // by the act
  __u32 process;
  __u32 parent;
  __u32 user;
  __u32 domain;
  __u32 act;
  __u32 detail;  // by the act
  __u32 label;   // of the file
  __u32 isRefused;
  char program[16];
};

struct ModuleRefusals {
  __u64 refused;
  __u64 passed;  // which an enforcing domain would have refused
  __u64 untold;  // of both, those that there was no room for among the events
};

#ifdef __cplusplus
}  // namespace Enforce
#endif
