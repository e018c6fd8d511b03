#pragma once

#include <bit>
#include <cstddef>
#include <string>
#include <string_view>

#include "policy/limits.h"
#include "teskctl/security.h"

namespace LinuxHost {

// The number of domain slots; identifiers are less than it.
constexpr unsigned int kDomainSlots = 512;

// The domain that worlds start in. Built in, and never destroyed.
constexpr unsigned int kStartDomain = 0;

// The longest name of a domain in bytes: with its NUL it fills the 64 bytes that a caller of the
// kernel has for it.
constexpr std::size_t kMaxDomainName = Policy::kLongestDomainName;

// What one domain of the host is for.
enum class DomainRole : unsigned int { GlobalVm = 1, IoFilter = 2, DaemonFramework = 3 };

struct Domain {
  unsigned int id = 0;
  std::string name;
  std::string level;
  TeskCtl::Security::TeskAccessKsi_DefaultDom defaultRules =
      TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
  bool createdAtRunTime = false;
};

// A domain as a caller knows it. The name may be empty: then the identifier alone counts.
struct DomainReference {
  unsigned int id = 0;
  std::string_view name;
};

// What keeps a domain in use.
struct DomainReferences {
  unsigned int worlds = 0;       // living worlds that were placed in it
  unsigned int transitions = 0;  // granted transitions into it from other domains
  unsigned int roles = 0;        // that it has: bit n - 1 for the one with the number n

  unsigned int Sum() const {
    return worlds + transitions + static_cast<unsigned int>(std::popcount(roles));
  }
};

// A domain as it was at one moment.
struct DomainDescription {
  Domain domain;
  DomainReferences references;

  // Its roles; bit 3 is set when it was created at run time.
  unsigned int StateWord() const;
};

}  // namespace LinuxHost
