// Requests to the broker of a domain: bytes are one exactly when they are what the request is
// written as, and nothing that steers a program is ever among its variables.

#include <algorithm>
#include <cstdint>

#include "host/enforce/broker/message.h"
#include "support/require.h"

namespace SecPolicyFuzz {

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view input(reinterpret_cast<const char*>(data), size);
  Enforce::EntryRequest request;
  if (!Enforce::Parse(input, &request)) return 0;
  Require(!request.command.empty(), "a request names a program");
  Require(Enforce::Serialize(request) == input, "a request is written in one way");
  const auto steers = [](const std::string& variable) {
    return variable.starts_with("LD_") || variable.starts_with("PATH=") ||
           variable.find('/') != std::string::npos;
  };
  Require(std::ranges::none_of(request.environment, steers), "no variable says what to load");
  return 0;
}

}  // namespace SecPolicyFuzz
