#pragma once

#include <string>

#include "support/trace.h"

// The lines that a report leaves in the trace while the system log runs.
namespace SecPolicyTest {

inline std::string ReportedError(const std::string& message) {
  return "stderr " + Quoted("Error: " + message + "\n") + "\nsyslog(LOG_ERR, \"Error: %s\", " +
         Quoted(message) + ")";
}

inline std::string ReportedInformation(const std::string& message) {
  return "syslog(LOG_INFO, \"%s\", " + Quoted(message) + ")";
}

}  // namespace SecPolicyTest
