#include "size.h"

#include <sys/ioctl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "text/wrap.h"

namespace SecPolicyCli {

std::optional<TerminalSize> SizeOfTerminal(int descriptor) {
  if (isatty(descriptor) != 1) return std::nullopt;
  TerminalSize size;
  winsize told{};
  if (ioctl(descriptor, TIOCGWINSZ, &told) != 0) return size;
  if (told.ws_col > 0) size.columns = told.ws_col;
  if (told.ws_row > 0) size.rows = told.ws_row;
  return size;
}

bool IsSameTerminal(int one, int other) {
  struct stat first {};
  struct stat second {};
  return isatty(one) == 1 && fstat(one, &first) == 0 && fstat(other, &second) == 0 &&
         first.st_rdev == second.st_rdev;
}

std::string FitTerminal(const std::string& text) {
  const std::optional<TerminalSize> size = SizeOfTerminal(STDOUT_FILENO);
  return size ? Wrap(text, size->columns) : text;
}

}  // namespace SecPolicyCli
