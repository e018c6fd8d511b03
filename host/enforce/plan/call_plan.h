#pragma once

#include <linux/filter.h>

#include <map>
#include <optional>
#include <string_view>
#include <vector>

#include "host/enforce/coverage.h"
#include "host/enforce/plan/bpf_program.h"
#include "policy/installed_policy.h"

namespace Enforce {

// What the system calls of a domain are filtered by.
struct CallPlan {
  std::map<int, CallVerdict> verdicts;  // on every known call, by its number
  std::vector<sock_filter> program;     // the same for the kernel
  std::optional<SecretPlaces> secret;   // of the calls of the launcher that enters the domain
  bool mayEnd = false;                  // by exit or exit_group
  bool mayMap = false;                  // by mmap
  std::vector<RuleFate> fates;          // of the rules about calls and their arguments, in order
};

// What refuses to truncate the files of a domain.
enum class Truncation {
  kByLandlock,
  kByFilter,  // of all files, so only where nothing may be written
};

// The plan for a domain's rules about system calls (-s) and about their arguments (-p), except
// bind_port and connect_port: of these only what goes past a check of ports is closed. The level of
// the domain has no say.
//
// By the filter no file is truncated, with the error that Landlock has, but those that are opened
// for writing, which Landlock refuses. openat2, whose flags no filter sees, is answered as unknown.
//
// Where they are not granted, the program lets execve, execveat, write and exit_group pass with the
// secret that SetSecret puts in: so the domain is entered, or its launcher tells why it could not
// be, and whoever was started does not know the secret any more.
//
// The program is for the architecture that this is compiled for, and never longer than
// kMostInstructions: of checks with more values than there is room for, all values are refused.
// Throws BraxoException for a rule whose words are no range.
CallPlan PlanCalls(const Policy::InstalledDomain& domain,
                   Truncation truncation = Truncation::kByLandlock);

// The same beside the module, which keeps the checks as they are at any time: the arguments of
// calls are filtered for what types into terminals and the like alone, and clone3 passes where it
// is granted.
CallPlan PlanCallsBesideModule(const Policy::InstalledDomain& domain);

// True where a rule grants the call by its name, and not only as one of a set.
bool IsCallNamed(const Policy::InstalledDomain& domain, std::string_view call);

// True for a rule about system calls that speaks of one whose signal a check is about.
bool SpeaksOfSignals(const Policy::Rule& rule);

}  // namespace Enforce
