#include "host/linux/state/rule_table.h"

#include "host/linux/state/checked_install.h"

using Policy::FormOf;
using Policy::RuleKind;

namespace LinuxHost {

std::optional<HostError> RuleTable::Refusal(const DomainReference& domain, const Policy::Rule& rule,
                                            unsigned int targetId) {
  if (auto refusal = domains.Refusal(domain)) return refusal;
  if (rule.kind == RuleKind::kDomainTransition) {
    if (auto refusal = domains.Refusal({targetId, rule.words[1]})) return refusal;
  }
  const auto words = FormOf(rule.kind).Words();
  for (std::size_t index = 0; index < words.size(); ++index) {
    const auto& table = FormOf(words[index]).table;
    if (!table) continue;
    if (auto refusal = keywords.Refusal(*table, rule.words[index])) return refusal;
  }
  return std::nullopt;
}

// Does nothing and returns false when the tables that the rule was checked against have changed
// since they were read, which nobody can do while a load lasts.
bool RuleTable::InstallIfUnchanged(unsigned int domainId, const Policy::Rule& rule) {
  const char* const kind = FormOf(rule.kind).name;
  if (base.CurrentLoad() != 0) {
    base.Database().Run(
        "INSERT OR REPLACE INTO rule (domain_id, kind, word1, word2, word3, granted, line, load) "
        "VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8)",
        domainId, kind, rule.words[0], rule.words[1], rule.words[2], rule.Grants(), rule.line,
        base.CurrentLoad());
    return true;
  }
  return base.Database().Run(
             "INSERT OR REPLACE INTO rule "
             "(domain_id, kind, word1, word2, word3, granted, line, load) "
             "SELECT ?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8 FROM state "
             "WHERE domain_version = ?9 AND label_version = ?10",
             domainId, kind, rule.words[0], rule.words[1], rule.words[2], rule.Grants(), rule.line,
             base.CurrentLoad(), base.DomainVersion(), base.LabelVersion()) != 0;
}

void RuleTable::Install(const DomainReference& domain, const Policy::Rule& rule,
                        unsigned int targetId) {
  InstallChecked(
      base, [&] { return Refusal(domain, rule, targetId); },
      [&] { return InstallIfUnchanged(domain.id, rule); });
}

std::vector<Policy::Rule> RuleTable::Read(unsigned int domainId, RuleKind kind) {
  // Numbers are sorted sooner than rows. Of a bare ?2 the engine would look whether it fits the
  // condition of transition_target, and prepare the statement again for each other kind.
  Rows rows = base.Database().Select(
      "SELECT granted, line, word1, word2, word3 FROM rule WHERE id IN "
      "(SELECT id FROM rule WHERE domain_id = ?1 AND kind = +?2) ORDER BY id",
      domainId, FormOf(kind).name);
  const std::size_t wordCount = FormOf(kind).words.size();
  // Growing from nothing would move each rule twice; few domains have more of a kind.
  constexpr std::size_t kRoom = 128;
  std::vector<Policy::Rule> rules;
  rules.reserve(kRoom);
  while (rows.Next()) {
    Policy::Rule& rule = rules.emplace_back();
    rule.kind = kind;
    rule.verdict = rows.Integer(0) != 0;
    rule.line = static_cast<unsigned int>(rows.Integer(1));
    for (std::size_t word = 0; word < wordCount; ++word) {
      rule.words[word] = rows.Text(2 + static_cast<int>(word));
    }
  }
  return rules;
}

}  // namespace LinuxHost
