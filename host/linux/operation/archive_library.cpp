#include "host/linux/operation/archive_library.h"

#include <dlfcn.h>
#include <iconv.h>

#include <cerrno>
#include <string>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/files/archive_entry_point.h"

using Braxo::Misc::StrCat;

namespace LinuxHost {
namespace {

constexpr char kLibrary[] = "libsecpolicyhost-archive.so.1";
constexpr char kEntryPoint[] = "SecPolicyHostArchive";

// libarchive converts names with iconv, whose configuration says which libraries convert what. It
// is read once, at first use: here, and not below a root that belongs to somebody else.
void ReadConversions() {
  const iconv_t conversion = iconv_open("ASCII", "UTF-8");
  if (conversion != reinterpret_cast<iconv_t>(-1)) iconv_close(conversion);
}

// Out of the installation that the command belongs to, or else as any library is found. A run path
// would find it too, and slow every start of the command.
void* Open() {
  const std::string installed = StrCat("$ORIGIN/../" SECPOLICY_LIBDIR "/secpolicy/", kLibrary);
  void* const library = dlopen(installed.c_str(), RTLD_NOW | RTLD_LOCAL);
  return library != nullptr ? library : dlopen(kLibrary, RTLD_NOW | RTLD_LOCAL);
}

const ArchiveFunctions& Load() {
  void* const library = Open();
  void* const entryPoint = library == nullptr ? nullptr : dlsym(library, kEntryPoint);
  if (entryPoint != nullptr) return *static_cast<const ArchiveFunctions*>(entryPoint);
  throw HostError(ELIBACC, StrCat("Unable to load what unpacks tardisks: ", dlerror(),
                                  ". It is installed with this command: "
                                  "install secpolicy again"));
}

const ArchiveFunctions& Loaded() {
  static const ArchiveFunctions& functions = Load();
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
