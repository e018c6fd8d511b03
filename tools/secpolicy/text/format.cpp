#include "format.h"

#include <algorithm>
#include <ctime>
#include <iomanip>
#include <ostream>
#include <sstream>

#include "visible.h"

namespace SecPolicyCli {
namespace {

std::string FormatTime(std::int64_t seconds, const char* format) {
  const std::time_t time = seconds;
  std::tm parts{};
  gmtime_r(&time, &parts);
  std::ostringstream text;
  text << std::put_time(&parts, format);
  return text.str();
}

}  // namespace

std::string CountOf(std::size_t count, const std::string& noun) {
  return std::to_string(count) + " " + noun + (count == 1 ? "" : "s");
}

std::string ListOf(const std::vector<std::string>& words, const std::string& last) {
  std::string text = words.front();
  for (std::size_t index = 1; index < words.size(); ++index) {
    text += (index + 1 < words.size() ? ", " : " " + last + " ") + words[index];
  }
  return text;
}

std::string UtcTime(std::int64_t seconds) { return FormatTime(seconds, "%Y-%m-%d %H:%M:%S UTC"); }

std::string IsoTime(std::int64_t seconds) { return FormatTime(seconds, "%Y-%m-%dT%H:%M:%SZ"); }

void WriteSection(const std::string& heading, const std::vector<std::string>& lines,
                  std::size_t maximum, std::ostream& output, std::optional<Color> color) {
  if (lines.empty()) return;
  output << heading << " (" << lines.size() << "):\n";
  const std::size_t shown = std::min(lines.size(), maximum);
  for (std::size_t index = 0; index < shown; ++index) {
    const std::string line = "  " + Visible(lines[index]);
    if (color) {
      output << Painted{*color, line} << '\n';
    } else {
      output << line << '\n';
    }
  }
  if (shown == lines.size()) return;
  output << "  ... and " << lines.size() - shown << " more; -v shows all\n";
}

}  // namespace SecPolicyCli
