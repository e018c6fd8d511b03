// One call for each file that carries a label, and one more for directories and for files that
// carry none: whether they are of another mount. A file that is bound to another place carries the
// same label there, so it is not asked about.
#include "host/linux/files/labelled_places.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <sys/xattr.h>

#include <cerrno>
#include <cstdint>
#include <optional>
#include <utility>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/files/file_walk.h"

namespace LinuxHost {
namespace {

using Enforce::kNotIndexed;
using Enforce::kUnlabelled;
using Enforce::LabelledPlace;

struct Mount {
  std::uint64_t id = 0;
  std::uint64_t device = 0;

  bool operator==(const Mount&) const = default;
};

struct Status {
  bool isDirectory;
  Mount mount;
};

// Nothing, with errno set, where there is no such file.
std::optional<Status> StatusOf(const char* name) {
  constexpr int kFlags = AT_SYMLINK_NOFOLLOW | AT_NO_AUTOMOUNT;
  struct statx status {};
  if (statx(AT_FDCWD, name, kFlags, STATX_TYPE | STATX_MNT_ID, &status) != 0) return std::nullopt;
  return Status{.isDirectory = S_ISDIR(status.stx_mode),
                .mount = {.id = status.stx_mnt_id,
                          .device = makedev(status.stx_dev_major, status.stx_dev_minor)}};
}

class Search {
 public:
  explicit Search(const std::string& labelAttribute) : attribute(labelAttribute.c_str()) {}

  // Returns whether the walk goes into the file.
  bool Visit(const WalkedFile& file) {
    if (file.type == DT_LNK) return false;
    const bool mayBeDirectory = file.type == DT_DIR || file.type == DT_UNKNOWN;
    const std::uint32_t inherited = file.depth == 0 ? kUnlabelled : above[file.depth - 1];
    const auto carried = Carried(file.name);
    if (carried && !mayBeDirectory) {
      Take(file, *carried, inherited, false);
      return false;
    }
    const auto status = StatusOf(file.name);
    if (!status) return false;
    if (file.depth == 0) mount = status->mount;
    const bool isHere = status->mount == mount;
    const std::uint32_t label = isHere ? carried.value_or(inherited) : kNotIndexed;
    Take(file, label, inherited, status->isDirectory);
    if (!status->isDirectory || !isHere) return false;
    above.resize(file.depth);
    above.push_back(label);
    return true;
  }

  // What cannot be entered or listed as a whole.
  void Fail(const std::string& path) {
    if (!places.empty() && places.back().path == path) {
      places.back().label = kNotIndexed;
    } else {
      places.push_back({.path = path, .label = kNotIndexed, .isDirectory = true});
    }
    if (!above.empty()) above.back() = kNotIndexed;
  }

  std::vector<LabelledPlace> places;

 private:
  // Nothing for a file that inherits its label.
  std::optional<std::uint32_t> Carried(const char* name) const {
    std::uint32_t label = 0;
    const ssize_t size = lgetxattr(name, attribute, &label, sizeof label);
    if (size == sizeof label) return label;
    if (size < 0 && (errno == ENODATA || errno == EOPNOTSUPP)) return std::nullopt;
    return kNotIndexed;
  }

  void Take(const WalkedFile& file, std::uint32_t label, std::uint32_t inherited,
            bool isDirectory) {
    if (label == inherited && file.depth != 0) return;
    places.push_back({.path = file.path, .label = label, .isDirectory = isDirectory});
  }

  const char* const attribute;
  Mount mount;
  std::vector<std::uint32_t> above;  // the labels of the directories on the way
};

}  // namespace

std::vector<LabelledPlace> FindLabelledPlaces(const std::string& root,
                                              const std::string& attribute) {
  Search search(attribute);
  WalkFiles(
      root, "/", [&](const WalkedFile& file) { return search.Visit(file); },
      [&](const std::string& path, int error) {
        if (error != kMoved) return search.Fail(path);
        throw HostError(error, Braxo::Misc::StrCat("Unable to look at the labels of all files: ",
                                                   path, " changed meanwhile"));
      });
  return std::move(search.places);
}

}  // namespace LinuxHost
