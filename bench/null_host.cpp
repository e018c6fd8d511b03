// A host that does nothing at no cost, so that only the library's own work is measured.
#include "kitlibs/file.h"
#include "orinconfigstore/config_store.h"
#include "teskctl/adv.h"
#include "teskctl/security.h"
#include "teskctl/sysinfo.h"
#include "teskctl/system.h"
#include "zorvan/kernel.h"

bool File_Exists(const char*) { return false; }
bool File_IsDirectory(const char*) { return false; }

namespace Zorvan::Kernel {

CallResult Call(std::uint32_t, std::initializer_list<std::uint64_t>) { return {0, 0}; }
int SetXattr(const char*, const char*, const void*, std::size_t, int) { return 0; }
ssize_t GetXattr(const char*, const char*, void*, std::size_t) { return 0; }
int RealPath(const char*, char*) { return -1; }

}  // namespace Zorvan::Kernel

namespace TeskCtl::System {

bool SyslogIsRunning() { return false; }
void WriteToKlog(const std::string&, const std::string&) {}

}  // namespace TeskCtl::System

Braxo::Adv::AdvancedOption* TeskCtl::Adv::AdvancedOptionImpl::FindOption(const std::string&) {
  return nullptr;
}

namespace OrinConfigStore {

std::shared_ptr<StoreObject> GetDesiredUserConfig(const ConfigStoreObjectId&, FLAG) { return {}; }
void SetBootStatus(const ConfigStoreObjectId&, bool) {}

}  // namespace OrinConfigStore

namespace TeskCtl::Util {

class Sysinfo::Impl {};
Sysinfo::Sysinfo(SysinfoNode) {}
Sysinfo::~Sysinfo() = default;
void Sysinfo::AddInstancePath(unsigned long) {}
void Sysinfo::Get(void*, unsigned int) {}

}  // namespace TeskCtl::Util

namespace TeskCtl::Security {

using Interface = TeskAccessInterfaceImpl;

class Interface::Impl {};
Interface::TeskAccessInterfaceImpl() = default;
Interface::~TeskAccessInterfaceImpl() = default;

bool Interface::FindDomain(const std::string&, unsigned int*) { return true; }
unsigned int Interface::CreateDomain(const std::string&, TeskAccessKsi_DefaultDom) { return 1; }
unsigned int Interface::GetMaxDomains() { return 0; }
bool Interface::GetCompleteDomainInfo(unsigned int, std::string&, std::string&, unsigned int&,
                                      unsigned int&, unsigned int&, TeskAccessKsi_DefaultDom&) {
  return false;
}
bool Interface::EnableDomain(const std::string&, const std::string&, bool) { return true; }
bool Interface::SetGlobalVMDomain(unsigned int) { return true; }
bool Interface::SetIoFilterDomain(unsigned int) { return true; }
bool Interface::SetDaemonFrameworkDomain(unsigned int) { return true; }
bool Interface::IsPrivilegedVm(const std::string&) { return false; }
void Interface::AddGcomService(unsigned int, const std::string&) {}
bool Interface::ValidateKeyword(TeskAccess_KeywordType, const std::string&) { return true; }
std::map<std::string, long> Interface::GetKeywordsMap(TeskAccess_KeywordType) { return {}; }
unsigned int Interface::LookupLabel(const std::string&, TeskAccessLabelType) { return 2; }
std::string Interface::GetLabel(unsigned int, TeskAccessLabelType) { return {}; }
bool Interface::IsPredefinedLabel(const std::string&, TeskAccessLabelType) { return false; }
std::vector<std::string> Interface::GetInvalidLabels(TeskAccessLabelType) { return {}; }
bool Interface::AddLabels(std::vector<std::string>, TeskAccessLabelType) { return true; }
bool Interface::RemoveLabels(std::vector<std::string>, TeskAccessLabelType) { return true; }
void Interface::SetSyscallRule(TeskAccess_SyscallRule) {}
void Interface::SetCapabilityRule(TeskAccess_CapabilityRule) {}
void Interface::SetCapabilityParamRule(TeskAccess_CapabilityParamRule) {}
void Interface::SetObjectAccessRule(TeskAccess_ObjectAccessRule) {}
void Interface::SetDomTransRule(TeskAccess_DomTransRule) {}
void Interface::SetFileCreationRule(TeskAccess_FileCreationRule) {}
void Interface::SetUnixSockCreationRule(TeskAccess_UnixSockCreationRule) {}
void Interface::SetFilePathAccessRules(std::list<TeskAccess_FilePathAccessRule>&) {}
void Interface::GetFilePathAccessRules(unsigned int, std::list<TeskAccess_FilePathAccessRule>&) {}
void Interface::GetSyscallRules(unsigned int, std::list<TeskAccess_SyscallRule>&) {}
void Interface::GetCapabilityRules(unsigned int, std::list<TeskAccess_CapabilityRule>&) {}
void Interface::GetCapabilityParamRules(unsigned int, std::list<TeskAccess_CapabilityParamRule>&) {}
void Interface::GetObjectAccessRules(unsigned int, std::list<TeskAccess_ObjectAccessRule>&) {}
void Interface::GetDomTransRules(unsigned int, std::list<TeskAccess_DomTransRule>&) {}
void Interface::GetFileCreationRules(unsigned int, std::list<TeskAccess_FileCreationRule>&) {}
void Interface::GetUnixSockCreationRules(unsigned int,
                                         std::list<TeskAccess_UnixSockCreationRule>&) {}
bool Interface::CheckCapabilityParamRuleConstraints(const std::string&,
                                                    std::list<TeskAccess_CapabilityParamRule>&) {
  return true;
}
std::vector<std::string> Interface::GetTardiskLaunchDomains() { return {}; }
std::string Interface::GetTardiskExecEventKeyword() { return {}; }
std::string Interface::GetDefaultTardiskLabel() { return {}; }
std::string Interface::GetDefaultTardiskDomain() { return {}; }

}  // namespace TeskCtl::Security
