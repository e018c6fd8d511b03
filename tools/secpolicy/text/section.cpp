#include "section.h"

#include <algorithm>
#include <ostream>

#include "visible.h"

namespace SecPolicyCli {

void WriteSection(const std::string& heading, const std::vector<std::string>& lines,
                  std::size_t maximum, std::ostream& output) {
  if (lines.empty()) return;
  output << heading << " (" << lines.size() << "):\n";
  const std::size_t shown = std::min(lines.size(), maximum);
  for (std::size_t index = 0; index < shown; ++index) {
    output << "  " << Visible(lines[index]) << '\n';
  }
  if (shown == lines.size()) return;
  output << "  ... and " << lines.size() - shown << " more; -v shows all\n";
}

}  // namespace SecPolicyCli
