#include "host/linux/operation/mend_state.h"

#include <sys/stat.h>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/used_paths.h"
#include "host/linux/operation/label_journal.h"
#include "host/linux/state/host_state.h"

namespace LinuxHost {

std::string MendState() {
  const std::string& path = StatePath();
  struct stat status {};
  if (lstat(path.c_str(), &status) != 0) return "";
  try {
    HostState::Current().Database().RequireIntegrity();
    return "";
  } catch (const UnusableContent&) {
    MoveAside(path);
    LabelJournal::DiscardLeftOver(path);
  }
  return Braxo::Misc::StrCat(
      "the host state could not be used, so a new one is made; what was there is now ", path,
      ".damaged");
}

}  // namespace LinuxHost
