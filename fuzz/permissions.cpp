// The letters of a file-path rule: exactly those are accepted that trying out all of them accepts.

#include <cstdint>
#include <map>

#include "secpolicy/domain/file_path_access_rules.h"
#include "support/message_of.h"
#include "support/reference_reader.h"
#include "support/require.h"

namespace SecPolicyFuzz {
namespace {

using SecPolicyTest::MessageOf;
using Masks = std::map<std::string, unsigned int>;

void AddLonger(Masks& masks, const std::string& letters, unsigned int mask) {
  masks[letters] = mask;
  const std::map<char, unsigned int> bits = {{'r', 0x1}, {'w', 0x2}, {'x', 0x10}};
  for (const auto& [letter, bit] : bits) {
    if (letters.find(letter) == std::string::npos) AddLonger(masks, letters + letter, mask | bit);
  }
}

// Every way to write down a set of the three letters.
Masks AllMasks() {
  Masks masks;
  AddLonger(masks, "", 0);
  return masks;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const Masks accepted = AllMasks();
  const std::string letters(Text(data, size));

  SecPolicy::FilePathAccessRules rules;
  unsigned int mask = 0;
  const std::string failure = MessageOf([&] { mask = rules.GetPermission(letters); });

  const auto known = accepted.find(letters);
  Require(failure.empty() == (known != accepted.end()), "accepted letters: " + letters);
  if (known != accepted.end()) Require(mask == known->second, "the mask of " + letters);
  RequireEqual(failure, ReadPermission(letters).refusal, "the refusal of " + letters);
  return 0;
}

}  // namespace SecPolicyFuzz
