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

// A domain in 64 bits, which change at once: its level in the lowest ones, then whether any of its
// rules is about a path, and in the upper half in which of its two entries its rules are.
enum { kLevelMask = 0xff, kDomainHasPaths = 1 << 8, kEntryShift = 32, kEntriesOfDomain = 2 };

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
  kCheckSignal,
  kModuleChecks
};

// Another check, whose value is a mask.
enum { kCheckFlags = 64 };

enum { kMostModuleRanges = 32, kSmallValues = 64 };

enum { kBytesOfEvents = 1 << 20 };

// What follows an event that is about a file: its path, which ends in a zero.
enum { kBytesOfShortPath = 256, kBytesOfPath = 4096 };

enum { kMostSignals = 64 };

// System calls, as bits by their numbers. What is beyond is granted to nobody.
enum { kMostCalls = 512, kCallsInWord = 64, kWordsOfCalls = kMostCalls / kCallsInWord };

// Whose numbers they are.
enum { kCallsOfMachine, kCallsOf32Bits, kCallTables };

// Both ends included.
struct ModuleRange {
  __u32 first;
  __u32 last;
};

// The values that pass, in their order. The last range is there as often as there is room.
struct ModuleCheck {
  __u64 small;  // of those below kSmallValues the same as bits, which is found sooner
  struct ModuleRange ranges[kMostModuleRanges];
  __u32 count;
};

struct ModuleRules {
  __u64 capabilities;  // those that are granted, by Linux's numbers as bits
  struct ModuleCheck checks[kModuleChecks];
  __u64 cloneFlags;    // those that pass
  __u64 ownedSignals;  // those that a descriptor may send to its owner, 1 as the lowest bit
  __u64 calls[kCallTables][kWordsOfCalls];
  __u32 hasPaths;  // whether any rule is about a path
};

// Labels that are none of a policy: that of a file nobody can tell, and that of one that surely has
// none.
enum { kLabelUnknown, kLabelNone };

// Beside the label of a file: its disk does not have it yet.
enum { kLabelIsUnwritten = 1U << 31 };

enum {
  kMostLabelledFiles = 1 << 20,
  kMostFileSystems = 1 << 12,
  kMostKnownDirectories = 1 << 16,
  kMostTardiskFiles = 1 << 18,
};

// A file, for as long as there is one: the number of its inode is used again, with another
// generation.
struct ModuleFile {
  __u64 inode;
  __u32 device;
  __u32 generation;
};

enum { kMostLabelRules = 1 << 18, kMostPathRules = 1 << 18 };

// Kinds of files that rules give a new label to, from kMakeShift on.
enum { kLabelledKinds = 6 };

struct ModuleLabelKey {
  __u32 entry;
  __u32 label;
};

// What rules say of the files with a label, and of directories with it. What is refused counts.
struct ModuleLabelRules {
  __u32 granted;
  __u32 refused;
  __u32 newLabels[kLabelledKinds];  // 0: that of the directory
  __u32 next;                       // the domain that programs lead to, one higher; 0: none
  __u32 nextOfTardisk;              // the same of what came from tardisks with the label
};

// The hash of a path, which nobody can tell beforehand.
struct ModulePathKey {
  __u64 hash;
  __u64 entry;
};

// What rules say of a path, as bits.
enum {
  kPathExecute = 1 << 0,
  kPathWrite = 1 << 1,
  kPathRead = 1 << 2,
  kPathHasRule = 1 << 3,
  kPathIsAboveRule = 1 << 4,  // some rule is about what is beneath
};

// By which paths are hashed: the multiplier is odd, and the other one its inverse.
struct ModuleHashing {
  __u64 basis;
  __u64 multiplier;
  __u64 inverse;
  __u64 epoch;  // grows whenever what is known of files may be no longer so
};

// The label that the file gets which a thread is about to make.
struct ModuleMaking {
  __u64 entry;
  __u64 name;
  __u32 label;  // 0: none of its own
};

// What was found out about a directory: its label, and above it the epoch that it is of. Labels
// with numbers beyond are looked for each time.
enum { kEpochShift = 24 };

struct ModuleTask {
  __u32 domain;
  __u32 next;  // that it is about to enter, one higher; 0: none
};

struct ModuleEntering {
  __u32 next;  // the domain of the next program that the process executes, one higher; 0: as ever
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
  kActCall,           // detail: whose numbers; value: the number of the system call
  kActEnter,          // value: the domain; the label and the path are the program's
  kActPassPorts,      // detail: the type of a socket whose ports nobody sees; value: its family
  kActReachSocket,    // a unix socket without a path that was named in another domain
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

// What rules grant: the uses of a file that is there, and above them what may be made in a
// directory.
enum {
  kAllUses = (1 << 6) - 1,
  kMakeShift = 6,
  kMayMakeRegular = 1 << (kMakeShift + kMakeRegular),
  kMayMakeDirectory = 1 << (kMakeShift + kMakeDirectory),
  kMayMakeLink = 1 << (kMakeShift + kMakeSymlink),
  kMayMakeFifo = 1 << (kMakeShift + kMakeFifo),
  kMayMakeCharacterDevice = 1 << (kMakeShift + kMakeCharDevice),
  kMayMakeBlockDevice = 1 << (kMakeShift + kMakeBlockDevice),
  kSocketShift = kMakeShift + kMakeBlockDevice + 1,
  kMayMakeStream = 1 << (kSocketShift + kSocketStream),
  kMayMakeDatagram = 1 << (kSocketShift + kSocketDatagram),
  kMayMakeSequence = 1 << (kSocketShift + kSocketSeqpacket),
  kMayMakeDevice = kMayMakeCharacterDevice | kMayMakeBlockDevice,
  kMayMakeSocket = kMayMakeStream | kMayMakeDatagram | kMayMakeSequence,
};

// What permission for a path grants, and what is refused without it.
enum {
  kRightsToRead = kUseRead | kUseList,
  kRightsToExecute = kUseExecute,
  kRightsToWrite = kUseWrite | kUseRemove | kUseTruncate | kMayMakeRegular | kMayMakeDirectory |
                   kMayMakeLink | kMayMakeFifo | kMayMakeSocket,
};

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
