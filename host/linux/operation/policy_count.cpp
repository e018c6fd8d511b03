#include "host/linux/operation/policy_count.h"

#include "host/linux/state/host_state.h"

namespace LinuxHost {

// The policies of worlds belong to running services: no display shows them.
PolicyCount CountPolicy(HostState& state) {
  Rows rows = state.Database().Select(
      "SELECT (SELECT count(*) FROM domain), (SELECT count(*) FROM rule) + (SELECT count(*) FROM "
      "parameter_rule) + (SELECT count(*) FROM file_policy WHERE world = 0), (SELECT count(*) FROM "
      "label)");
  rows.Next();
  return {.domains = static_cast<std::uint64_t>(rows.Integer(0)),
          .rules = static_cast<std::uint64_t>(rows.Integer(1)),
          .objects = static_cast<std::uint64_t>(rows.Integer(2))};
}

}  // namespace LinuxHost
