#include <sys/xattr.h>

#include <cerrno>
#include <cstdint>
#include <cstring>

#include "braxo/misc/strcat.h"
#include "secpolicy/parse/directory.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"
#include "zorvan/kernel.h"

namespace SecPolicy {
namespace {

using Braxo::Misc::StrCat;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;

constexpr char kAttribute[] = "zorvan.security";
constexpr std::uint32_t kNoSuchLabel = 1;

// Links, sockets and entries of unknown type are left alone.
bool IsLabelled(unsigned char entryType) {
  switch (entryType) {
    case DT_FIFO:
    case DT_CHR:
    case DT_DIR:
    case DT_BLK:
    case DT_REG:
      return true;
    default:
      return false;
  }
}

}  // namespace

void SetFileLabel(const std::string& path, const std::string& label,
                  TeskAccessInterfaceImpl& access) {
  const std::uint32_t id = access.LookupLabel(label, TESKACCESS_LABEL_OBJECT);
  if (id == kNoSuchLabel) RaiseError(StrCat("Invalid label (", label, ") for file ", path));

  errno = 0;
  // Replace-only: a file that never carried the attribute is not ours to label.
  if (Zorvan::Kernel::SetXattr(path.c_str(), kAttribute, &id, sizeof id, XATTR_REPLACE) != 0) {
    const int error = errno;
    RaiseError(StrCat("Unable to set file label (", label, ") for file ", path, ": ",
                      std::strerror(error)));
  }
}

void SetDirLabelRecursive(const std::string& dir, const std::string& label,
                          TeskAccessInterfaceImpl& access) {
  SetFileLabel(dir, label, access);

  Directory directory(dir);
  if (!directory.IsOpen()) RaiseError("Unable to open directory " + dir);
  while (const dirent* entry = directory.Next()) {
    if (!IsLabelled(entry->d_type)) continue;
    const std::string child = dir + "/" + entry->d_name;
    SetFileLabel(child, label, access);
    if (entry->d_type == DT_DIR) SetDirLabelRecursive(child, label, access);
  }
}

std::string GetFileLabel(const std::string& path, TeskAccessInterfaceImpl& access) {
  std::uint32_t id = 0;
  errno = 0;
  if (Zorvan::Kernel::GetXattr(path.c_str(), kAttribute, &id, sizeof id) < 0) {
    const int error = errno;
    RaiseError(StrCat("Unable to get file label for file ", path, ":", std::strerror(error)));
  }
  return access.GetLabel(id, TESKACCESS_LABEL_OBJECT);
}

}  // namespace SecPolicy
