#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace SecPolicyCli {

// The text with lines of at most `columns` characters, where words allow it. Lines of prose that
// follow each other are filled anew; what is indented or stands in columns goes on below its last
// column. Between fences (```) and where all fits, lines stay as they are.
std::string Wrap(std::string_view text, std::size_t columns);

}  // namespace SecPolicyCli
