// The access-control module as the contract shows it: takes its records apart, and leaves the rest
// to the tables. Each interface object keeps the state that was in use when it was made. What only
// looks begins with Fresh(), so that it sees what others have just done; what changes something
// uses Any(), since the tables look for themselves within their transaction. No constructor or
// destructor changes errno: callers read it after calls that made an interface on the way.
#include <cerrno>
#include <string>
#include <utility>
#include <vector>

#include "braxo/misc/strcat.h"
#include "host/linux/common/errno_guard.h"
#include "host/linux/common/host_error.h"
#include "host/linux/kernel/module_publication.h"
#include "host/linux/state/host_state.h"
#include "policy/rule.h"
#include "teskctl/security.h"

using Braxo::Misc::StrCat;
using LinuxHost::Domain;
using LinuxHost::DomainRole;
using LinuxHost::ErrnoGuard;
using LinuxHost::FilePolicy;
using LinuxHost::HostError;
using LinuxHost::HostState;
using Policy::RuleKind;

namespace TeskCtl::Security {
namespace {

// Installs the rule of a record into the table of its kind.
template <class Table, class Record, class... Target>
void Install(Table& table, Record& record, Target... target) {
  const LinuxHost::DomainReference domain{record.domainId, record.domainName};
  table.Install(domain, Policy::TakeRule(record), target...);
}

// Appends the records of rules of the domain.
template <class Record>
void Append(std::vector<Policy::Rule> rules, const Domain& domain, std::list<Record>& records) {
  for (Policy::Rule& rule : rules) {
    Record& record = records.emplace_back();
    record.domainId = domain.id;
    record.domainName = domain.name;
    Policy::MoveInto(record, rule);
  }
}

template <class Record>
void ReadRules(HostState& state, unsigned int domainId, RuleKind kind, std::list<Record>& records) {
  const Domain& domain = state.Domains().Get(domainId);
  Append(state.Rules().Read(domainId, kind), domain, records);
}

// A label space; throws for a number that is none.
bool IsDomainLabel(TeskAccessLabelType type) {
  if (type == TESKACCESS_LABEL_DOMAIN) return true;
  if (type == TESKACCESS_LABEL_OBJECT) return false;
  throw HostError(EINVAL, StrCat("unknown label type ", static_cast<int>(type)));
}

}  // namespace

class TeskAccessInterfaceImpl::Impl {
 public:
  // The state as it is now.
  HostState& Fresh() {
    state->Refresh();
    return *state;
  }

  // The state as it was last looked at, for calls that look themselves.
  HostState& Any() { return *state; }

