#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "label/label_actions.h"
#include "policy/difference.h"

namespace SecPolicyCli {

// What of a host is not as its policy says.
struct Drift {
  bool isWhole = true;  // false: something could not be compared
  LabelTally labels = {};
  Policy::Difference policy = {};  // how what is installed differs from the policy
  std::int64_t time = 0;           // when that was so, in seconds since 1970
  double seconds = 0;              // that it took to find out

  std::size_t CountObjects() const {
    return policy.objectsAdded.size() + policy.objectsRemoved.size();
  }
  bool IsThere() const { return labels.different > 0 || !policy.IsEmpty(); }
};

// "1 of 46 files and 2 domains are", of a drift that is there.
std::string Describe(const Drift& drift);

// As metrics for a collector; without numbers that would not be whole.
std::string MetricsOf(const Drift& drift);

}  // namespace SecPolicyCli
