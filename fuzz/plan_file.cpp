// Plans for the launcher: bytes are a plan exactly when they are what the plan is written as. An
// input is tried as it is, and with the right checksum in place of its last bytes.

#include "host/enforce/plan_file.h"

#include <cstdint>
#include <string>

#include "host/enforce/checksum.h"
#include "support/require.h"

namespace SecPolicyFuzz {
namespace {

std::string Sign(std::string body) {
  const std::uint64_t sum = Enforce::Checksum(body);
  return body.append(reinterpret_cast<const char*>(&sum), sizeof(sum));
}

void Try(std::string_view bytes) {
  Enforce::Plan plan;
  const char* whyNot = nullptr;
  const bool isPlan = Enforce::Parse(bytes, &plan, &whyNot);
  Require(isPlan == (whyNot == nullptr), "a reason is given when it is no plan");
  if (isPlan) Require(Enforce::Serialize(plan) == bytes, "a plan is written in one way");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string input(reinterpret_cast<const char*>(data), size);
  Try(input);
  if (size >= sizeof(std::uint64_t)) Try(Sign(input.substr(0, size - sizeof(std::uint64_t))));
  return 0;
}

}  // namespace SecPolicyFuzz