 private:
  const LinuxHost::CommitFollower follower;
  std::shared_ptr<HostState> state = HostState::Current().shared_from_this();
};

TeskAccessInterfaceImpl::TeskAccessInterfaceImpl() {
  const ErrnoGuard guard;
  impl = std::make_unique<Impl>();
}

TeskAccessInterfaceImpl::~TeskAccessInterfaceImpl() {
  const ErrnoGuard guard;
  impl.reset();
}

bool TeskAccessInterfaceImpl::FindDomain(const std::string& name, unsigned int* id) {
  const Domain* domain = impl->Fresh().Domains().Find(name);
  if (domain == nullptr) return false;
  *id = domain->id;
  return true;
}

unsigned int TeskAccessInterfaceImpl::CreateDomain(const std::string& name,
                                                   TeskAccessKsi_DefaultDom dflt) {
  return impl->Any().Domains().Create(name, dflt, false);
}

unsigned int TeskAccessInterfaceImpl::GetMaxDomains() { return LinuxHost::kDomainSlots; }

bool TeskAccessInterfaceImpl::GetCompleteDomainInfo(unsigned int id, std::string& name,
                                                    std::string& enforcementLevel,
                                                    unsigned int& state, unsigned int& refCount,
                                                    unsigned int& worldRefCount,
                                                    TeskAccessKsi_DefaultDom& dflt) {
  if (id >= LinuxHost::kDomainSlots) {
    throw HostError(
        EINVAL, StrCat("domain ", id, " is beyond the last slot ", LinuxHost::kDomainSlots - 1));
  }
  // Most slots are empty, which takes no query to see.
  if (impl->Fresh().Domains().Find(id) == nullptr) return false;
  const auto description = impl->Any().Domains().Describe(id);
  if (!description) return false;
  name = description->domain.name;
  enforcementLevel = description->domain.level;
  state = description->StateWord();
  refCount = description->references.Sum();
  worldRefCount = description->references.worlds;
  dflt = description->domain.defaultRules;
  return true;
}

// A level is all that a domain can be switched to here.
bool TeskAccessInterfaceImpl::EnableDomain(const std::string& name, const std::string& level,
                                           bool /*flag*/) {
  impl->Any().Domains().SetLevel(name, level);
  return true;
}

bool TeskAccessInterfaceImpl::SetGlobalVMDomain(unsigned int id) {
  impl->Any().Domains().SetRole(DomainRole::GlobalVm, id);
  return true;
}

bool TeskAccessInterfaceImpl::SetIoFilterDomain(unsigned int id) {
  impl->Any().Domains().SetRole(DomainRole::IoFilter, id);
  return true;
}

bool TeskAccessInterfaceImpl::SetDaemonFrameworkDomain(unsigned int id) {
  impl->Any().Domains().SetRole(DomainRole::DaemonFramework, id);
  return true;
}

bool TeskAccessInterfaceImpl::IsPrivilegedVm(const std::string& name) {
  auto& domains = impl->Fresh().Domains();
  const Domain* domain = domains.Find(name);
  return domain != nullptr && domains.HasRole(DomainRole::GlobalVm, domain->id);
}

void TeskAccessInterfaceImpl::AddGcomService(unsigned int id, const std::string& service) {
  impl->Any().Domains().AddGuestService(id, service);
}

bool TeskAccessInterfaceImpl::ValidateKeyword(TeskAccess_KeywordType type,
                                              const std::string& word) {
  if (const auto refusal = impl->Fresh().Keywords().Refusal(type, word)) throw *refusal;
  return true;
}

std::map<std::string, long> TeskAccessInterfaceImpl::GetKeywordsMap(TeskAccess_KeywordType type) {
  return impl->Fresh().Keywords().All(type);
}

unsigned int TeskAccessInterfaceImpl::LookupLabel(const std::string& name,
                                                  TeskAccessLabelType type) {
  if (!IsDomainLabel(type)) return impl->Fresh().Labels().Lookup(name);
  const Domain* domain = impl->Fresh().Domains().Find(name);
  return domain == nullptr ? LinuxHost::kNoLabel : domain->id;
}

std::string TeskAccessInterfaceImpl::GetLabel(unsigned int id, TeskAccessLabelType type) {
  return IsDomainLabel(type) ? impl->Fresh().Domains().Get(id).name
                             : impl->Fresh().Labels().Name(id);
}

bool TeskAccessInterfaceImpl::IsPredefinedLabel(const std::string& name, TeskAccessLabelType type) {
  if (!IsDomainLabel(type)) return LinuxHost::LabelTable::IsPredefined(name);
  const Domain* domain = impl->Fresh().Domains().Find(name);
  return domain != nullptr && domain->id == LinuxHost::kStartDomain;
}

// An identifier is never used again, so that the value of a label never becomes invalid.
std::vector<std::string> TeskAccessInterfaceImpl::GetInvalidLabels(TeskAccessLabelType type) {
  IsDomainLabel(type);
  return {};
}

bool TeskAccessInterfaceImpl::AddLabels(std::vector<std::string> names, TeskAccessLabelType type) {
  if (IsDomainLabel(type)) {
    impl->Any().Domains().AddMissing(names);
  } else {
    impl->Any().Labels().Add(names);
  }
  return true;
}

bool TeskAccessInterfaceImpl::RemoveLabels(std::vector<std::string> names,
                                           TeskAccessLabelType type) {
  if (IsDomainLabel(type)) {
    impl->Any().Domains().RemoveNamed(names);
  } else {
    impl->Any().Labels().Remove(names);
  }
  return true;
}

void TeskAccessInterfaceImpl::SetSyscallRule(TeskAccess_SyscallRule rule) {
  Install(impl->Any().Rules(), rule);
}

void TeskAccessInterfaceImpl::SetCapabilityRule(TeskAccess_CapabilityRule rule) {
  Install(impl->Any().Rules(), rule);
}

void TeskAccessInterfaceImpl::SetCapabilityParamRule(TeskAccess_CapabilityParamRule rule) {
  Install(impl->Any().ParameterRules(), rule);
}

void TeskAccessInterfaceImpl::SetObjectAccessRule(TeskAccess_ObjectAccessRule rule) {
  Install(impl->Any().Rules(), rule);
}

void TeskAccessInterfaceImpl::SetDomTransRule(TeskAccess_DomTransRule rule) {
  Install(impl->Any().Rules(), rule, rule.targetDomainId);
}

void TeskAccessInterfaceImpl::SetFileCreationRule(TeskAccess_FileCreationRule rule) {
  Install(impl->Any().Rules(), rule);
}

void TeskAccessInterfaceImpl::SetUnixSockCreationRule(TeskAccess_UnixSockCreationRule rule) {
  Install(impl->Any().Rules(), rule);
}

void TeskAccessInterfaceImpl::SetFilePathAccessRules(
    std::list<TeskAccess_FilePathAccessRule>& rules) {
  std::vector<FilePolicy> policies;
  for (const auto& rule : rules) {
    policies.push_back({.domain = {rule.domainId, rule.domainName},
                        .path = rule.path,
                        .permission = Policy::Permissions::Parse(rule.permissions).Bits(),
                        .line = rule.line});
  }
  impl->Any().FilePolicies().Install(policies);
}

void TeskAccessInterfaceImpl::GetFilePathAccessRules(
    unsigned int domainId, std::list<TeskAccess_FilePathAccessRule>& rules) {
  HostState& state = impl->Fresh();
  const Domain& domain = state.Domains().Get(domainId);
  Append(state.FilePolicies().Read(domainId), domain, rules);
}

void TeskAccessInterfaceImpl::GetSyscallRules(unsigned int domainId,
                                              std::list<TeskAccess_SyscallRule>& rules) {
  ReadRules(impl->Fresh(), domainId, RuleKind::kSyscall, rules);
}

void TeskAccessInterfaceImpl::GetCapabilityRules(unsigned int domainId,
                                                 std::list<TeskAccess_CapabilityRule>& rules) {
  ReadRules(impl->Fresh(), domainId, RuleKind::kCapability, rules);
}

void TeskAccessInterfaceImpl::GetCapabilityParamRules(
    unsigned int domainId, std::list<TeskAccess_CapabilityParamRule>& rules) {
  HostState& state = impl->Fresh();
  const Domain& domain = state.Domains().Get(domainId);
  Append(state.ParameterRules().Read(domainId), domain, rules);
}

void TeskAccessInterfaceImpl::GetObjectAccessRules(unsigned int domainId,
                                                   std::list<TeskAccess_ObjectAccessRule>& rules) {
  ReadRules(impl->Fresh(), domainId, RuleKind::kObjectAccess, rules);
}

void TeskAccessInterfaceImpl::GetDomTransRules(unsigned int domainId,
                                               std::list<TeskAccess_DomTransRule>& rules) {
  std::list<TeskAccess_DomTransRule> read;
  ReadRules(impl->Fresh(), domainId, RuleKind::kDomainTransition, read);
  // A domain takes the transitions into it along: one that is gone by now was just destroyed.
  auto& domains = impl->Fresh().Domains();
  read.remove_if([&](auto& rule) {
    const Domain* target = domains.Find(rule.targetDomain);
    if (target != nullptr) rule.targetDomainId = target->id;
    return target == nullptr;
  });
  rules.splice(rules.end(), read);
}

void TeskAccessInterfaceImpl::GetFileCreationRules(unsigned int domainId,
                                                   std::list<TeskAccess_FileCreationRule>& rules) {
  ReadRules(impl->Fresh(), domainId, RuleKind::kFileCreation, rules);
}

void TeskAccessInterfaceImpl::GetUnixSockCreationRules(
    unsigned int domainId, std::list<TeskAccess_UnixSockCreationRule>& rules) {
  ReadRules(impl->Fresh(), domainId, RuleKind::kUnixSocketCreation, rules);
}

bool TeskAccessInterfaceImpl::CheckCapabilityParamRuleConstraints(
    const std::string& domainName, std::list<TeskAccess_CapabilityParamRule>& rules) {
  impl->Fresh().Domains().Get(domainName);
  LinuxHost::RequireNoConflict(rules);
  return true;
}

std::vector<std::string> TeskAccessInterfaceImpl::GetTardiskLaunchDomains() {
  return {"hostDom", "daemonFrameworkDom"};
}

std::string TeskAccessInterfaceImpl::GetTardiskExecEventKeyword() {
  return LinuxHost::kTardiskExec;
}

std::string TeskAccessInterfaceImpl::GetDefaultTardiskLabel() {
  return LinuxHost::kDefaultTardiskLabel;
}

std::string TeskAccessInterfaceImpl::GetDefaultTardiskDomain() { return "appDom"; }

}  // namespace TeskCtl::Security
