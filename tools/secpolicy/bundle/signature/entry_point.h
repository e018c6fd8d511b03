#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace SecPolicyCli {

// What libsecpolicy-signature.so offers, as its symbol SecPolicySignature. Keys are Ed25519 keys in
// PEM without a passphrase; what is no such key has no result.
struct SignatureFunctions {
  // Makes the engine ready, which reads nothing of the system's from then on.
  void (*prepare)();

  std::optional<std::string> (*sign)(std::string_view privateKey, std::string_view text);
  std::optional<bool> (*isSigned)(std::string_view publicKey, std::string_view text,
                                  std::string_view signature);

  // The bytes of the public key itself, of either key.
  std::optional<std::string> (*publicBytes)(std::string_view key, bool isPrivate);
};

}  // namespace SecPolicyCli
