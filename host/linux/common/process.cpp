#include "host/linux/common/process.h"

#include <signal.h>

#include <cerrno>
#include <fstream>
#include <sstream>
#include <string>

#include "braxo/misc/strcat.h"

using Braxo::Misc::StrCat;

namespace LinuxHost {

bool IsAlive(int process) { return process > 0 && (kill(process, 0) == 0 || errno == EPERM); }

std::int64_t StartOf(int process) {
  std::ifstream file(StrCat("/proc/", process, "/stat"));
  std::string text;
  std::getline(file, text);
  // The second field is the program's name in parentheses, which may hold anything; the start is
  // the twentieth field behind it.
  const auto nameEnd = text.rfind(')');
  if (nameEnd == std::string::npos) return 0;
  std::istringstream fields(text.substr(nameEnd + 1));
  std::string skipped;
  for (int field = 1; field < 20; ++field) fields >> skipped;
  std::int64_t start = 0;
  fields >> start;
  return start;
}

bool IsStill(int process, std::int64_t started) {
  return IsAlive(process) && StartOf(process) == started;
}

std::optional<uid_t> OwnerOf(int process) {
  std::ifstream status(StrCat("/proc/", process, "/status"));
  std::string line;
  while (std::getline(status, line)) {
    if (!line.starts_with("Uid:")) continue;
    std::istringstream fields(line.substr(line.find(':') + 1));
    uid_t real = 0;
    uid_t effective = 0;
    uid_t saved = 0;
    fields >> real >> effective >> saved;
    if (!fields || real != effective || real != saved) return std::nullopt;
    return real;
  }
  return std::nullopt;
}

}  // namespace LinuxHost
