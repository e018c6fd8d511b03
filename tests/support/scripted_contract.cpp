// The host contract, answered by the current scripted host.

#include <sys/stat.h>
#include <sys/xattr.h>

#include <algorithm>
#include <cerrno>
#include <cstdarg>
#include <cstring>

#include "kitlibs/file.h"
#include "orinconfigstore/config_store.h"
#include "support/print.h"
#include "support/scripted_host.h"
#include "teskctl/adv.h"
#include "teskctl/security.h"
#include "teskctl/sysinfo.h"
#include "teskctl/system.h"
#include "zorvan/kernel.h"

namespace SecPolicyTest {
namespace {

ScriptedHost& Host() { return ScriptedHost::Current(); }

// For the parts of the contract that leave errno as it was.
class KeepErrno {
 public:
  KeepErrno() = default;
  KeepErrno(const KeepErrno&) = delete;
  KeepErrno& operator=(const KeepErrno&) = delete;
  ~KeepErrno() { errno = saved; }

 private:
  int saved = errno;
};

// Two rules name the same thing when they differ in no more than line and verdict.
template <class Rule>
std::string NameOf(Rule rule) {
  rule.line = 0;
  rule.grant = false;
  return Print(rule);
}

std::string NameOf(TeskCtl::Security::TeskAccess_FilePathAccessRule rule) {
  rule.line = 0;
  rule.permissions.clear();
  return Print(rule);
}

template <class Rule>
void Install(std::list<Rule>& rules, const Rule& rule) {
  std::erase_if(rules, [&](const Rule& other) { return NameOf(other) == NameOf(rule); });
  rules.push_back(rule);
}

template <class Rule>
void Append(std::list<Rule>& rules, const std::list<Rule>& installed) {
  rules.insert(rules.end(), installed.begin(), installed.end());
}

// ---- Kernel calls: what each argument is, in order.

enum class Argument { kNumber, kSigned, kText, kPointer, kOut, kRules };

std::vector<Argument> Signature(std::uint32_t number) {
  using enum Argument;
  switch (number) {
    case 0x4059:
      return {kText, kNumber, kOut};
    case 0x405a:
      return {kNumber};
    case 0x405b:
      return {kNumber, kText, kNumber};
    case 0x405c:
      return {kSigned, kNumber, kText};
    case 0x405d:
      return {kNumber, kPointer, kNumber};
    case 0x405e:
      return {kNumber, kOut};
    case 0x405f:
      return {kSigned, kNumber, kRules, kNumber, kOut};
    case 0x4061:
      return {kNumber, kNumber, kSigned};
    case 0x4062:
      return {kNumber, kNumber, kPointer, kSigned};
    case 0x4064:
      return {kPointer, kPointer, kNumber};
    case 0x4065:
      return {kSigned, kOut};
    case 0x4066:
      return {kNumber, kPointer, kNumber};
    case 0x4067:
      return {kText, kText};
    case 0x413e:
      return {kNumber, kNumber, kPointer};
    default:
      return {};
  }
}

template <class Target>
const Target* Pointer(std::uint64_t address) {
  return reinterpret_cast<const Target*>(static_cast<std::uintptr_t>(address));
}

std::string PrintRules(std::span<const std::uint64_t> args, std::size_t index) {
  const auto* rules = Pointer<TeskAccess_FileRule>(args[index]);
  if (rules == nullptr) return "null";
  if (index + 1 >= args.size()) return "rules";
  return PrintAll(std::span(rules, args[index + 1]));
}

std::string PrintArgument(Argument kind, std::span<const std::uint64_t> args, std::size_t index) {
  const std::uint64_t value = args[index];
  switch (kind) {
    case Argument::kNumber:
      return std::to_string(value);
    case Argument::kSigned:
      return std::to_string(static_cast<std::int64_t>(value));
    case Argument::kText:
      return Print(Pointer<char>(value));
    case Argument::kPointer:
      return value == 0 ? "null" : "&buffer";
    case Argument::kOut:
      return value == 0 ? "null" : "&out";
    case Argument::kRules:
      return PrintRules(args, index);
  }
  return {};
}

std::string PrintKernelCall(std::uint32_t number, std::span<const std::uint64_t> args) {
  char digits[16];
  std::snprintf(digits, sizeof digits, "0x%04x", number);
  std::string text = digits;
  const std::vector<Argument> signature = Signature(number);
  for (std::size_t index = 0; index < args.size(); ++index) {
    const Argument kind = index < signature.size() ? signature[index] : Argument::kNumber;
    text += ", " + PrintArgument(kind, args, index);
  }
  return text;
}

// ---- Options and stored objects.

class OtherOption : public Braxo::Adv::AdvancedOption {
 public:
  explicit OtherOption(const std::string& optionPath) : path(optionPath) { ++Host().aliveOptions; }
  ~OtherOption() override {
    --Host().aliveOptions;
    Host().Note("~AdvancedOption", Print(path));
  }

