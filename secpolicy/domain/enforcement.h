#pragma once

#include "secpolicy/secpolicy.h"

namespace SecPolicy {

// Gives every installed domain the enforcement level that the configuration store holds for it;
// domains without stored settings keep theirs. Throws at the first failure; domains with higher
// identifiers keep their level.
void RestoreDomainEnforcement(TeskAccessInterfaceImpl& access);

}  // namespace SecPolicy
