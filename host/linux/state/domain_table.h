#pragma once

#include <bit>
#include <cstdint>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/linux/common/text_map.h"
#include "teskctl/security.h"

namespace LinuxHost {

class HostState;

// The number of domain slots; identifiers are less than it.
constexpr unsigned int kDomainSlots = 512;

// The domain that worlds start in. Built in, and never destroyed.
constexpr unsigned int kStartDomain = 0;

// The longest name of a domain in bytes: with its NUL it fills the 64 bytes that a caller of the
// kernel has for it.
constexpr std::size_t kMaxDomainName = 63;

// A part that one domain of the host plays.
enum class DomainRole : unsigned int { GlobalVm = 1, IoFilter = 2, DaemonFramework = 3 };

struct Domain {
  unsigned int id = 0;
  std::string name;
  std::string level;
  TeskCtl::Security::TeskAccessKsi_DefaultDom defaultRules =
      TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
  bool createdAtRunTime = false;
};

// What keeps a domain in use.
struct DomainReferences {
  unsigned int worlds = 0;       // living worlds that were placed in it
  unsigned int transitions = 0;  // granted transitions into it from other domains
  unsigned int roles = 0;        // parts that it plays: bit n - 1 for the one with the number n

  unsigned int Sum() const {
    return worlds + transitions + static_cast<unsigned int>(std::popcount(roles));
  }
};

// A domain as it was at one moment.
struct DomainDescription {
  Domain domain;
  DomainReferences references;

  // The parts that it plays; bit 3 is set when it was created at run time.
  unsigned int StateWord() const;
};

// The domains, as of the last HostState::Refresh(); what changes them looks again itself. Failures
// are HostErrors.
class DomainTable {
 public:
  explicit DomainTable(HostState& owner);

  // The domain, null when there is none. Holds until the table changes.
  const Domain* Find(std::string_view name);
  const Domain* Find(unsigned int id);

  // The same, but throws when there is none.
  const Domain& Get(std::string_view name);
  const Domain& Get(unsigned int id);

  // Creates a domain in the lowest free slot and returns its identifier. A policy's domain that
  // exists with the same default rules is returned as it is; any other taken name is refused, and
  // so is a name that cannot be one, and any name when no slot is free.
  unsigned int Create(const std::string& name,
                      TeskCtl::Security::TeskAccessKsi_DefaultDom defaultRules,
                      bool createdAtRunTime);

  // Destroys a domain, its rules and policies, and the rules of others that name it. Throws for
  // the start domain and for one in which worlds run or that plays a part.
  void Destroy(unsigned int id);

  // Creates those domains that do not exist, and destroys those that do (the start domain is left
  // out); all or none.
  void AddMissing(const std::vector<std::string>& names);
  void RemoveNamed(const std::vector<std::string>& names);

  // Throws for a word that is no enforcement level.
  void SetLevel(const std::string& name, const std::string& level);

  // The domain takes the part over from the one that had it.
  void SetRole(DomainRole role, unsigned int id);
  bool HasRole(DomainRole role, unsigned int id);

  void AddGuestService(unsigned int id, const std::string& service);
  std::vector<std::string> GuestServices(unsigned int id);

  DomainReferences CountReferences(const Domain& domain);

  // The domain as it is now, with what refers to it; empty when there is none.
  std::optional<DomainDescription> Describe(unsigned int id);

  // The domains that were created at run time and that nothing refers to now, in ascending order.
  std::vector<unsigned int> Leaked();

  // The version of the table that the state is at now.
  std::int64_t Version() const { return version; }
  void Notice(std::int64_t currentVersion);
  void Forget();

  // From now on no domain is found by one of these names, until a domain of the name is wanted
  // anew. Replaces the names that were hidden before.
  void Hide(std::set<std::string, std::less<>> names) { hidden = std::move(names); }

 private:
  class Change;

  void Load();
  unsigned int LowestFreeSlot() const;
  unsigned int RolesOf(unsigned int id);
  unsigned int Insert(const std::string& name,
                      TeskCtl::Security::TeskAccessKsi_DefaultDom defaultRules,
                      bool createdAtRunTime);
  void Erase(unsigned int id);

  HostState& state;
  std::int64_t version = 0;
  bool loaded = false;
  std::vector<std::unique_ptr<Domain>> slots;
  TextMap<unsigned int> identifiers;
  std::set<std::string, std::less<>> hidden;
};

}  // namespace LinuxHost