 private:
  std::string path;
};

class IntegerOption : public Braxo::Adv::AdvancedIntegerOption {
 public:
  IntegerOption(const std::string& optionPath, long optionValue)
      : path(optionPath), value(optionValue) {
    ++Host().aliveOptions;
  }
  ~IntegerOption() override {
    --Host().aliveOptions;
    Host().Note("~AdvancedOption", Print(path));
  }
  long GetValue() const override {
    Host().Enter("AdvancedIntegerOption::GetValue", Print(path));
    return value;
  }

 private:
  std::string path;
  long value;
};

class StoredObject : public OrinConfigStore::StoreObject {
 public:
  explicit StoredObject(const std::map<std::string, std::string>& storedValues)
      : values(storedValues) {}
  bool GetValue(const char* key, std::string* value) const override {
    Host().Enter("StoreObject::GetValue", Print(key));
    const auto stored = values.find(key);
    if (stored == values.end()) return false;
    *value = stored->second;
    return true;
  }

 private:
  std::map<std::string, std::string> values;
};

ScriptedHost::Components ComponentsOf(const OrinConfigStore::ConfigStoreObjectId& id) {
  return {id.Component(0), id.Component(1), id.Component(2), id.Component(3)};
}

std::string PrintId(const OrinConfigStore::ConfigStoreObjectId& id) {
  return "{" + Arguments(id.Component(0), id.Component(1), id.Component(2), id.Component(3)) + "}";
}

std::string PriorityName(int priority) {
  if (priority == 3) return "LOG_ERR";
  if (priority == 6) return "LOG_INFO";
  return std::to_string(priority);
}

void RecordSyslog(int priority, const char* format, va_list arguments) {
  std::string text = PriorityName(priority) + ", " + Print(format);
  const std::string_view known = format;
  if (known == "%s" || known == "Error: %s") {
    text += ", " + Print(va_arg(arguments, const char*));
  }
  Host().Note("syslog", text);
}

}  // namespace
}  // namespace SecPolicyTest

using SecPolicyTest::Arguments;
using SecPolicyTest::Print;
using SecPolicyTest::PrintAll;
using SecPolicyTest::ScriptedHost;

// ---- The C library's syslog, plain and as fortified programs call it.

extern "C" __attribute__((visibility("default"))) void syslog(int priority, const char* format,
                                                              ...) {
  va_list arguments;
  va_start(arguments, format);
  SecPolicyTest::RecordSyslog(priority, format, arguments);
  va_end(arguments);
}

extern "C" __attribute__((visibility("default"))) void __syslog_chk(int priority, int /*flag*/,
                                                                    const char* format, ...) {
  va_list arguments;
  va_start(arguments, format);
  SecPolicyTest::RecordSyslog(priority, format, arguments);
  va_end(arguments);
}

// ---- Files.

bool File_Exists(const char* path) {
  ScriptedHost& host = ScriptedHost::Current();
  host.Note("File_Exists", Print(path));
  const auto kind = host.fileKinds.find(path);
  if (kind != host.fileKinds.end()) return kind->second != ScriptedHost::FileKind::kMissing;
  struct stat attributes = {};
  return stat(path, &attributes) == 0;
}

