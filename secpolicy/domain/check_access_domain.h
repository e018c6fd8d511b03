#pragma once

#include "secpolicy/secpolicy.h"

namespace SecPolicy {

// Creates the domain "checkAccessTemplateDom", with one rule for the whole file tree, when the host
// option asks for it; a template domain that exists is left as it is. Throws what the host throws.
void CreateCheckAccessPolicyDomain(TeskAccessInterfaceImpl& access);

}  // namespace SecPolicy
