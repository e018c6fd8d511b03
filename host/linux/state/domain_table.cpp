#include "host/linux/state/domain_table.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <string_view>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/require_text.h"
#include "host/linux/state/label_table.h"
#include "host/linux/state/removal.h"
#include "policy/installed_policy.h"
#include "policy/level.h"

using Braxo::Misc::StrCat;
using TeskCtl::Security::TeskAccessKsi_DefaultDom;

namespace LinuxHost {
namespace {

constexpr TextLimit kDomainName = {.noun = "domain name",
                                   .whenEmpty = "a domain name must not be empty",
                                   .maxSize = kMaxDomainName};
constexpr TextLimit kService = {.noun = "guest-communication service",
                                .whenEmpty = "a guest-communication service must not be empty",
                                .maxSize = 255};

// The bit of the state word, and the name in the state, of a role.
struct RoleName {
  DomainRole role;
  unsigned int bit;
  const char* name;
};
constexpr std::array<RoleName, 3> kRoles = {{
    {DomainRole::GlobalVm, Policy::kRoleGlobalVm, "global VM"},
    {DomainRole::IoFilter, Policy::kRoleIoFilter, "IO filter"},
    {DomainRole::DaemonFramework, Policy::kRoleDaemonFramework, "daemon framework"},
}};

const RoleName& RowOf(DomainRole role) {
  return *std::find_if(kRoles.begin(), kRoles.end(),
                       [&](const auto& row) { return row.role == role; });
}

// The domain of a row of id, name, level, default_rules, created_at_run_time.
Domain ReadDomain(const Rows& rows) {
  return {.id = static_cast<unsigned int>(rows.Integer(0)),
          .name = rows.Text(1),
          .level = rows.Text(2),
          .defaultRules = static_cast<TeskAccessKsi_DefaultDom>(rows.Integer(3)),
          .createdAtRunTime = rows.Integer(4) != 0};
}

}  // namespace

// One transaction that changes the table, in the state and in memory alike. What is in memory is
// dropped when the transaction is undone.
class DomainTable::Change {
 public:
  explicit Change(DomainTable& changed) : table(changed), transaction(changed.base.Database()) {
    table.base.Refresh();
  }
  Change(const Change&) = delete;
  Change& operator=(const Change&) = delete;
  ~Change() {
    if (!committed) table.loadedVersion.reset();
  }

  void Commit() {
    const bool isCurrent = table.loadedVersion == table.base.DomainVersion();
    table.base.CommitDomains(transaction);
    if (isCurrent) table.loadedVersion = table.base.DomainVersion();
    committed = true;
  }

