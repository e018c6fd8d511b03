#include "first_labels.h"

#include <fts.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstddef>
#include <cstring>
#include <memory>
#include <string>

#include "braxo/misc/strcat.h"
#include "host_error.h"
#include "running_system.h"
#include "security_attribute.h"

namespace LinuxHost {
namespace {

using Braxo::Misc::StrCat;

struct CloseTree {
  void operator()(FTS* tree) const { fts_close(tree); }
};
using Tree = std::unique_ptr<FTS, CloseTree>;

// Counts what went wrong and keeps the first of it.
class Failures {
 public:
  void Add(const char* path, int error) {
    // A file that has gone needs no label.
    if (error == ENOENT) return;
    if (++count > 1) return;
    firstError = error;
    first = StrCat(path, ": ", std::strerror(error));
  }

  void ThrowIfAny() const {
    if (count == 0) return;
    throw HostError(firstError,
                    StrCat("Unable to give ", count, count == 1 ? " file its" : " files their",
                           " first label: ", first));
  }

 private:
  std::size_t count = 0;
  int firstError = 0;
  std::string first;
};

// Walks by changing directory, so that neither a link planted on the way nor a path of any length
// leads it astray.
Tree OpenTree() {
  char here[] = ".";
  char* const roots[] = {here, nullptr};
  Tree tree(fts_open(roots, FTS_PHYSICAL | FTS_XDEV, nullptr));
  if (!tree) {
    throw HostError(errno, StrCat("Unable to walk the root file system: ", std::strerror(errno)));
  }
  return tree;
}

bool WasNotReached(const FTSENT& entry) {
  return entry.fts_info == FTS_DNR || entry.fts_info == FTS_ERR || entry.fts_info == FTS_NS;
}

bool IsLeftAlone(const FTSENT& entry, dev_t rootDevice) {
  if (entry.fts_statp->st_dev != rootDevice) return true;
  return entry.fts_level == 1 && entry.fts_info == FTS_D && IsRunningSystem(entry.fts_name);
}

}  // namespace

void GiveFirstLabels(std::uint32_t id) {
  const Tree tree = OpenTree();
  Failures failures;
  dev_t rootDevice = 0;
  errno = 0;
  while (FTSENT* entry = fts_read(tree.get())) {
    if (entry->fts_level == FTS_ROOTLEVEL) rootDevice = entry->fts_statp->st_dev;
    if (WasNotReached(*entry)) {
      failures.Add(entry->fts_path, entry->fts_errno);
    } else if (IsLeftAlone(*entry, rootDevice)) {
      fts_set(tree.get(), entry, FTS_SKIP);
    } else if (entry->fts_info != FTS_DP && CanCarryLabel(entry->fts_statp->st_mode) &&
               GiveFirstLabel(entry->fts_accpath, id) != 0) {
      failures.Add(entry->fts_path, errno);
    }
    errno = 0;
  }
  if (errno != 0) failures.Add("the rest of the tree", errno);
  failures.ThrowIfAny();
}

}  // namespace LinuxHost
