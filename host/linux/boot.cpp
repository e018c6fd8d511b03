#include "boot.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <system_error>

#include "braxo/misc/strcat.h"
#include "config_database.h"
#include "descriptor.h"
#include "first_labels.h"
#include "host_error.h"
#include "host_state.h"
#include "security_attribute.h"
#include "system_log.h"
#include "tardisk_archive.h"

namespace LinuxHost {
namespace {

using Braxo::Misc::StrCat;

constexpr char kTardiskDirectory[] = "/tardisks";

// Makes the root the working directory until it is destroyed.
class AtRoot {
 public:
  AtRoot() : before(open(".", O_PATH | O_DIRECTORY | O_CLOEXEC)) {
    if (chdir("/") == 0) return;
    throw HostError(errno, StrCat("Unable to enter the root: ", std::strerror(errno)));
  }
  AtRoot(const AtRoot&) = delete;
  AtRoot& operator=(const AtRoot&) = delete;
  // Who came from a directory that is gone stays at the root.
  ~AtRoot() { [[maybe_unused]] const int result = fchdir(before.Number()); }

 private:
  const Descriptor before;
};

// In byte order of name, which is that of the paths, as they share the directory.
std::vector<std::string> ListImages() {
  std::vector<std::string> images;
  try {
    for (const auto& entry : std::filesystem::directory_iterator(kTardiskDirectory)) {
      if (std::filesystem::is_regular_file(entry.symlink_status())) images.push_back(entry.path());
    }
  } catch (const std::filesystem::filesystem_error& error) {
    throw HostError(error.code().value(), StrCat("Unable to list the tardisks in ",
                                                 kTardiskDirectory, ": ", error.code().message()));
  }
  std::sort(images.begin(), images.end());
  return images;
}

}  // namespace

void UnpackTardisk(const std::string& image, const std::string& labelAttribute,
                   std::vector<InodeOrigin>& origins) {
  const std::string tardisk = std::filesystem::path(image).filename();
  UnpackArchive(image, [&](const std::string& path, const struct statx& status) {
    if (CanCarryLabel(status.stx_mode, labelAttribute) &&
        GiveFirstLabel(path.c_str(), labelAttribute) != 0) {
      return errno;
    }
    origins.push_back({.device = DeviceOf(status),
                       .inode = status.stx_ino,
                       .tardisk = tardisk,
                       .path = "/" + path,
                       .birth = BirthOf(status)});
    return 0;
  });
}

AssembledRoot AssembleRoot() {
  const AtRoot atRoot;
  // A root that has never run has no place for what runs.
  mkdir("/run", 0755);
  // A state that cannot be used is told before a file is changed.
  AssembledRoot root;
  root.labelAttribute = UsableLabelAttribute(HostState::Current().Directory());
  for (const std::string& image : ListImages()) {
    UnpackTardisk(image, root.labelAttribute, root.origins);
    LogInformation("Unpacked tardisk " + image);
  }
  GiveFirstLabels(root.labelAttribute);
  return root;
}

void StartPolicy(const AssembledRoot& root) {
  HostState& state = HostState::Current();
  state.Reset();
  state.ChooseLabelAttribute(root.labelAttribute);
  state.RecordOrigins(root.origins);
  if (ConfigDatabase* settings = ConfigDatabase::Find()) settings->ClearBootStatus();
}

}  // namespace LinuxHost
