#pragma once

#include <optional>
#include <span>
#include <string_view>

namespace Policy {

// The names of the capabilities of Linux, each by its number: the first is "cap_chown".
std::span<const std::string_view> Capabilities();

// The number of the capability with this name; nothing when there is none.
std::optional<unsigned int> CapabilityNumber(std::string_view name);

}  // namespace Policy
