#include "host/linux/operation/late_library.h"

#include <dlfcn.h>

#include <cerrno>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"

using Braxo::Misc::StrCat;

namespace LinuxHost {
namespace {

// Out of the installation that the command belongs to, or else as any library is found. A run path
// would find it too, and slow every start of the command.
void* Open(const char* name) {
  const std::string installed = StrCat("$ORIGIN/../" SECPOLICY_LIBDIR "/secpolicy/", name);
  void* const library = dlopen(installed.c_str(), RTLD_NOW | RTLD_LOCAL);
  return library != nullptr ? library : dlopen(name, RTLD_NOW | RTLD_LOCAL);
}

}  // namespace

const void* FindInLateLibrary(const char* name, const char* symbol, const std::string& purpose) {
  void* const library = Open(name);
  void* const found = library == nullptr ? nullptr : dlsym(library, symbol);
  if (found != nullptr) return found;
  throw HostError(ELIBACC, StrCat("Unable to load what ", purpose, ": ", dlerror(),
                                  ". It is installed with this command: "
                                  "install secpolicy again"));
}

}  // namespace LinuxHost
