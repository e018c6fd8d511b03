#pragma once

#include <string>
#include <vector>

#include "bundle/signature.h"

namespace SecPolicyCli {

// Where the public keys lie whose bundles this host takes.
inline constexpr char kTrustedKeysDir[] = "/etc/secpolicy/bundle-keys";

// The keys in `files` or, where none is named, all NAME.pem in kTrustedKeysDir. Throws Refusal when
// there are none, for what is no key, and for a file that others than this user and root may write,
// of kTrustedKeysDir also for a directory above it; where `files` lie is for who names them to
// know. Throws BraxoException when they cannot be read.
std::vector<VerifyingKey> TrustedKeys(const std::vector<std::string>& files);

}  // namespace SecPolicyCli