 private:
  DomainTable& table;
  Transaction transaction;
  bool committed = false;
};

void DomainTable::Load() {
  if (loadedVersion == base.DomainVersion()) return;
  slots.clear();
  slots.resize(kDomainSlots);
  identifiers.clear();
  Rows rows = base.Database().Select(
      "SELECT id, name, level, default_rules, created_at_run_time FROM domain");
  while (rows.Next()) {
    auto domain = std::make_unique<Domain>(ReadDomain(rows));
    const unsigned int id = domain->id;
    if (id >= slots.size())
      throw HostError(EUCLEAN,
                      StrCat("the host state holds a domain ", id, " beyond the last slot"));
    identifiers.emplace(domain->name, id);
    slots[id] = std::move(domain);
  }
  loadedVersion = base.DomainVersion();
}

const Domain* DomainTable::Find(std::string_view name) {
  if (hidden.contains(name)) return nullptr;
  Load();
  const auto found = identifiers.find(name);
  return found == identifiers.end() ? nullptr : Find(found->second);
}

const Domain* DomainTable::Find(unsigned int id) {
  Load();
  return id < slots.size() ? slots[id].get() : nullptr;
}

const Domain& DomainTable::Get(std::string_view name) {
  const Domain* domain = Find(name);
  if (domain == nullptr) throw HostError(ENOENT, StrCat("unknown domain '", name, "'"));
  return *domain;
}

const Domain& DomainTable::Get(unsigned int id) {
  const Domain* domain = Find(id);
  if (domain == nullptr) throw HostError(ENOENT, StrCat("unknown domain ", id));
  return *domain;
}

std::optional<HostError> DomainTable::Refusal(const DomainReference& reference) {
  const Domain* domain = Find(reference.id);
  if (domain == nullptr) return HostError(ENOENT, StrCat("unknown domain ", reference.id));
  if (reference.name.empty() || domain->name == reference.name) return std::nullopt;
  return HostError(ENOENT, StrCat("domain ", reference.id, " is '", domain->name, "', not '",
                                  reference.name, "'"));
}

// A domain's name is also its label, with the same identifier; kNoLabel is therefore no slot. Nor
// is one in which the module still has processes: they would get the rules of the new domain.
unsigned int DomainTable::LowestFreeSlot() {
  for (unsigned int id = 0; id < kDomainSlots; ++id) {
    if (id != kNoLabel && !slots[id] && !worlds.IsKeptIn(id)) return id;
  }
  return kDomainSlots;
}

unsigned int DomainTable::Create(const std::string& name, TeskAccessKsi_DefaultDom defaultRules,
                                 bool createdAtRunTime) {
  Change change(*this);
  hidden.erase(name);
  if (const Domain* existing = Find(name)) {
    // Of two loaders that missed the same domain, the second one gets the first one's.
    if (!createdAtRunTime && existing->defaultRules == defaultRules) return existing->id;
    throw HostError(EEXIST, StrCat("domain '", name, "' exists already"));
  }
  const unsigned int id = Insert(name, defaultRules, createdAtRunTime);
  change.Commit();
  return id;
}

unsigned int DomainTable::Insert(const std::string& name, TeskAccessKsi_DefaultDom defaultRules,
                                 bool createdAtRunTime) {
  RequireText(name, kDomainName);
  if (defaultRules != TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE &&
      defaultRules != TeskCtl::Security::TESKACCESS_DEFAULT_DOM_CHECK_ACCESS) {
    throw HostError(EINVAL, StrCat("unknown default rules ", static_cast<int>(defaultRules),
                                   " for domain '", name, "'"));
  }
  const unsigned int id = LowestFreeSlot();
  if (id == kDomainSlots) {
    throw HostError(ENOSPC, StrCat("cannot create domain '", name, "': all ", kDomainSlots - 1,
                                   " domains are in use"));
  }
  const char* const level = Policy::TextOf(Policy::kLevels.front());
  base.Database().Run("INSERT INTO domain VALUES (?1, ?2, ?3, ?4, ?5)", id, name, level,
                      static_cast<int>(defaultRules), createdAtRunTime);
  slots[id] = std::make_unique<Domain>(Domain{id, name, level, defaultRules, createdAtRunTime});
  identifiers.emplace(name, id);
  return id;
}

void DomainTable::Destroy(unsigned int id) {
  Change change(*this);
  Erase(id);
  change.Commit();
}

void DomainTable::Erase(unsigned int id) {
  const Domain domain = Get(id);
  if (domain.id == kStartDomain) {
    throw HostError(EPERM, StrCat("domain '", domain.name, "' is built in"));
  }
  const DomainReferences references = CountReferences(domain);
  if (references.worlds + references.roles != 0) {
    throw HostError(EBUSY, StrCat("domain '", domain.name, "' is in use"));
  }
  RemoveWithRules(base.Database(), domain);
  identifiers.erase(domain.name);
  slots[domain.id].reset();
}

void DomainTable::AddMissing(const std::vector<std::string>& names) {
  Change change(*this);
  for (const auto& name : names) {
    if (Find(name) != nullptr) continue;
    Insert(name, TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE, false);
  }
  change.Commit();
}

void DomainTable::RemoveNamed(const std::vector<std::string>& names) {
  Change change(*this);
  for (const auto& name : names) {
    const Domain* domain = Find(name);
    if (domain == nullptr || domain->id == kStartDomain) continue;
    Erase(domain->id);
  }
  change.Commit();
}

void DomainTable::SetLevel(const std::string& name, const std::string& level) {
  if (!Policy::FindLevel(level)) {
    const std::string problem = level.empty() ? std::string("no enforcement level")
                                              : StrCat("unknown enforcement level '", level, "'");
    throw HostError(EINVAL, StrCat(problem, " for domain '", name,
                                   "': it must be enforcing, permissive or disabled"));
  }
  Change change(*this);
  const unsigned int id = Get(name).id;
  base.Database().Run("UPDATE domain SET level = ?1 WHERE id = ?2", level, id);
  slots[id]->level = level;
  change.Commit();
}

void DomainTable::SetRole(DomainRole role, unsigned int id) {
  Transaction transaction(base.Database());
  base.Refresh();
  Get(id);
  base.Database().Run("INSERT OR REPLACE INTO role VALUES (?1, ?2)", RowOf(role).name, id);
  transaction.Commit();
}

bool DomainTable::HasRole(DomainRole role, unsigned int id) {
  return (RolesOf(id) & RowOf(role).bit) != 0;
}

unsigned int DomainTable::RolesOf(unsigned int id) {
  unsigned int roles = 0;
  Rows rows = base.Database().Select("SELECT name FROM role WHERE domain_id = ?1", id);
  while (rows.Next()) {
    const std::string name = rows.Text(0);
    for (const auto& row : kRoles) {
      if (row.name == name) roles |= row.bit;
    }
  }
  return roles;
}

void DomainTable::AddGuestService(unsigned int id, const std::string& service) {
  RequireText(service, kService);
  Transaction transaction(base.Database());
  base.Refresh();
  Get(id);
  base.Database().Run("INSERT OR IGNORE INTO guest_service VALUES (?1, ?2)", id, service);
  transaction.Commit();
}

std::vector<std::string> DomainTable::GuestServices(unsigned int id) {
  std::vector<std::string> services;
  Rows rows = base.Database().Select(
      "SELECT service FROM guest_service WHERE domain_id = ?1 ORDER BY service", id);
  while (rows.Next()) services.push_back(rows.Text(0));
  return services;
}

DomainReferences DomainTable::CountReferences(const Domain& domain, bool isNow) {
  DomainReferences references;
  references.worlds = worlds.CountIn(domain.id, isNow);
  Rows rows = base.Database().Select(
      "SELECT count(*) FROM rule WHERE kind = 'domain transition' AND word2 = ?1 AND granted AND "
      "domain_id <> ?2",
      domain.name, domain.id);
  rows.Next();
  references.transitions = static_cast<unsigned int>(rows.Integer(0));
  references.roles = RolesOf(domain.id);
  return references;
}

std::optional<DomainDescription> DomainTable::Describe(unsigned int id) {
  const Snapshot snapshot(base.Database());
  // Not the one in memory, which may be older than what is counted.
  Rows rows = base.Database().Select(
      "SELECT id, name, level, default_rules, created_at_run_time FROM domain WHERE id = ?1", id);
  if (!rows.Next()) return std::nullopt;
  DomainDescription description{.domain = ReadDomain(rows), .references = {}};
  description.references = CountReferences(description.domain, false);
  return description;
}

unsigned int DomainDescription::StateWord() const {
  return references.roles | (domain.createdAtRunTime ? Policy::kCreatedAtRunTime : 0);
}

std::vector<unsigned int> DomainTable::Leaked() {
  base.Refresh();
  Load();
  std::vector<unsigned int> leaked;
  for (const auto& slot : slots) {
    if (slot && slot->createdAtRunTime && CountReferences(*slot).Sum() == 0) {
      leaked.push_back(slot->id);
    }
  }
  return leaked;
}

}  // namespace LinuxHost
