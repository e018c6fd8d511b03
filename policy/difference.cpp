#include "policy/difference.h"

#include <algorithm>
#include <map>
#include <utility>

namespace Policy {
namespace {

using Rules = std::vector<const Rule*>;

// A domain before and after; null where there is none.
using Pair = std::pair<const InstalledDomain*, const InstalledDomain*>;

std::map<std::string, Pair> PairsOf(const InstalledPolicy& before, const InstalledPolicy& after) {
  std::map<std::string, Pair> pairs;
  for (const InstalledDomain& domain : before.domains) pairs[domain.name].first = &domain;
  for (const InstalledDomain& domain : after.domains) pairs[domain.name].second = &domain;
  return pairs;
}

bool IsBefore(const Rule* one, const Rule* other) { return BySubject()(*one, *other); }

Rules Sorted(const InstalledDomain* domain) {
  Rules rules;
  if (domain == nullptr) return rules;
  for (const Rule& rule : domain->rules) rules.push_back(&rule);
  std::ranges::sort(rules, IsBefore);
  return rules;
}

void CompareRules(const Rules& before, const Rules& after, DomainDifference& difference) {
  auto old = before.begin();
  auto now = after.begin();
  while (old != before.end() || now != after.end()) {
    if (now == after.end() || (old != before.end() && IsBefore(*old, *now))) {
      difference.removed.push_back(**old++);
    } else if (old == before.end() || IsBefore(*now, *old)) {
      difference.added.push_back(**now++);
    } else {
      if ((*old)->verdict != (*now)->verdict) difference.changed.push_back({**old, **now});
      ++old;
      ++now;
    }
  }
}

std::optional<Level> LevelOf(const InstalledDomain* domain) {
  return domain == nullptr ? std::nullopt : std::optional(domain->level);
}

std::vector<std::string> Without(const std::map<std::string, unsigned int>& objects,
                                 const std::map<std::string, unsigned int>& others) {
  std::vector<std::string> names;
  for (const auto& [name, id] : objects) {
    if (!others.contains(name)) names.push_back(name);
  }
  return names;
}

}  // namespace

Difference Compare(const InstalledPolicy& before, const InstalledPolicy& after) {
  Difference difference;
  for (const auto& [name, pair] : PairsOf(before, after)) {
    DomainDifference domain;
    domain.name = name;
    domain.levelBefore = LevelOf(pair.first);
    domain.levelAfter = LevelOf(pair.second);
    CompareRules(Sorted(pair.first), Sorted(pair.second), domain);
    if (!domain.IsEmpty()) difference.domains.push_back(std::move(domain));
  }
  difference.objectsRemoved = Without(before.objects, after.objects);
  difference.objectsAdded = Without(after.objects, before.objects);
  return difference;
}

}  // namespace Policy
