#pragma once

#include <compare>
#include <cstdint>
#include <limits>
#include <span>
#include <vector>

#include "policy/rule.h"

namespace Enforce {

// Values of 32 bits, both ends included.
struct ValueRange {
  std::uint32_t first = 0;
  std::uint32_t last = 0;

  auto operator<=>(const ValueRange&) const = default;
};

// A set of values of 32 bits.
class ValueSet {
 public:
  // The values of the ranges, which may overlap and be in any order.
  explicit ValueSet(std::vector<ValueRange> values = {});

  static ValueSet All() { return ValueSet({{0, std::numeric_limits<std::uint32_t>::max()}}); }

  // In ascending order; between two of them is at least one value that is not in the set.
  const std::vector<ValueRange>& Ranges() const { return ranges; }

  bool IsAll() const;
  bool IsEmpty() const { return ranges.empty(); }
  bool Has(std::uint32_t value) const;
  std::uint64_t Count() const;

  ValueSet Complement() const;
  ValueSet With(const ValueSet& other) const;
  ValueSet Within(const ValueSet& other) const;
  ValueSet Without(const ValueSet& other) const { return Within(other.Complement()); }

 private:
  std::vector<ValueRange> ranges;
};

// The values that pass a check with these rules: all when there are none; all that none revokes
// when none grants; else those that one grants and none revokes. Values past 32 bits are left out,
// since the kernel never sees them. Throws BraxoException for words that are no range.
ValueSet PassingValues(std::span<const Policy::Rule* const> rules);

// Whether one of the rules grants just this value, as a range that happens to hold it does not.
bool IsGrantedByItself(std::span<const Policy::Rule* const> rules, std::uint32_t value);

// The rules of a domain about the check, in their order.
std::vector<const Policy::Rule*> RulesOfCheck(std::span<const Policy::Rule> rules,
                                              std::string_view check);

}  // namespace Enforce
