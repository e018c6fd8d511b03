#pragma once

#include <cstddef>
#include <iosfwd>
#include <string>
#include <vector>

namespace SecPolicyCli {

// Writes a heading with the number of `lines`, and at most `maximum` of them, as they can be shown;
// nothing when there are none.
void WriteSection(const std::string& heading, const std::vector<std::string>& lines,
                  std::size_t maximum, std::ostream& output);

}  // namespace SecPolicyCli
