#include "host/enforce/plan/value_set.h"

#include <algorithm>

namespace Enforce {
namespace {

constexpr std::uint32_t kLastValue = std::numeric_limits<std::uint32_t>::max();

bool Touches(const ValueRange& earlier, const ValueRange& later) {
  return earlier.last == kLastValue || later.first <= earlier.last + 1;
}

void Append(std::vector<ValueRange>& ranges, const Policy::ParameterRange& range) {
  if (range.first > kLastValue) return;
  ranges.push_back({static_cast<std::uint32_t>(range.first),
                    static_cast<std::uint32_t>(std::min<std::uint64_t>(range.last, kLastValue))});
}

}  // namespace

ValueSet::ValueSet(std::vector<ValueRange> values) {
  std::ranges::sort(values);
  for (const ValueRange& range : values) {
    if (ranges.empty() || !Touches(ranges.back(), range)) {
      ranges.push_back(range);
    } else {
      ranges.back().last = std::max(ranges.back().last, range.last);
    }
  }
}

bool ValueSet::IsAll() const {
  return ranges.size() == 1 && ranges.front() == ValueRange{0, kLastValue};
}

bool ValueSet::Has(std::uint32_t value) const {
  const auto range = std::ranges::lower_bound(ranges, value, {}, &ValueRange::last);
  return range != ranges.end() && range->first <= value;
}

std::uint64_t ValueSet::Count() const {
  std::uint64_t count = 0;
  for (const ValueRange& range : ranges) count += std::uint64_t{range.last} - range.first + 1;
  return count;
}

ValueSet ValueSet::Complement() const {
  std::vector<ValueRange> others;
  std::uint64_t next = 0;
  for (const ValueRange& range : ranges) {
    if (range.first > next) others.push_back({static_cast<std::uint32_t>(next), range.first - 1});
    next = std::uint64_t{range.last} + 1;
  }
  if (next <= kLastValue) others.push_back({static_cast<std::uint32_t>(next), kLastValue});
  return ValueSet(std::move(others));
}

ValueSet ValueSet::With(const ValueSet& other) const {
  std::vector<ValueRange> both = ranges;
  both.insert(both.end(), other.ranges.begin(), other.ranges.end());
  return ValueSet(std::move(both));
}

ValueSet ValueSet::Within(const ValueSet& other) const {
  std::vector<ValueRange> common;
  auto mine = ranges.begin();
  auto theirs = other.ranges.begin();
  while (mine != ranges.end() && theirs != other.ranges.end()) {
    const ValueRange shared = {std::max(mine->first, theirs->first),
                               std::min(mine->last, theirs->last)};
    if (shared.first <= shared.last) common.push_back(shared);
    if (mine->last < theirs->last) {
      ++mine;
    } else {
      ++theirs;
    }
  }
  return ValueSet(std::move(common));
}

ValueSet PassingValues(std::span<const Policy::Rule* const> rules) {
  std::vector<ValueRange> granted;
  std::vector<ValueRange> revoked;
  for (const Policy::Rule* const rule : rules) {
    Append(rule->Grants() ? granted : revoked, rule->Range());
  }
  const bool isOpen = std::ranges::none_of(rules, &Policy::Rule::Grants);
  const ValueSet allowed = isOpen ? ValueSet::All() : ValueSet(std::move(granted));
  return allowed.Without(ValueSet(std::move(revoked)));
}

bool IsGrantedByItself(std::span<const Policy::Rule* const> rules, std::uint32_t value) {
  return std::ranges::any_of(rules, [value](const Policy::Rule* const& rule) {
    const ValueSet passing = PassingValues({&rule, 1});
    return rule->Grants() && passing.Count() == 1 && passing.Has(value);
  });
}

std::vector<const Policy::Rule*> RulesOfCheck(std::span<const Policy::Rule> rules,
                                              std::string_view check) {
  std::vector<const Policy::Rule*> found;
  for (const Policy::Rule& rule : rules) {
    if (rule.kind == Policy::RuleKind::kParameterCheck && rule.words[0] == check) {
      found.push_back(&rule);
    }
  }
  return found;
}

}  // namespace Enforce
