#pragma once

#include <cstdint>
#include <string_view>
#include <vector>

#include "host/enforce/plan/value_set.h"
#include "policy/installed_policy.h"

namespace Enforce {

constexpr char kBindPort[] = "bind_port";
constexpr char kConnectPort[] = "connect_port";

// Stands for a port that the kernel chooses.
constexpr std::uint32_t kPortOfKernel = 0;

// What the rules of a domain say of the ports that sockets are bound or connected to.
struct PortCheck {
  std::vector<const Policy::Rule*> rules;  // of the domain
  ValueSet passing;                        // of the 65,536 ports

  // True when all ports pass.
  bool IsOpen() const;
};

bool IsPortCheck(std::string_view check);

// The domain has to outlive what is returned. Throws BraxoException for a rule whose words are no
// range.
PortCheck ReadPortCheck(const Policy::InstalledDomain& domain, std::string_view check);

}  // namespace Enforce
