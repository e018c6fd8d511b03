#include "support/require.h"

#include <cstdio>
#include <cstdlib>

namespace SecPolicyFuzz {

void Require(bool holds, const std::string& message) {
  if (holds) return;
  std::fprintf(stderr, "violated: %s\n", message.c_str());
  std::abort();
}

void RequireEqual(const std::string& actual, const std::string& expected,
                  const std::string& message) {
  if (actual == expected) return;
  Require(false, message + "\n  is:        " + actual + "\n  should be: " + expected);
}

}  // namespace SecPolicyFuzz
