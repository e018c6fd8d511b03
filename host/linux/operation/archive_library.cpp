#include "host/linux/operation/archive_library.h"

#include <iconv.h>

#include <string>

#include "host/linux/common/late_library.h"
#include "host/linux/files/archive_entry_point.h"

namespace LinuxHost {
namespace {

// libarchive converts names with iconv, whose configuration says which libraries convert what. It
// is read once, at first use: here, and not below a root that belongs to somebody else.
void ReadConversions() {
  const iconv_t conversion = iconv_open("ASCII", "UTF-8");
  if (conversion != reinterpret_cast<iconv_t>(-1)) iconv_close(conversion);
}

const ArchiveFunctions& Loaded() {
  static const auto& functions = *static_cast<const ArchiveFunctions*>(FindInLateLibrary(
      "libsecpolicyhost-archive.so.1", "SecPolicyHostArchive", "unpacks tardisks"));
  return functions;
}

}  // namespace

void LoadArchiveLibrary() {
  Loaded();
  ReadConversions();
}

void CheckArchives(const std::vector<std::string>& images, const TardiskRules& rules,
                   ArchiveInspector& inspector) {
  Loaded().check(images, rules, inspector);
}

void UnpackArchive(const std::string& image, const TardiskRules& rules, const Arrival& arrived) {
  Loaded().unpack(image, rules, arrived);
}

}  // namespace LinuxHost
