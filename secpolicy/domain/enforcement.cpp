#include "secpolicy/domain/enforcement.h"

#include <algorithm>
#include <cctype>

#include "orinconfigstore/config_store.h"

namespace SecPolicy {
namespace {

std::string LowerCased(std::string text) {
  std::transform(text.begin(), text.end(), text.begin(),
                 [](unsigned char letter) { return static_cast<char>(std::tolower(letter)); });
  return text;
}

// Which words are levels is the kernel's business; an absent one is passed on as empty.
void RestoreEnforcement(const std::string& domainName, TeskAccessInterfaceImpl& access) {
  const OrinConfigStore::ConfigStoreObjectId objectId("domain_settings", "security", "orin",
                                                      domainName);
  const auto settings = OrinConfigStore::GetDesiredUserConfig(objectId, OrinConfigStore::FLAG_NONE);
  if (settings == nullptr) return;

  std::string level;
  settings->GetValue("enforcement_level", &level);
  access.EnableDomain(domainName, LowerCased(std::move(level)), false);
  OrinConfigStore::SetBootStatus(objectId, true);
}

}  // namespace

void RestoreDomainEnforcement(TeskAccessInterfaceImpl& access) {
  const unsigned int slots = access.GetMaxDomains();
  for (unsigned int id = 0; id < slots; ++id) {
    std::string name;
    std::string level;
    unsigned int state = 0;
    unsigned int refCount = 0;
    unsigned int worldRefCount = 0;
    auto dflt = TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
    if (!access.GetCompleteDomainInfo(id, name, level, state, refCount, worldRefCount, dflt)) {
      continue;
    }
    RestoreEnforcement(name, access);
  }
}

}  // namespace SecPolicy
