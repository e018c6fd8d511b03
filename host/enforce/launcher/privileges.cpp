#include "host/enforce/launcher/privileges.h"

#include <linux/capability.h>
#include <linux/securebits.h>
#include <sys/prctl.h>

#include "host/enforce/kernel.h"
#include "host/enforce/launcher/refuse.h"

namespace Enforce {
namespace {

// The superuser is a user like others, on execution and when identities change, and stays it.
constexpr unsigned long kSecureBits = SECBIT_NOROOT | SECBIT_NOROOT_LOCKED |
                                      SECBIT_NO_SETUID_FIXUP | SECBIT_NO_SETUID_FIXUP_LOCKED |
                                      SECBIT_KEEP_CAPS_LOCKED;

constexpr char kMessage[] = "cannot give up capabilities";

void Control(int option, unsigned long first, unsigned long second = 0) {
  if (prctl(option, first, second, 0, 0) != 0) RefuseForErrno(kMessage);
}

Kernel::Capabilities Get() {
  Kernel::Capabilities own;
  if (Kernel::GetCapabilities(&own) != 0) RefuseForErrno(kMessage);
  return own;
}

template <typename Action>
void ForEach(std::uint64_t set, Action act) {
  const int last = Kernel::LastCapability();
  for (int number = 0; number <= last; ++number) {
    if (Kernel::HasCapability(set, number)) act(static_cast<unsigned long>(number));
  }
}

}  // namespace

std::uint64_t OwnCapabilities() { return Get().permitted; }

void KeepCapabilities(std::uint64_t kept) {
  if (Kernel::HasCapability(Get().effective, CAP_SETPCAP)) {
    ForEach(~kept, [](unsigned long number) { Control(PR_CAPBSET_DROP, number); });
    Control(PR_SET_SECUREBITS, kSecureBits);
  }
  if (Kernel::SetCapabilities({kept, kept, kept}) != 0) RefuseForErrno(kMessage);
  ForEach(kept,
          [](unsigned long number) { Control(PR_CAP_AMBIENT, PR_CAP_AMBIENT_RAISE, number); });
}

}  // namespace Enforce
