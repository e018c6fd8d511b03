#include "host/linux/operation/file_label.h"

#include <sys/xattr.h>

#include <cerrno>
#include <string>

#include "host/linux/files/inherited_label.h"
#include "host/linux/files/security_attribute.h"

namespace LinuxHost {
namespace {

// `get` reads the attribute that the file itself carries, as getxattr(2) does.
template <class Get>
std::optional<FileLabel> ReadLabelBy(Get get, const char* path) {
  const std::string attribute = LabelAttribute();
  const char* const name = attribute.c_str();
  FileLabel label;
  if (get(name, &label.id, sizeof label.id) >= 0) return label;
  if (errno != ENODATA) return std::nullopt;
  label.isInherited = true;
  if (ReadInherited(path, LastLink::kKept, name, &label.id, sizeof label.id) >= 0) return label;
  return std::nullopt;
}

}  // namespace

std::optional<FileLabel> ReadLabel(const char* path) {
  return ReadLabelBy([&](const char* name, void* value,
                         std::size_t size) { return lgetxattr(path, name, value, size); },
                     path);
}

std::optional<FileLabel> ReadLabel(int file, const char* path) {
  return ReadLabelBy([&](const char* name, void* value,
                         std::size_t size) { return fgetxattr(file, name, value, size); },
                     path);
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
