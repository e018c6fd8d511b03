#include "bundle/bundle_file.h"

#include <algorithm>
#include <set>

#include "bundle/bundle_limits.h"
#include "bundle/policy_tree.h"
#include "bundle/read_file.h"
#include "text/format.h"

namespace SecPolicyCli {
namespace {

// Clocks of two machines differ a little.
constexpr std::int64_t kClockTolerance = 300;

}  // namespace

std::string MakeBundle(const BundleRequest& request, const SigningKey& key) {
  Manifest manifest{.name = request.name,
                    .serial = request.serial,
                    .created = request.created,
                    .expires = request.expires,
                    .key = key.Id(),
                    .files = {}};
  std::ranges::transform(request.files, std::back_inserter(manifest.files), DescribeFile);
  const std::string text = ToJson(manifest).Text();
  std::vector<ArchiveEntry> entries = {{kManifestName, text}, {kSignatureName, key.Sign(text)}};
  for (const ArchiveEntry& file : request.files) {
    entries.push_back({std::string(kPolicyPrefix) + file.name, file.bytes});
  }
  std::string bundle = WriteArchive(entries);
  if (bundle.size() <= kLargestBundle) return bundle;
  throw Refusal("this policy is too large for a bundle: " + std::to_string(bundle.size()) +
                " bytes, and at most " + std::to_string(kLargestBundle) + " can be in one");
}

BundleFile::BundleFile(const std::string& file) : path(file) {
  std::vector<ArchiveEntry> entries;
  try {
    entries = ReadArchive(ReadFile(path, kLargestBundle).bytes);
  } catch (const BadArchive& bad) {
    Refuse(bad.what());
  }
  if (entries.size() < 2 || entries[0].name != kManifestName || entries[1].name != kSignatureName) {
    Refuse("it does not begin with a manifest and its signature");
  }
  manifestText = std::move(entries[0].bytes);
  signature = std::move(entries[1].bytes);
  for (std::size_t index = 2; index < entries.size(); ++index) {
    ArchiveEntry& entry = entries[index];
    const bool isBelow = entry.name.starts_with(kPolicyPrefix);
    std::string name = isBelow ? entry.name.substr(kPolicyPrefix.size()) : "";
    if (!IsPolicyFile(name)) Refuse("its entry " + entry.name + " is no file of a policy");
    if (!files.empty() && files.back().name >= name) {
      Refuse("its entry " + entry.name + " is not in its place");
    }
    files.push_back({std::move(name), std::move(entry.bytes)});
  }
}

void BundleFile::Refuse(const std::string& why) const { throw BadBundle(path + ": " + why); }

Manifest BundleFile::Claims() const {
  try {
    return ReadManifest(manifestText);
  } catch (const BadManifest& bad) {
    Refuse(bad.what());
  }
}

Manifest BundleFile::Verify(const std::vector<VerifyingKey>& keys, std::int64_t now) const {
  RequireSignature(keys);
  Manifest manifest = Claims();
  RequireFiles(manifest);
  RequireTime(manifest, now);
  return manifest;
}

void BundleFile::RequireSignature(const std::vector<VerifyingKey>& keys) const {
  const auto hasSigned = [this](const VerifyingKey& key) {
    return key.HasSigned(manifestText, signature);
  };
  if (std::ranges::any_of(keys, hasSigned)) return;
  // Only to say why: a manifest that nobody has signed says what it wants.
  const std::string claimed = Claims().key;
  if (std::ranges::find(keys, claimed, &VerifyingKey::Id) != keys.end()) {
    Refuse("its manifest was changed after it was signed");
  }
  std::vector<std::string> ids;
  std::ranges::transform(keys, std::back_inserter(ids), &VerifyingKey::Id);
  Refuse("it says that the key " + claimed + " has signed it, which is not " + ListOf(ids, "or"));
}

void BundleFile::RequireFiles(const Manifest& manifest) const {
  std::set<std::string> named;
  for (const BundledFile& file : manifest.files) {
    named.insert(file.path);
    const auto found = std::ranges::lower_bound(files, file.path, {}, &ArchiveEntry::name);
    if (found == files.end() || found->name != file.path) {
      Refuse("it lacks " + file.path + ", which its manifest names");
    }
    if (DescribeFile(*found) != file) Refuse(file.path + " was changed after it was signed");
  }
  for (const ArchiveEntry& file : files) {
    if (!named.contains(file.name)) {
      Refuse("it has " + file.name + ", which its manifest does not name");
    }
  }
}

void BundleFile::RequireTime(const Manifest& manifest, std::int64_t now) const {
  if (manifest.created > now + kClockTolerance) {
    Refuse("it is not yet valid: it was made at " + UtcTime(manifest.created) +
           ", and this clock says " + UtcTime(now));
  }
  if (manifest.expires && *manifest.expires <= now) {
    Refuse("it has expired at " + UtcTime(*manifest.expires) + ", and this clock says " +
           UtcTime(now));
  }
}

}  // namespace SecPolicyCli
