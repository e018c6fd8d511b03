#pragma once

#include <linux/filter.h>

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "host/enforce/plan/entry_secret.h"
#include "host/enforce/plan/landlock.h"
#include "host/enforce/plan/mask.h"
#include "policy/level.h"

namespace Enforce {

// All that confines a process to a domain, as the kernel takes it. Paths are absolute, and no part
// of them is a link.
struct Plan {
  std::string domain;
  unsigned int domainId = 0;
  std::string mark;  // of the state that it was made from; only its maker understands it
  Policy::Level level = Policy::Level::kEnforcing;  // of any other, nothing below is applied
  bool keepsBroker = false;  // for those in it, whom rules lead to other domains by exec

  std::uint64_t handledFiles = 0;  // rights that are refused where `paths` do not give them
  std::vector<PathRight> paths;    // with rights among the handled ones, and not without any
  bool bindsChecked = false;       // TCP ports are refused that are not among `bindPorts`
  bool connectsChecked = false;
  std::vector<std::uint16_t> bindPorts;
  std::vector<std::uint16_t> connectPorts;
  bool isScoped = false;  // no abstract sockets of others and no signals to them
  std::vector<Mask> masks;

  std::uint64_t capabilities = 0;  // those that are kept, by Linux's numbers as bits

  std::vector<sock_filter> filter;     // of system calls; none when empty
  std::optional<SecretPlaces> secret;  // in the filter, where it lets one program start
  bool mayEnd = true;                  // the filter lets exit or exit_group pass
  bool mayMap = true;                  // and mmap
};

}  // namespace Enforce