bool File_IsDirectory(const char* path) {
  ScriptedHost& host = ScriptedHost::Current();
  host.Note("File_IsDirectory", Print(path));
  const auto kind = host.fileKinds.find(path);
  if (kind != host.fileKinds.end()) return kind->second == ScriptedHost::FileKind::kDirectory;
  struct stat attributes = {};
  return stat(path, &attributes) == 0 && S_ISDIR(attributes.st_mode);
}

// ---- Logs.

namespace TeskCtl::System {

bool SyslogIsRunning() {
  errno = EXFULL;
  return ScriptedHost::Current().syslogRunning;
}

void WriteToKlog(const std::string& message, const std::string& tag) {
  ScriptedHost::Current().Enter("WriteToKlog", Arguments(message, tag));
}

}  // namespace TeskCtl::System

// ---- Inode records.

namespace TeskCtl::Util {

class Sysinfo::Impl {
 public:
  unsigned long instance = 0;
};

Sysinfo::Sysinfo(SysinfoNode node) {
  ScriptedHost& host = ScriptedHost::Current();
  host.Enter("Sysinfo", Print(static_cast<unsigned int>(node)));
  impl = std::make_unique<Impl>();
  ++host.aliveReaders;
}

Sysinfo::~Sysinfo() {
  ScriptedHost& host = ScriptedHost::Current();
  host.Note("~Sysinfo", "");
  --host.aliveReaders;
}

void Sysinfo::AddInstancePath(unsigned long instance) {
  ScriptedHost& host = ScriptedHost::Current();
  host.Enter("Sysinfo::AddInstancePath", host.InodeName(instance));
  impl->instance = instance;
}

void Sysinfo::Get(void* buffer, unsigned int size) {
  ScriptedHost& host = ScriptedHost::Current();
  host.Enter("Sysinfo::Get", Print(size));
  if (size != 548) throw Braxo::Lib::BraxoException("inode record: wrong size");
  const std::string record = host.InodeRecord(impl->instance);
  std::memcpy(buffer, record.data(), std::min<std::size_t>(record.size(), size));
}

}  // namespace TeskCtl::Util

// ---- Wanted settings.

namespace TeskCtl::Adv {

Braxo::Adv::AdvancedOption* AdvancedOptionImpl::FindOption(const std::string& path) {
  ScriptedHost& host = ScriptedHost::Current();
  host.Enter("FindOption", Print(path));
  const auto option = host.options.find(path);
  if (option == host.options.end()) return nullptr;
  if (!option->second) return new SecPolicyTest::OtherOption(path);
  return new SecPolicyTest::IntegerOption(path, *option->second);
}

}  // namespace TeskCtl::Adv

namespace OrinConfigStore {

std::shared_ptr<StoreObject> GetDesiredUserConfig(const ConfigStoreObjectId& id, FLAG flag) {
  ScriptedHost& host = ScriptedHost::Current();
  host.Enter("GetDesiredUserConfig",
             SecPolicyTest::PrintId(id) + ", " + std::to_string(static_cast<int>(flag)));
  const auto object = host.storedObjects.find(SecPolicyTest::ComponentsOf(id));
  if (object == host.storedObjects.end()) return nullptr;
  return std::make_shared<SecPolicyTest::StoredObject>(object->second);
}

void SetBootStatus(const ConfigStoreObjectId& id, bool applied) {
  ScriptedHost::Current().Enter("SetBootStatus",
                                SecPolicyTest::PrintId(id) + ", " + Print(applied));
}

}  // namespace OrinConfigStore

// ---- The kernel.

