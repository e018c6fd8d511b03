#include "policy/capability.h"

#include <algorithm>
#include <array>
#include <iterator>

namespace Policy {
namespace {

constexpr auto kCapabilities = std::to_array<std::string_view>({
    "cap_chown",
    "cap_dac_override",
    "cap_dac_read_search",
    "cap_fowner",
    "cap_fsetid",
    "cap_kill",
    "cap_setgid",
    "cap_setuid",
    "cap_setpcap",
    "cap_linux_immutable",
    "cap_net_bind_service",
    "cap_net_broadcast",
    "cap_net_admin",
    "cap_net_raw",
    "cap_ipc_lock",
    "cap_ipc_owner",
    "cap_sys_module",
    "cap_sys_rawio",
    "cap_sys_chroot",
    "cap_sys_ptrace",
    "cap_sys_pacct",
    "cap_sys_admin",
    "cap_sys_boot",
    "cap_sys_nice",
    "cap_sys_resource",
    "cap_sys_time",
    "cap_sys_tty_config",
    "cap_mknod",
    "cap_lease",
    "cap_audit_write",
    "cap_audit_control",
    "cap_setfcap",
    "cap_mac_override",
    "cap_mac_admin",
    "cap_syslog",
    "cap_wake_alarm",
    "cap_block_suspend",
    "cap_audit_read",
    "cap_perfmon",
    "cap_bpf",
    "cap_checkpoint_restore",
});

}  // namespace

std::span<const std::string_view> Capabilities() { return kCapabilities; }

std::optional<unsigned int> CapabilityNumber(std::string_view name) {
  const auto* const found = std::ranges::find(kCapabilities, name);
  if (found == kCapabilities.end()) return std::nullopt;
  return static_cast<unsigned int>(std::distance(kCapabilities.begin(), found));
}

}  // namespace Policy
