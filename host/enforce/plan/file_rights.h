#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

#include "host/enforce/plan/landlock.h"
#include "policy/permissions.h"
#include "policy/rule.h"

// Which rights of Landlock the words of rules about files are.
namespace Enforce {

using Rights = std::uint64_t;

// These change which entries a directory has, so they also concern what is there already.
inline constexpr Rights kEntryRights =
    Landlock::kRemoveFile | Landlock::kRemoveDir | Landlock::kRefer;

struct AccessRow {
  const char* word;  // of rules about labels
  Policy::Permission permission;
  Rights rights;
};

inline constexpr std::array<AccessRow, 6> kAccesses = {{
    {"read", Policy::Permission::kRead, Landlock::kReadFile},
    {"write", Policy::Permission::kWrite, Landlock::kWriteFile | Landlock::kIoctlDev},
    {"execute", Policy::Permission::kExecute, Landlock::kExecute},
    {"list", Policy::Permission::kRead, Landlock::kReadDir},
    {"remove", Policy::Permission::kWrite, kEntryRights},
    {"truncate", Policy::Permission::kWrite, Landlock::kTruncate},
}};

struct CreationRow {
  Policy::RuleKind kind;
  const char* word;
  Rights rights;
  bool byPath;  // writing to a directory makes them
};

inline constexpr std::array<CreationRow, 9> kCreations = {{
    {Policy::RuleKind::kFileCreation, "regular", Landlock::kMakeReg, true},
    {Policy::RuleKind::kFileCreation, "directory", Landlock::kMakeDir, true},
    {Policy::RuleKind::kFileCreation, "symlink", Landlock::kMakeSym, true},
    {Policy::RuleKind::kFileCreation, "fifo", Landlock::kMakeFifo, true},
    {Policy::RuleKind::kFileCreation, "char_device", Landlock::kMakeChar, false},
    {Policy::RuleKind::kFileCreation, "block_device", Landlock::kMakeBlock, false},
    {Policy::RuleKind::kUnixSocketCreation, "stream", Landlock::kMakeSock, true},
    {Policy::RuleKind::kUnixSocketCreation, "dgram", Landlock::kMakeSock, true},
    {Policy::RuleKind::kUnixSocketCreation, "seqpacket", Landlock::kMakeSock, true},
}};

// From here on they are unix sockets.
inline constexpr std::size_t kFirstSocketKind = 6;

// True for a row about what the rule creates.
bool IsAbout(const CreationRow& row, const Policy::Rule& rule);

// The rights that a rule grants by itself; none when it is not about files.
Rights RightsOf(const Policy::Rule& rule);

}  // namespace Enforce
