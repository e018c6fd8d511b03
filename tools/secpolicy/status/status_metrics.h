#pragma once

#include <string>

#include "host_status.h"

namespace SecPolicyCli {

// What docs/monitoring.md tells of, as metrics for a collector.
std::string MetricsOf(const HostStatus& status);

// Of a host that was not booted.
std::string MetricsWithoutState();

// Of a host whose state cannot be read.
std::string MetricsWithoutStatus();

}  // namespace SecPolicyCli
