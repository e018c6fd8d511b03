#pragma once

#include <map>
#include <optional>
#include <string>
#include <vector>

#include "policy/level.h"
#include "policy/rule.h"
#include "teskctl/security.h"

// What is installed, as values. Everything throws what the access-control module throws.
namespace Policy {

// Bits of the state word of a domain: its roles, and how it came to be.
inline constexpr unsigned int kRoleGlobalVm = 0x1;
inline constexpr unsigned int kRoleIoFilter = 0x2;
inline constexpr unsigned int kRoleDaemonFramework = 0x4;
inline constexpr unsigned int kRoles = kRoleGlobalVm | kRoleIoFilter | kRoleDaemonFramework;
inline constexpr unsigned int kCreatedAtRunTime = 0x8;

struct InstalledDomain {
  std::string name;
  unsigned int id = 0;
  Level level = kLevels.front();
  unsigned int state = 0;
  unsigned int references = 0;
  unsigned int worldReferences = 0;
  TeskCtl::Security::TeskAccessKsi_DefaultDom defaultRules =
      TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
  bool isGone = false;      // a load installed it, and the latest one has not found its file
  std::vector<Rule> rules;  // by kind; of one kind, as they were installed

  // Whether it has a role, which a host has one domain for.
  bool HasRole() const { return (state & kRoles) != 0; }
  bool IsCreatedAtRunTime() const { return (state & kCreatedAtRunTime) != 0; }
};

struct InstalledPolicy {
  std::vector<InstalledDomain> domains;  // in ascending order of their identifiers
  std::map<std::string, unsigned int> objects;
};

// The domain in the slot `id` with its rules; nothing for an empty slot. Where rules were written
// and what is gone is for others to say.
std::optional<InstalledDomain> ReadDomain(TeskCtl::Security::TeskAccessInterfaceImpl& access,
                                          unsigned int id);

// All domains and objects.
InstalledPolicy ReadPolicy(TeskCtl::Security::TeskAccessInterfaceImpl& access);

// The domains without their rules, in ascending order of their identifiers.
std::vector<InstalledDomain> ListDomains(TeskCtl::Security::TeskAccessInterfaceImpl& access);

// The transitions into the domain `target` that domains are granted, each once.
std::vector<Rule> ReadTransitionsInto(const std::string& target,
                                      TeskCtl::Security::TeskAccessInterfaceImpl& access);

}  // namespace Policy
