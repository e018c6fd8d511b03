#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "host/enforce/coverage.h"
#include "policy/installed_policy.h"

namespace Enforce {

// More single ports than this are not worth their time at each entry.
constexpr std::size_t kMostPorts = 4096;

// One right to ports, as Landlock takes it.
struct PortPlan {
  bool isHandled = false;            // Landlock refuses all ports but these
  std::vector<std::uint16_t> ports;  // ascending
};

// What ports of TCP a domain may bind and connect to.
struct NetPlan {
  PortPlan bind;
  PortPlan connect;
  std::vector<RuleFate> fates;  // of the rules about bind_port and connect_port, in order
};

// The plan for a domain's rules about bind_port and connect_port, for a kernel whose Landlock has
// this version, 0 for none. Sockets that Landlock does not check are for the call plan to refuse.
// Throws BraxoException for a rule whose words are no range.
NetPlan PlanNet(const Policy::InstalledDomain& domain, int landlockAbi);

}  // namespace Enforce
