#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace SecPolicyCli {

// The URI of a path; of one that is not absolute, a reference that is relative, too.
std::string ToUri(std::string_view path);

// The path of a URI of a local file; nothing for any other.
std::optional<std::string> PathOfUri(std::string_view uri);

}  // namespace SecPolicyCli
