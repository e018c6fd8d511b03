#include "count.h"

namespace SecPolicyCli {

std::string CountOf(std::size_t count, const std::string& noun) {
  return std::to_string(count) + " " + noun + (count == 1 ? "" : "s");
}

}  // namespace SecPolicyCli
