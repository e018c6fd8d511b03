#include "utc_time.h"

#include <ctime>
#include <iomanip>
#include <sstream>

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

std::string UtcTime(std::int64_t seconds) { return FormatTime(seconds, "%Y-%m-%d %H:%M:%S UTC"); }

std::string IsoTime(std::int64_t seconds) { return FormatTime(seconds, "%Y-%m-%dT%H:%M:%SZ"); }

}  // namespace SecPolicyCli
