#include "host/enforce/plan/call_remarks.h"

#include <algorithm>

#include "braxo/misc/strcat.h"

using Braxo::Misc::StrCat;
using Policy::Rule;

namespace Enforce {

void CallRemarks::Add(const Rule& rule, const std::string& reason, const std::string& call) {
  auto& reasons = remarks[&rule];
  auto known = std::ranges::find(reasons, reason, &Remark::reason);
  if (known == reasons.end()) known = reasons.insert(known, Remark{reason, {}});
  if (!call.empty()) known->calls.insert(call);
}

void CallRemarks::Surrender(const Rule& rule, const std::string& reason) {
  Add(rule, reason);
  surrendered.insert(&rule);
}

RuleFate CallRemarks::FateOf(const Rule& rule) const {
  RuleFate fate{.rule = rule};
  const auto known = remarks.find(&rule);
  if (known == remarks.end()) return fate;
  for (const Remark& remark : known->second) Narrow(fate, TextOf(remark));
  if (surrendered.contains(&rule)) fate.fate = Fate::kNotExpressible;
  return fate;
}

std::string CallRemarks::TextOf(const Remark& remark) {
  std::string calls;
  for (const std::string& call : remark.calls) calls += (calls.empty() ? "" : ", ") + call;
  return calls.empty() ? remark.reason : StrCat(calls, ": ", remark.reason);
}

}  // namespace Enforce
