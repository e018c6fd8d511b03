#include "utc_time.h"

#include <ctime>
#include <iomanip>
#include <sstream>

namespace SecPolicyCli {

std::string UtcTime(std::int64_t seconds) {
  const std::time_t time = seconds;
  std::tm parts{};
  gmtime_r(&time, &parts);
  std::ostringstream text;
  text << std::put_time(&parts, "%Y-%m-%d %H:%M:%S UTC");
  return text.str();
}

}  // namespace SecPolicyCli
