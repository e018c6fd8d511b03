#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "refusal.h"

// The file that a bundle is: a tar archive that any tar lists and unpacks. There is one way to
// write what it holds, and only what is written in this way is read, so two bundles with the same
// content are the same bytes, and nothing is in one that its reader does not see.
namespace SecPolicyCli {

struct ArchiveEntry {
  std::string name;
  std::string bytes;

  bool operator==(const ArchiveEntry&) const = default;
};

class BadArchive : public Refusal {
 public:
  using Refusal::Refusal;
};

// The longest name that an entry can have.
constexpr std::size_t kLongestEntryName = 100;

// Of regular files, in their order. The names are not empty, and not longer than they can be.
std::string WriteArchive(const std::vector<ArchiveEntry>& entries);

// Throws BadArchive for anything that WriteArchive() does not write; the message says what it is.
std::vector<ArchiveEntry> ReadArchive(std::string_view bytes);

}  // namespace SecPolicyCli
