#include "host/linux/state/parameter_rule_table.h"

#include <algorithm>
#include <cerrno>
#include <map>
#include <vector>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/state/checked_install.h"

using Braxo::Misc::StrCat;
using Policy::ParameterRange;
using Policy::ParseParameterRange;
using TeskCtl::Security::TeskAccess_CapabilityParamRule;

namespace LinuxHost {
namespace {

void RequireOneMask(const std::string& check, const std::string& secondWord) {
  if (check != Policy::kMaskCheck || secondWord.empty()) return;
  throw HostError(EINVAL, StrCat("parameter check '", check,
                                 "' takes one value, of all bits that it is about"));
}

struct RangedRule {
  ParameterRange range;
  const TeskAccess_CapabilityParamRule* rule;
};

std::string Describe(const TeskAccess_CapabilityParamRule& rule) {
  return StrCat(rule.grant ? "grant of " : "revoke of ", rule.firstParam,
                rule.secondParam.empty() ? "" : " to ", rule.secondParam, " in line ", rule.line);
}

[[noreturn]] void ThrowConflict(const TeskAccess_CapabilityParamRule& first,
                                const TeskAccess_CapabilityParamRule& second) {
  throw HostError(EINVAL, StrCat("parameter check '", first.paramCheck, "': ", Describe(first),
                                 " conflicts with ", Describe(second)));
}

// Walks the ranges by where they begin, and keeps of each side the one that reaches furthest: a
// range overlaps an earlier one exactly when it overlaps that.
void RequireNoConflict(std::vector<RangedRule>& ranges) {
  std::stable_sort(ranges.begin(), ranges.end(), [](const auto& left, const auto& right) {
    return left.range.first < right.range.first;
  });
  const RangedRule* furthest[2] = {nullptr, nullptr};
  for (const auto& ranged : ranges) {
    const RangedRule* opposite = furthest[ranged.rule->grant ? 0 : 1];
    if (opposite != nullptr && opposite->range.Overlaps(ranged.range)) {
      const bool inOrder = opposite->rule->line <= ranged.rule->line;
      ThrowConflict(inOrder ? *opposite->rule : *ranged.rule,
                    inOrder ? *ranged.rule : *opposite->rule);
    }
    const RangedRule*& own = furthest[ranged.rule->grant ? 1 : 0];
    if (own == nullptr || own->range.last < ranged.range.last) own = &ranged;
  }
}

}  // namespace

void RequireNoConflict(const std::list<TeskAccess_CapabilityParamRule>& rules) {
  std::map<std::string_view, std::vector<RangedRule>> checks;
  for (const auto& rule : rules) {
    RequireOneMask(rule.paramCheck, rule.secondParam);
    checks[rule.paramCheck].push_back(
        {ParseParameterRange(rule.firstParam, rule.secondParam), &rule});
  }
  for (auto& [check, ranges] : checks) RequireNoConflict(ranges);
}

std::optional<HostError> ParameterRuleTable::Refusal(const DomainReference& domain,
                                                     const Policy::Rule& rule) {
  if (auto refusal = domains.Refusal(domain)) return refusal;
  return keywords.Refusal(TeskCtl::Security::TESKACCESS_KEYWORD_PARAM_CHECK, rule.words.front());
}

bool ParameterRuleTable::InstallIfUnchanged(unsigned int domainId, const Policy::Rule& rule,
                                            const ParameterRange& range) {
  const auto& [check, firstWord, lastWord] = rule.words;
  if (base.CurrentLoad() != 0) {
    base.Database().Run(
        "INSERT OR REPLACE INTO parameter_rule (domain_id, parameter_check, first_value, "
        "last_value, first_word, last_word, granted, line, load) "
        "VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9)",
        domainId, check, range.first, range.last, firstWord, lastWord, rule.Grants(), rule.line,
        base.CurrentLoad());
    return true;
  }
  return base.Database().Run(
             "INSERT OR REPLACE INTO parameter_rule (domain_id, parameter_check, first_value, "
             "last_value, first_word, last_word, granted, line, load) "
             "SELECT ?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9 FROM state WHERE domain_version = ?10",
             domainId, check, range.first, range.last, firstWord, lastWord, rule.Grants(),
             rule.line, base.CurrentLoad(), base.DomainVersion()) != 0;
}

void ParameterRuleTable::Install(const DomainReference& domain, const Policy::Rule& rule) {
  const ParameterRange range = rule.Range();
  RequireOneMask(rule.words[0], rule.words[2]);
  InstallChecked(
      base, [&] { return Refusal(domain, rule); },
      [&] { return InstallIfUnchanged(domain.id, rule, range); });
}

void ParameterRuleTable::Remove(unsigned int domainId, const std::string& check,
                                const ParameterRange& range) {
  Transaction transaction(base.Database());
  base.Refresh();
  domains.Get(domainId);
  const int removed = base.Database().Run(
      "DELETE FROM parameter_rule WHERE domain_id = ?1 AND parameter_check = ?2 AND "
      "first_value = ?3 AND last_value = ?4",
      domainId, check, range.first, range.last);
  if (removed == 0) throw HostError(ENOENT, StrCat("no rule for parameter check '", check, "'"));
  base.Database().Run(
      "DELETE FROM covered_parameter_rule WHERE domain_id = ?1 AND parameter_check = ?2 AND "
      "first_value = ?3 AND last_value = ?4",
      domainId, check, range.first, range.last);
  transaction.Commit();
}

std::vector<Policy::Rule> ParameterRuleTable::Read(unsigned int domainId) {
  Rows rows = base.Database().Select(
      "SELECT parameter_check, first_word, last_word, granted, line FROM parameter_rule "
      "WHERE id IN (SELECT id FROM parameter_rule WHERE domain_id = ?1) ORDER BY id",
      domainId);
  std::vector<Policy::Rule> rules;
  while (rows.Next()) {
    Policy::Rule& rule = rules.emplace_back();
    rule.kind = Policy::RuleKind::kParameterCheck;
    rule.words = {rows.Text(0), rows.Text(1), rows.Text(2)};
    rule.verdict = rows.Integer(3) != 0;
    rule.line = static_cast<unsigned int>(rows.Integer(4));
  }
  return rules;
}

}  // namespace LinuxHost
