#include "policy_difference.h"

#include <map>
#include <utility>

namespace SecPolicyCli {
namespace {

// Rules by what they are about.
using Rules = std::map<std::string, std::string>;

// The part of a domain that is compared; a level is empty where there is no domain.
struct Side {
  std::string level;
  Rules rules;
};

std::map<std::string, Side> SidesOf(const InstalledPolicy& policy) {
  std::map<std::string, Side> sides;
  for (const InstalledDomain& domain : policy.domains) {
    Side& side = sides[domain.name];
    side.level = domain.level;
    for (const InstalledRule& rule : domain.rules) side.rules[SubjectOf(rule.text)] = rule.text;
  }
  return sides;
}

void CompareRules(const Rules& before, const Rules& after, DomainDifference& difference) {
  for (const auto& [subject, rule] : before) {
    const auto other = after.find(subject);
    if (other == after.end()) {
      difference.removed.push_back(rule);
    } else if (other->second != rule) {
      difference.changed.push_back({rule, other->second});
    }
  }
  for (const auto& [subject, rule] : after) {
    if (!before.contains(subject)) difference.added.push_back(rule);
  }
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

PolicyDifference Compare(const InstalledPolicy& before, const InstalledPolicy& after) {
  std::map<std::string, Side> olds = SidesOf(before);
  std::map<std::string, Side> news = SidesOf(after);
  for (const auto& [name, side] : olds) news[name];
  for (const auto& [name, side] : news) olds[name];

  PolicyDifference difference;
  for (const auto& [name, old] : olds) {
    const Side& now = news.at(name);
    DomainDifference domain;
    domain.name = name;
    domain.levelBefore = old.level;
    domain.levelAfter = now.level;
    CompareRules(old.rules, now.rules, domain);
    if (old.level == now.level && old.rules == now.rules) continue;
    difference.domains.push_back(std::move(domain));
  }
  difference.objectsRemoved = Without(before.objects, after.objects);
  difference.objectsAdded = Without(after.objects, before.objects);
  return difference;
}

std::string SubjectOf(const std::string& rule) { return rule.substr(0, rule.rfind(' ')); }

std::string DecisionOf(const std::string& rule) { return rule.substr(rule.rfind(' ') + 1); }

}  // namespace SecPolicyCli
