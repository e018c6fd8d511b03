#include "archive_library.h"

#include <dlfcn.h>
#include <iconv.h>

#include <cerrno>
#include <string>

#include "braxo/misc/strcat.h"
#include "host_error.h"
#include "tardisk_archive.h"

using Braxo::Misc::StrCat;

namespace LinuxHost {
namespace {

using Unpack = decltype(&UnpackArchive);

constexpr char kLibrary[] = "libsecpolicyhost-archive.so.1";
constexpr char kEntryPoint[] = "SecPolicyHostUnpackArchive";

// libarchive converts names with iconv, whose configuration says which libraries convert what. It
// is read once, at first use: here, and not below a root that belongs to somebody else.
void ReadConversions() {
  const iconv_t conversion = iconv_open("ASCII", "UTF-8");
  if (conversion != reinterpret_cast<iconv_t>(-1)) iconv_close(conversion);
}

// Out of the installation that the command belongs to, or else as any library is found. A run path
// would find it too, and slow every start of the command.
void* Open() {
  const std::string installed = StrCat("$ORIGIN/../" SECPOLICY_LIBDIR "/", kLibrary);
  void* const library = dlopen(installed.c_str(), RTLD_NOW | RTLD_LOCAL);
  return library != nullptr ? library : dlopen(kLibrary, RTLD_NOW | RTLD_LOCAL);
}

Unpack Load() {
  void* const library = Open();
  void* const entryPoint = library == nullptr ? nullptr : dlsym(library, kEntryPoint);
  if (entryPoint != nullptr) return reinterpret_cast<Unpack>(entryPoint);
  throw HostError(ELIBACC, StrCat("Unable to load what unpacks tardisks: ", dlerror(),
                                  ". It belongs beside libsecpolicyhost.so.1: "
                                  "install that again"));
}

Unpack Loaded() {
  static const Unpack unpack = Load();
  return unpack;
}

}  // namespace

void LoadArchiveLibrary() {
  Loaded();
  ReadConversions();
}

void UnpackArchive(const std::string& image, const Arrival& arrived) { Loaded()(image, arrived); }

}  // namespace LinuxHost
