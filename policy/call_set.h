#pragma once

#include <span>
#include <string_view>

// Sets of system calls, each a word of its own: "-s @file grant" speaks of every member. What
// reaches past the other rules of a domain (ptrace, mount, bpf, ...) is in no set.
namespace Policy {

struct CallSet {
  const char* name;                           // "@file"
  const char* purpose;                        // what its calls do, for people
  std::span<const std::string_view> members;  // in ascending order

  bool Has(std::string_view call) const;
};

// Every set, in ascending order of their names.
std::span<const CallSet> CallSets();

// The set with this name; null when there is none.
const CallSet* FindCallSet(std::string_view name);

// True when a rule with the word `word` speaks of the system call `call`: its own name, or a set
// that it is in.
bool SpeaksOfCall(std::string_view word, std::string_view call);

}  // namespace Policy
