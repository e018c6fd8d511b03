#include "host/linux/files/first_labels.h"

#include <sys/stat.h>

#include <cerrno>
#include <cstddef>
#include <cstring>
#include <functional>
#include <string>
#include <string_view>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/running_system.h"
#include "host/linux/files/file_walk.h"
#include "host/linux/files/security_attribute.h"

namespace LinuxHost {
namespace {

using Braxo::Misc::StrCat;

// Counts what went wrong and keeps the first of it.
class Failures {
 public:
  void Add(std::string_view path, int error) {
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

// `label` labels the file of a name in the working directory: 0, or -1 with errno set.
void LabelFiles(const std::string& attribute, const std::function<int(const char*)>& label) {
  Failures failures;
  dev_t rootDevice = 0;
  const auto visit = [&](const WalkedFile& file) {
    struct stat status;
    if (lstat(file.name, &status) != 0) {
      failures.Add(file.path, errno);
      return false;
    }
    const bool isDirectory = S_ISDIR(status.st_mode);
    if (file.depth == 0) rootDevice = status.st_dev;
    if (status.st_dev != rootDevice) return false;
    if (isDirectory && file.depth == 1 && IsRunningSystem(file.name)) return false;
    if (CanCarryLabel(status.st_mode, attribute) && label(file.name) != 0) {
      failures.Add(file.path, errno);
    }
    return isDirectory;
  };
  WalkFiles(".", "/", visit, [&](const std::string& path, int error) {
    if (error != kMoved) return failures.Add(path, error);
    throw HostError(error, StrCat("Unable to give all files their first label: ",
                                  path.substr(0, path.rfind('/')), "/ changed meanwhile"));
  });
  failures.ThrowIfAny();
}

}  // namespace

void GiveFirstLabels(const std::string& attribute) {
  LabelFiles(attribute, [&](const char* name) { return GiveFirstLabel(name, attribute); });
}

std::size_t CountFirstLabels(const std::string& attribute) {
  std::size_t count = 0;
  LabelFiles(attribute, [&](const char* /*name*/) {
    ++count;
    return 0;
  });
  return count;
}

}  // namespace LinuxHost
