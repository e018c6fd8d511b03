#include "policy/way.h"

#include <algorithm>
#include <map>
#include <queue>

namespace Policy {
namespace {

// By which transition each domain is reached first.
using Arrivals = std::map<std::string, Step>;

Arrivals Explore(const InstalledPolicy& policy, const std::string& from) {
  Arrivals arrivals;
  std::queue<std::string> reached({from});
  for (; !reached.empty(); reached.pop()) {
    const auto domain = std::ranges::find(policy.domains, reached.front(), &InstalledDomain::name);
    if (domain == policy.domains.end()) continue;
    for (const Rule& rule : domain->rules) {
      if (rule.kind != RuleKind::kDomainTransition || !rule.Grants()) continue;
      const Step step{.from = domain->name, .rule = rule};
      if (step.To() == from || !arrivals.try_emplace(step.To(), step).second) continue;
      reached.push(step.To());
    }
  }
  return arrivals;
}

}  // namespace

std::optional<std::vector<Step>> FindWay(const InstalledPolicy& policy, const std::string& from,
                                         const std::string& to) {
  const Arrivals arrivals = Explore(policy, from);
  std::vector<Step> steps;
  for (std::string domain = to; domain != from; domain = steps.back().from) {
    const auto arrival = arrivals.find(domain);
    if (arrival == arrivals.end()) return std::nullopt;
    steps.push_back(arrival->second);
  }
  std::ranges::reverse(steps);
  return steps;
}

}  // namespace Policy
