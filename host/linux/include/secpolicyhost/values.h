#pragma once

#include <cstdint>

#include "teskctl/security.h"

/// What the numbers of the runtime interface mean on this host. Policy files write the words
/// instead: "cap_kill" for kCapKill, "bind_port" for kCheckBindPort.
namespace LinuxHost {

/// A capability, by its name in Linux; the number is this host's own.
/// @{
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapChown{0};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapDacOverride{1};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapDacReadSearch{2};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapFowner{3};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapFsetid{4};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapKill{5};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapSetgid{6};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapSetuid{7};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapSetpcap{8};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapNetBindService{9};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapNetAdmin{10};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapNetRaw{11};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapIpcLock{12};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapSysModule{13};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapSysRawio{14};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapSysChroot{15};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapSysPtrace{16};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapSysAdmin{17};
inline constexpr TeskCtl::Security::TeskAccess_Capability kCapSysBoot{18};
/// @}

/// A parameter check.
/// @{
inline constexpr TeskCtl::Security::TeskAccess_ParamCheck kCheckSocketFamily{0};
inline constexpr TeskCtl::Security::TeskAccess_ParamCheck kCheckSocketType{1};
inline constexpr TeskCtl::Security::TeskAccess_ParamCheck kCheckBindPort{2};
inline constexpr TeskCtl::Security::TeskAccess_ParamCheck kCheckConnectPort{3};
inline constexpr TeskCtl::Security::TeskAccess_ParamCheck kCheckIoctlRequest{4};
inline constexpr TeskCtl::Security::TeskAccess_ParamCheck kCheckPrctlOption{5};
inline constexpr TeskCtl::Security::TeskAccess_ParamCheck kCheckCloneFlags{6};
inline constexpr TeskCtl::Security::TeskAccess_ParamCheck kCheckKillSignal{7};
inline constexpr TeskCtl::Security::TeskAccess_ParamCheck kCheckSetUid{8};
inline constexpr TeskCtl::Security::TeskAccess_ParamCheck kCheckSetGid{9};
/// @}

/// What a file policy may permit, the letters "r", "w" and "x"; joined by `|`.
/// @{
inline constexpr unsigned int kPermitRead = 0x1;
inline constexpr unsigned int kPermitWrite = 0x2;
inline constexpr unsigned int kPermitExecute = 0x10;
/// @}

/// A kernel call (zorvan/kernel.h) of this host's own: places the living world of its first
/// argument in the domain of the second, for the rest of its life or until it is placed elsewhere.
/// Where the module keeps the policy that counts in the kernel at once, for all its threads;
/// elsewhere it is recorded, and confines nobody.
inline constexpr std::uint32_t kCallPlaceWorld = 0x5000;

}  // namespace LinuxHost
