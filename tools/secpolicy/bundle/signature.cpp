#include "bundle/signature.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <optional>

#include "bundle/read_file.h"
#include "bundle/signature/entry_point.h"
#include "host/linux/common/late_library.h"
#include "host/linux/operation/text_digest.h"
#include "refusal.h"

namespace SecPolicyCli {
namespace {

constexpr std::size_t kIdDigits = 16;
constexpr std::size_t kLargestKeyFile = 65536;
constexpr mode_t kRightsOfOthers = 077;

const SignatureFunctions& Loaded() {
  static const auto& functions =
      *static_cast<const SignatureFunctions*>(LinuxHost::FindInLateLibrary(
          "libsecpolicy-signature.so.1", "SecPolicySignature", "signs bundles"));
  return functions;
}

std::string IdOf(const std::optional<std::string>& bytes, const std::string& file,
                 const char* kind) {
  if (bytes) return LinuxHost::DigestOf(*bytes).substr(0, kIdDigits);
  throw Refusal(file + " is no " + kind +
                " Ed25519 key in PEM without a passphrase. 'openssl genpkey -algorithm ed25519' "
                "makes a key, and 'openssl pkey -pubout' writes its public half.");
}

std::string ReadPrivate(const std::string& file) {
  FileContent key = ReadFile(file, kLargestKeyFile);
  if ((key.status.st_mode & kRightsOfOthers) == 0) return std::move(key.bytes);
  throw Refusal("others may use the private key " + file +
                ", so it is not used. 'chmod 600' keeps it to its owner.");
}

}  // namespace

void LoadSignatures() { Loaded().prepare(); }

SigningKey::SigningKey(const std::string& file)
    : pem(ReadPrivate(file)), id(IdOf(Loaded().publicBytes(pem, true), file, "private")) {}

std::string SigningKey::Sign(std::string_view text) const {
  const auto signature = Loaded().sign(pem, text);
  if (!signature) throw Refusal("the engine that signs has failed");
  return *signature;
}

VerifyingKey::VerifyingKey(const std::string& file)
    : pem(ReadFile(file, kLargestKeyFile).bytes),
      id(IdOf(Loaded().publicBytes(pem, false), file, "public")) {}

bool VerifyingKey::HasSigned(std::string_view text, std::string_view signature) const {
  return Loaded().isSigned(pem, text, signature).value_or(false);
}

}  // namespace SecPolicyCli