namespace Zorvan::Kernel {

CallResult Call(std::uint32_t number, std::initializer_list<std::uint64_t> args) {
  const SecPolicyTest::KeepErrno keepErrno;
  ScriptedHost& host = ScriptedHost::Current();
  const std::span<const std::uint64_t> arguments(args.begin(), args.size());
  host.Note("Call", SecPolicyTest::PrintKernelCall(number, arguments));
  return host.AnswerKernelCall(number, arguments);
}

int SetXattr(const char* path, const char* name, const void* value, std::size_t size, int flags) {
  ScriptedHost& host = ScriptedHost::Current();
  const int errnoBefore = errno;
  std::uint32_t id = 0;
  std::memcpy(&id, value, std::min(size, sizeof id));
  host.Note("SetXattr",
            Arguments(path, name, id) + ", " + std::to_string(size) + ", " + std::to_string(flags));
  const std::optional<int> fault =
      *path == '\0' ? std::optional(ENOENT) : host.ErrnoFault("SetXattr", path);
  if (fault) {
    errno = *fault == 0 ? errnoBefore : *fault;
    return -1;
  }
  host.attributes[path].assign(static_cast<const char*>(value), size);
  return 0;
}

ssize_t GetXattr(const char* path, const char* name, void* value, std::size_t size) {
  ScriptedHost& host = ScriptedHost::Current();
  const int errnoBefore = errno;
  host.Note("GetXattr", Arguments(path, name) + ", " + std::to_string(size));
  const std::optional<int> fault =
      *path == '\0' ? std::optional(ENOENT) : host.ErrnoFault("GetXattr", path);
  if (fault) {
    errno = *fault == 0 ? errnoBefore : *fault;
    return -1;
  }
  if (!host.attributes.contains(path)) host.SetAttribute(path, 2);
  const std::string& attribute = host.attributes[path];
  if (attribute.size() > size) {
    errno = ERANGE;
    return -1;
  }
  std::memcpy(value, attribute.data(), attribute.size());
  return static_cast<ssize_t>(attribute.size());
}

int RealPath(const char* path, char* resolved) {
  ScriptedHost& host = ScriptedHost::Current();
  host.Note("RealPath", Print(path));
  const std::optional<int> fault =
      *path == '\0' ? std::optional(ENOENT) : host.ErrnoFault("RealPath", path);
  if (fault) {
    errno = *fault;
    return -1;
  }
  const auto target = host.realPaths.find(path);
  const std::string real = target == host.realPaths.end() ? path : target->second;
  if (real.size() >= sizeof(TeskCtl::Security::TeskAccess_FileRule::path)) {
    errno = ENAMETOOLONG;
    return -1;
  }
  std::memcpy(resolved, real.c_str(), real.size() + 1);
  return 0;
}

}  // namespace Zorvan::Kernel

// ---- The access-control module.

