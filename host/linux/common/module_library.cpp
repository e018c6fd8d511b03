#include "host/linux/common/module_library.h"

#include "host/linux/common/late_library.h"

namespace LinuxHost {

const Enforce::ModuleFunctions& ModuleLibrary() {
  static const auto& functions = *static_cast<const Enforce::ModuleFunctions*>(FindInLateLibrary(
      "libsecpolicy-module.so.1", "SecPolicyModule", "keeps a policy in the kernel",
      "It is installed with this command where that was built with clang, "
      "bpftool and libbpf: install such a package of secpolicy, and libbpf"));
  return functions;
}

}  // namespace LinuxHost
