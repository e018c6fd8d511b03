#pragma once

#include <filesystem>
#include <string>

namespace SecPolicyCli {

// Makes the file `path`, which everybody may read, with the content `text`. Throws HostError when
// it cannot be made or is there already.
void WriteNewFile(const std::filesystem::path& path, const std::string& text);

}  // namespace SecPolicyCli
