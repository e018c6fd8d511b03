#include "host/linux/common/late_library.h"

#include <dlfcn.h>

#include <cerrno>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"

using Braxo::Misc::StrCat;

namespace LinuxHost {
namespace {

// Out of the installation that the command, or the library that this is in, belongs to, or else as
// any library is found. A run path would find it too, and slow every start of the command.
void* Open(const char* name) {
  for (const char* const place :
       {"$ORIGIN/../" SECPOLICY_LIBDIR "/secpolicy/", "$ORIGIN/secpolicy/"}) {
    void* const library = dlopen(StrCat(place, name).c_str(), RTLD_NOW | RTLD_LOCAL);
    if (library != nullptr) return library;
  }
  return dlopen(name, RTLD_NOW | RTLD_LOCAL);
}

}  // namespace

const void* FindInLateLibrary(const char* name, const char* symbol, const std::string& purpose,
                              const std::string& remedy) {
  void* const library = Open(name);
  void* const found = library == nullptr ? nullptr : dlsym(library, symbol);
  if (found != nullptr) return found;
  throw HostError(ELIBACC, StrCat("Unable to load what ", purpose, ": ", dlerror(), ". ", remedy));
}

}  // namespace LinuxHost