namespace TeskCtl::Security {
namespace {

[[noreturn]] void Refuse(const std::string& message) { throw Braxo::Lib::BraxoException(message); }

}  // namespace

class TeskAccessInterfaceImpl::Impl {
 public:
  ScriptedHost& host = ScriptedHost::Current();
};

TeskAccessInterfaceImpl::TeskAccessInterfaceImpl() {
  const SecPolicyTest::KeepErrno keepErrno;
  ScriptedHost::Current().Enter("TeskAccessInterfaceImpl", "");
  impl = std::make_unique<Impl>();
  ++impl->host.aliveInterfaces;
}

TeskAccessInterfaceImpl::~TeskAccessInterfaceImpl() {
  const SecPolicyTest::KeepErrno keepErrno;
  impl->host.Note("~TeskAccessInterfaceImpl", "");
  --impl->host.aliveInterfaces;
}

bool TeskAccessInterfaceImpl::FindDomain(const std::string& name, unsigned int* id) {
  impl->host.Enter("FindDomain", Print(name));
  if (impl->host.hiddenDomains.contains(name)) return false;
  for (const auto& [slot, domain] : impl->host.domains) {
    if (domain.name != name) continue;
    *id = slot;
    return true;
  }
  return false;
}

unsigned int TeskAccessInterfaceImpl::CreateDomain(const std::string& name,
                                                   TeskAccessKsi_DefaultDom dflt) {
  impl->host.Enter("CreateDomain", Arguments(name, dflt));
  const unsigned int slot = impl->host.DeclareDomain(name);
  impl->host.domains[slot].dflt = dflt;
  return slot;
}

unsigned int TeskAccessInterfaceImpl::GetMaxDomains() {
  impl->host.Enter("GetMaxDomains", "");
  if (impl->host.maxDomains) return *impl->host.maxDomains;
  return impl->host.domains.empty() ? 0 : impl->host.domains.rbegin()->first + 1;
}

bool TeskAccessInterfaceImpl::GetCompleteDomainInfo(unsigned int id, std::string& name,
                                                    std::string& enforcementLevel,
                                                    unsigned int& state, unsigned int& refCount,
                                                    unsigned int& worldRefCount,
                                                    TeskAccessKsi_DefaultDom& dflt) {
  const auto domain = impl->host.domains.find(id);
  const bool known = domain != impl->host.domains.end();
  if (known && domain->second.namedBeforeFailure) name = domain->second.name;
  impl->host.Enter("GetCompleteDomainInfo", Print(id));
  if (!known) return false;
  name = domain->second.name;
  enforcementLevel = domain->second.level;
  state = domain->second.state;
  refCount = domain->second.refCount;
  worldRefCount = domain->second.worldRefCount;
  dflt = domain->second.dflt;
  return true;
}

bool TeskAccessInterfaceImpl::EnableDomain(const std::string& name, const std::string& level,
                                           bool flag) {
  impl->host.Enter("EnableDomain", Arguments(name, level, flag));
  for (auto& [slot, domain] : impl->host.domains) {
    if (domain.name == name) domain.level = level;
  }
  return impl->host.Result("EnableDomain");
}

bool TeskAccessInterfaceImpl::SetGlobalVMDomain(unsigned int id) {
  impl->host.Enter("SetGlobalVMDomain", Print(id));
  return impl->host.Result("SetGlobalVMDomain");
}

bool TeskAccessInterfaceImpl::SetIoFilterDomain(unsigned int id) {
  impl->host.Enter("SetIoFilterDomain", Print(id));
  return impl->host.Result("SetIoFilterDomain");
}

bool TeskAccessInterfaceImpl::SetDaemonFrameworkDomain(unsigned int id) {
  impl->host.Enter("SetDaemonFrameworkDomain", Print(id));
  return impl->host.Result("SetDaemonFrameworkDomain");
}

bool TeskAccessInterfaceImpl::IsPrivilegedVm(const std::string& name) {
  impl->host.Enter("IsPrivilegedVm", Print(name));
  return impl->host.privilegedVms.contains(name);
}

void TeskAccessInterfaceImpl::AddGcomService(unsigned int id, const std::string& service) {
  impl->host.Enter("AddGcomService", Arguments(id, service));
}

bool TeskAccessInterfaceImpl::ValidateKeyword(TeskAccess_KeywordType type,
                                              const std::string& word) {
  impl->host.Enter("ValidateKeyword", Arguments(type, word));
  if (impl->host.strict) {
    const auto isNamed = [&](const auto& slot) { return slot.second.name == word; };
    const bool isLabel = type == TESKACCESS_KEYWORD_LABEL &&
                         (impl->host.LabelId(word, TESKACCESS_LABEL_OBJECT) != 1 ||
                          std::ranges::any_of(impl->host.domains, isNamed));
    if (!isLabel && !impl->host.keywords[type].contains(word)) Refuse("unknown word " + word);
  }
  return impl->host.Result("ValidateKeyword");
}

std::map<std::string, long> TeskAccessInterfaceImpl::GetKeywordsMap(TeskAccess_KeywordType type) {
  impl->host.Enter("GetKeywordsMap", Print(type));
  if (impl->host.strict && type == TESKACCESS_KEYWORD_LABEL) {
    const auto& labels = impl->host.labels[TESKACCESS_LABEL_OBJECT];
    return {labels.begin(), labels.end()};
  }
  return impl->host.keywords[type];
}

unsigned int TeskAccessInterfaceImpl::LookupLabel(const std::string& name,
                                                  TeskAccessLabelType type) {
  impl->host.Enter("LookupLabel", Arguments(name, type));
  return impl->host.LabelId(name, type);
}

std::string TeskAccessInterfaceImpl::GetLabel(unsigned int id, TeskAccessLabelType type) {
  impl->host.Enter("GetLabel", Arguments(id, type));
  for (const auto& [name, known] : impl->host.labels[type]) {
    if (known == id) return name;
  }
  Refuse("unknown label identifier " + std::to_string(id));
}

bool TeskAccessInterfaceImpl::IsPredefinedLabel(const std::string& name, TeskAccessLabelType type) {
  impl->host.Enter("IsPredefinedLabel", Arguments(name, type));
  return impl->host.predefinedLabels.contains(name);
}

std::vector<std::string> TeskAccessInterfaceImpl::GetInvalidLabels(TeskAccessLabelType type) {
  impl->host.Enter("GetInvalidLabels", Print(type));
  return impl->host.invalidLabels[type];
}

bool TeskAccessInterfaceImpl::AddLabels(std::vector<std::string> names, TeskAccessLabelType type) {
  impl->host.Enter("AddLabels", PrintAll(names) + ", " + Print(type));
  auto& labels = impl->host.labels[type];
  for (const std::string& name : names) {
    unsigned int next = 2;
    for (const auto& [other, id] : labels) next = std::max(next, id + 1);
    labels.emplace(name, next);
  }
  return impl->host.Result("AddLabels");
}

bool TeskAccessInterfaceImpl::RemoveLabels(std::vector<std::string> names,
                                           TeskAccessLabelType type) {
  impl->host.Enter("RemoveLabels", PrintAll(names) + ", " + Print(type));
  for (const std::string& name : names) impl->host.labels[type].erase(name);
  return impl->host.Result("RemoveLabels");
}

void TeskAccessInterfaceImpl::SetSyscallRule(TeskAccess_SyscallRule rule) {
  impl->host.Enter("SetSyscallRule", Print(rule));
  SecPolicyTest::Install(impl->host.rules[rule.domainId].syscall, rule);
}

void TeskAccessInterfaceImpl::SetCapabilityRule(TeskAccess_CapabilityRule rule) {
  impl->host.Enter("SetCapabilityRule", Print(rule));
  SecPolicyTest::Install(impl->host.rules[rule.domainId].capability, rule);
}

void TeskAccessInterfaceImpl::SetCapabilityParamRule(TeskAccess_CapabilityParamRule rule) {
  impl->host.Enter("SetCapabilityParamRule", Print(rule));
  SecPolicyTest::Install(impl->host.rules[rule.domainId].capabilityParam, rule);
}

void TeskAccessInterfaceImpl::SetObjectAccessRule(TeskAccess_ObjectAccessRule rule) {
  impl->host.Enter("SetObjectAccessRule", Print(rule));
  SecPolicyTest::Install(impl->host.rules[rule.domainId].objectAccess, rule);
}

void TeskAccessInterfaceImpl::SetDomTransRule(TeskAccess_DomTransRule rule) {
  impl->host.Enter("SetDomTransRule", Print(rule));
  SecPolicyTest::Install(impl->host.rules[rule.domainId].domTrans, rule);
}

void TeskAccessInterfaceImpl::SetFileCreationRule(TeskAccess_FileCreationRule rule) {
  impl->host.Enter("SetFileCreationRule", Print(rule));
  SecPolicyTest::Install(impl->host.rules[rule.domainId].fileCreation, rule);
}

void TeskAccessInterfaceImpl::SetUnixSockCreationRule(TeskAccess_UnixSockCreationRule rule) {
  impl->host.Enter("SetUnixSockCreationRule", Print(rule));
  SecPolicyTest::Install(impl->host.rules[rule.domainId].unixSockCreation, rule);
}

void TeskAccessInterfaceImpl::SetFilePathAccessRules(
    std::list<TeskAccess_FilePathAccessRule>& rules) {
  impl->host.Enter("SetFilePathAccessRules", PrintAll(rules));
  for (const auto& rule : rules) {
    SecPolicyTest::Install(impl->host.rules[rule.domainId].filePathAccess, rule);
  }
}

void TeskAccessInterfaceImpl::GetFilePathAccessRules(
    unsigned int domainId, std::list<TeskAccess_FilePathAccessRule>& rules) {
  impl->host.Enter("GetFilePathAccessRules", Print(domainId));
  SecPolicyTest::Append(rules, impl->host.rules[domainId].filePathAccess);
}

void TeskAccessInterfaceImpl::GetSyscallRules(unsigned int domainId,
                                              std::list<TeskAccess_SyscallRule>& rules) {
  impl->host.Enter("GetSyscallRules", Print(domainId));
  SecPolicyTest::Append(rules, impl->host.rules[domainId].syscall);
}

void TeskAccessInterfaceImpl::GetCapabilityRules(unsigned int domainId,
                                                 std::list<TeskAccess_CapabilityRule>& rules) {
  impl->host.Enter("GetCapabilityRules", Print(domainId));
  SecPolicyTest::Append(rules, impl->host.rules[domainId].capability);
}

void TeskAccessInterfaceImpl::GetCapabilityParamRules(
    unsigned int domainId, std::list<TeskAccess_CapabilityParamRule>& rules) {
  impl->host.Enter("GetCapabilityParamRules", Print(domainId));
  SecPolicyTest::Append(rules, impl->host.rules[domainId].capabilityParam);
}

void TeskAccessInterfaceImpl::GetObjectAccessRules(unsigned int domainId,
                                                   std::list<TeskAccess_ObjectAccessRule>& rules) {
  impl->host.Enter("GetObjectAccessRules", Print(domainId));
  SecPolicyTest::Append(rules, impl->host.rules[domainId].objectAccess);
}

void TeskAccessInterfaceImpl::GetDomTransRules(unsigned int domainId,
                                               std::list<TeskAccess_DomTransRule>& rules) {
  impl->host.Enter("GetDomTransRules", Print(domainId));
  SecPolicyTest::Append(rules, impl->host.rules[domainId].domTrans);
}

void TeskAccessInterfaceImpl::GetFileCreationRules(unsigned int domainId,
                                                   std::list<TeskAccess_FileCreationRule>& rules) {
  impl->host.Enter("GetFileCreationRules", Print(domainId));
  SecPolicyTest::Append(rules, impl->host.rules[domainId].fileCreation);
}

void TeskAccessInterfaceImpl::GetUnixSockCreationRules(
    unsigned int domainId, std::list<TeskAccess_UnixSockCreationRule>& rules) {
  impl->host.Enter("GetUnixSockCreationRules", Print(domainId));
  SecPolicyTest::Append(rules, impl->host.rules[domainId].unixSockCreation);
}

bool TeskAccessInterfaceImpl::CheckCapabilityParamRuleConstraints(
    const std::string& domainName, std::list<TeskAccess_CapabilityParamRule>& rules) {
  impl->host.Enter("CheckCapabilityParamRuleConstraints",
                   Print(domainName) + ", " + PrintAll(rules));
  return impl->host.Result("CheckCapabilityParamRuleConstraints");
}

std::vector<std::string> TeskAccessInterfaceImpl::GetTardiskLaunchDomains() {
  impl->host.Enter("GetTardiskLaunchDomains", "");
  return impl->host.tardiskLaunchDomains;
}

std::string TeskAccessInterfaceImpl::GetTardiskExecEventKeyword() {
  impl->host.Enter("GetTardiskExecEventKeyword", "");
  return impl->host.tardiskExecEventKeyword;
}

std::string TeskAccessInterfaceImpl::GetDefaultTardiskLabel() {
  impl->host.Enter("GetDefaultTardiskLabel", "");
  return impl->host.defaultTardiskLabel;
}

std::string TeskAccessInterfaceImpl::GetDefaultTardiskDomain() {
  impl->host.Enter("GetDefaultTardiskDomain", "");
  return impl->host.defaultTardiskDomain;
}

}  // namespace TeskCtl::Security
