// All that libsecpolicy-signature.so shows. Found by its name, which C++ would decorate.
#include "bundle/signature/entry_point.h"

#include <openssl/crypto.h>
#include <openssl/evp.h>
#include <openssl/pem.h>

#include <array>
#include <memory>

namespace SecPolicyCli {
namespace {

template <class Type, void (*Release)(Type*)>
struct Releaser {
  void operator()(Type* object) const { Release(object); }
};

void ReleaseBio(BIO* bio) { BIO_free(bio); }

using Bio = std::unique_ptr<BIO, Releaser<BIO, ReleaseBio>>;
using Key = std::unique_ptr<EVP_PKEY, Releaser<EVP_PKEY, EVP_PKEY_free>>;
using Digest = std::unique_ptr<EVP_MD_CTX, Releaser<EVP_MD_CTX, EVP_MD_CTX_free>>;

constexpr std::size_t kSignatureSize = 64;
constexpr std::size_t kPublicKeySize = 32;

const unsigned char* BytesOf(std::string_view text) {
  return reinterpret_cast<const unsigned char*>(text.data());
}

// Nobody is asked for a passphrase.
int RefusePassphrase(char* /*buffer*/, int /*size*/, int /*isWriting*/, void* /*user*/) {
  return -1;
}

Key ReadKey(std::string_view pem, bool isPrivate) {
  const Bio input(BIO_new_mem_buf(pem.data(), static_cast<int>(pem.size())));
  if (!input) return nullptr;
  const auto read = isPrivate ? PEM_read_bio_PrivateKey : PEM_read_bio_PUBKEY;
  Key key(read(input.get(), nullptr, RefusePassphrase, nullptr));
  if (!key || EVP_PKEY_is_a(key.get(), "ED25519") != 1) return nullptr;
  return key;
}

// The configuration of the engine names libraries to load, and below a root it would be somebody
// else's.
void Prepare() {
  OPENSSL_init_crypto(OPENSSL_INIT_NO_LOAD_CONFIG, nullptr);
  const Digest digest(EVP_MD_CTX_new());
}

std::optional<std::string> Sign(std::string_view privateKey, std::string_view text) {
  const Key key = ReadKey(privateKey, true);
  const Digest digest(EVP_MD_CTX_new());
  if (!key || !digest) return std::nullopt;
  std::array<unsigned char, kSignatureSize> bytes{};
  std::size_t size = bytes.size();
  if (EVP_DigestSignInit(digest.get(), nullptr, nullptr, nullptr, key.get()) != 1 ||
      EVP_DigestSign(digest.get(), bytes.data(), &size, BytesOf(text), text.size()) != 1) {
    return std::nullopt;
  }
  return std::string(bytes.begin(), bytes.begin() + static_cast<std::ptrdiff_t>(size));
}

std::optional<bool> IsSigned(std::string_view publicKey, std::string_view text,
                             std::string_view signature) {
  const Key key = ReadKey(publicKey, false);
  const Digest digest(EVP_MD_CTX_new());
  if (!key || !digest) return std::nullopt;
  return EVP_DigestVerifyInit(digest.get(), nullptr, nullptr, nullptr, key.get()) == 1 &&
         EVP_DigestVerify(digest.get(), BytesOf(signature), signature.size(), BytesOf(text),
                          text.size()) == 1;
}

std::optional<std::string> PublicBytes(std::string_view pem, bool isPrivate) {
  const Key key = ReadKey(pem, isPrivate);
  std::array<unsigned char, kPublicKeySize> bytes{};
  std::size_t size = bytes.size();
  if (!key || EVP_PKEY_get_raw_public_key(key.get(), bytes.data(), &size) != 1) {
    return std::nullopt;
  }
  return std::string(bytes.begin(), bytes.begin() + static_cast<std::ptrdiff_t>(size));
}

}  // namespace
}  // namespace SecPolicyCli

extern "C" __attribute__((visibility("default")))
const SecPolicyCli::SignatureFunctions SecPolicySignature = {
    SecPolicyCli::Prepare, SecPolicyCli::Sign, SecPolicyCli::IsSigned, SecPolicyCli::PublicBytes};
