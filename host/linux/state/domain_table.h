#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/linux/common/host_error.h"
#include "host/linux/common/text_map.h"
#include "host/linux/state/domain.h"
#include "host/linux/state/state_base.h"
#include "host/linux/state/world_table.h"

namespace LinuxHost {

// The domains, as of the last StateBase::Refresh(); what changes them looks again itself. Failures
// are HostErrors.
class DomainTable {
 public:
  DomainTable(StateBase& stateBase, WorldTable& worldTable) : base(stateBase), worlds(worldTable) {}

  // The domain, null when there is none. Holds until the table changes.
  const Domain* Find(std::string_view name);
  const Domain* Find(unsigned int id);

  // The same, but throws when there is none.
  const Domain& Get(std::string_view name);
  const Domain& Get(unsigned int id);

  // Why the reference is to no domain; empty when it is to one.
  std::optional<HostError> Refusal(const DomainReference& reference);

  // Creates a domain in the lowest free slot and returns its identifier. A policy's domain that
  // exists with the same default rules is returned as it is; any other taken name is refused, and
  // so is a name that cannot be one, and any name when no slot is free.
  unsigned int Create(const std::string& name,
                      TeskCtl::Security::TeskAccessKsi_DefaultDom defaultRules,
                      bool createdAtRunTime);

  // Destroys a domain, its rules and policies, and the rules of others that name it. Throws for
  // the start domain and for one in which worlds run or that has a role.
  void Destroy(unsigned int id);

  // Creates those domains that do not exist, and destroys those that do (the start domain is left
  // out); all or none.
  void AddMissing(const std::vector<std::string>& names);
  void RemoveNamed(const std::vector<std::string>& names);

  // Throws for a word that is no enforcement level.
  void SetLevel(const std::string& name, const std::string& level);

  // The domain takes the role over from the one that had it.
  void SetRole(DomainRole role, unsigned int id);
  bool HasRole(DomainRole role, unsigned int id);

  void AddGuestService(unsigned int id, const std::string& service);
  std::vector<std::string> GuestServices(unsigned int id);

  // `isNow`: as WorldTable::CountIn() has it.
  DomainReferences CountReferences(const Domain& domain, bool isNow = true);

  // The domain as it is now, with what refers to it; empty when there is none.
  std::optional<DomainDescription> Describe(unsigned int id);

  // The domains that were created at run time and that nothing refers to now, in ascending order.
  std::vector<unsigned int> Leaked();

  // From now on no domain is found by one of these names, until a domain of the name is wanted
  // anew. Replaces the names that were hidden before.
  void Hide(std::set<std::string, std::less<>> names) { hidden = std::move(names); }

 private:
  class Change;

  void Load();
  unsigned int LowestFreeSlot();
  unsigned int RolesOf(unsigned int id);
  unsigned int Insert(const std::string& name,
                      TeskCtl::Security::TeskAccessKsi_DefaultDom defaultRules,
                      bool createdAtRunTime);
  void Erase(unsigned int id);

  StateBase& base;
  WorldTable& worlds;
  std::optional<std::int64_t> loadedVersion;
  std::vector<std::unique_ptr<Domain>> slots;
  TextMap<unsigned int> identifiers;
  std::set<std::string, std::less<>> hidden;
};

}  // namespace LinuxHost
