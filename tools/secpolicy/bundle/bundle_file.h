#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "bundle/archive.h"
#include "bundle/manifest.h"
#include "bundle/signature.h"

// A bundle: a manifest, its signature, and the files of a policy.
namespace SecPolicyCli {

class BadBundle : public Refusal {
 public:
  using Refusal::Refusal;
};

struct BundleRequest {
  std::string name;
  std::int64_t serial = 0;
  std::int64_t created = 0;             // in seconds since 1970
  std::optional<std::int64_t> expires;  // as well
  std::vector<ArchiveEntry> files;      // those of ReadPolicyTree()
};

// The bytes of a bundle, which are the same for the same request and key. Throws Refusal when they
// are more than a bundle may have.
std::string MakeBundle(const BundleRequest& request, const SigningKey& key);

// What a file holds that claims to be a bundle.
class BundleFile {
 public:
  // Throws BadBundle when the file cannot be taken for one, Refusal and BraxoException when it
  // cannot be read.
  explicit BundleFile(const std::string& path);

  // What it claims, which need not be true. Throws BadBundle.
  Manifest Claims() const;

  // What it claims, when one of `keys` has signed it, it holds what was signed, and it is valid at
  // `now`, in seconds since 1970. Throws BadBundle.
  Manifest Verify(const std::vector<VerifyingKey>& keys, std::int64_t now) const;

  // The manifest and its signature as they are in the bundle.
  const std::string& ManifestText() const { return manifestText; }
  const std::string& Signature() const { return signature; }

  // The policy's files. Who has not verified them has no use for them.
  const std::vector<ArchiveEntry>& Files() const { return files; }

 private:
  void RequireSignature(const std::vector<VerifyingKey>& keys) const;
  void RequireFiles(const Manifest& manifest) const;
  void RequireTime(const Manifest& manifest, std::int64_t now) const;
  [[noreturn]] void Refuse(const std::string& why) const;

  std::string path;
  std::string manifestText;
  std::string signature;
  std::vector<ArchiveEntry> files;
};

}  // namespace SecPolicyCli
