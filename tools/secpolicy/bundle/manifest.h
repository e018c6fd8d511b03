#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "bundle/archive.h"
#include "json.h"
#include "refusal.h"

// What a bundle says of itself. It is what is signed.
namespace SecPolicyCli {

struct BundledFile {
  std::string path;  // below the policy directory
  std::size_t size = 0;
  std::string digest;  // SHA-256, in hexadecimal digits

  bool operator==(const BundledFile&) const = default;
};

// Who reads numbers as floating-point ones, as of metrics, knows no greater one exactly.
inline constexpr std::int64_t kGreatestSerial = std::int64_t{1} << 53;

// Times are in seconds since 1970.
struct Manifest {
  std::string name;
  std::int64_t serial = 0;  // of two bundles, the newer one has the greater
  std::int64_t created = 0;
  std::optional<std::int64_t> expires;
  std::string key;  // the Id() of the one that it is signed with
  std::vector<BundledFile> files;

  bool operator==(const Manifest&) const = default;
};

BundledFile DescribeFile(const ArchiveEntry& file);

class BadManifest : public Refusal {
 public:
  using Refusal::Refusal;
};

// As a document whose schema is that of this version of bundles.
Json ToJson(const Manifest& manifest);

// Throws BadManifest for what is no manifest, and for one of another version; the message says what
// it is.
Manifest ReadManifest(std::string_view text);

// The time that UtcTime() and IsoTime() write, or the beginning of the day "2026-11-21"; nothing
// for anything else.
std::optional<std::int64_t> ReadUtcTime(const std::string& text);

}  // namespace SecPolicyCli
