#include "host/linux/operation/file_label.h"

#include <sys/xattr.h>

#include <cerrno>
#include <string>

#include "host/linux/files/inherited_label.h"
#include "host/linux/files/security_attribute.h"

namespace LinuxHost {

std::optional<FileLabel> ReadLabel(const char* path) {
  const std::string attribute = LabelAttribute();
  const char* const name = attribute.c_str();
  FileLabel label;
  if (lgetxattr(path, name, &label.id, sizeof label.id) >= 0) return label;
  if (errno != ENODATA) return std::nullopt;
  label.isInherited = true;
  if (ReadInherited(path, LastLink::kKept, name, &label.id, sizeof label.id) >= 0) return label;
  return std::nullopt;
}

int ReplaceLabel(const char* path, std::uint32_t id) {
  const std::string attribute = LabelAttribute();
  const char* const name = attribute.c_str();
  // Most files of a load have their label from the one before: what changes nothing is not written,
  // and makes no index old.
  std::uint32_t carried = 0;
  if (lgetxattr(path, name, &carried, sizeof carried) == sizeof carried && carried == id) return 0;
  return ChangeLabel([&](const char* /*name*/) {
    const int result = lsetxattr(path, name, &id, sizeof id, XATTR_REPLACE);
    if (result == 0 || errno != ENODATA) return result;
    return ReplaceInherited(path, LastLink::kKept, name, &id, sizeof id);
  });
}

}  // namespace LinuxHost
