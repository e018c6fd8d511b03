#include "host/linux/state/rule_table.h"

#include <cerrno>

#include "braxo/misc/strcat.h"
#include "host/linux/state/checked_install.h"
#include "host/linux/state/domain_table.h"
#include "host/linux/state/host_state.h"
#include "host/linux/state/keyword_tables.h"
#include "host/linux/state/label_table.h"

using Braxo::Misc::StrCat;
using TeskCtl::Security::TeskAccess_KeywordType;

namespace LinuxHost {
namespace {

// What the words of a kind are taken from.
struct KindShape {
  const char* name;  // in the state
  std::array<std::optional<TeskAccess_KeywordType>, kMaxRuleWords> tables;
};

constexpr auto kLabel = TeskCtl::Security::TESKACCESS_KEYWORD_LABEL;

constexpr std::array<KindShape, 6> kShapes = {{
    {"system call", {TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL}},
    {"capability", {TeskCtl::Security::TESKACCESS_KEYWORD_CAPABILITY}},
    {"object access", {kLabel, TeskCtl::Security::TESKACCESS_KEYWORD_OBJECT_ACCESS}},
    {"domain transition", {kLabel, std::nullopt, TeskCtl::Security::TESKACCESS_KEYWORD_DOM_TRANS}},
    {"file creation", {kLabel, kLabel, TeskCtl::Security::TESKACCESS_KEYWORD_FILE_CREATION}},
    {"unix socket creation", {kLabel, TeskCtl::Security::TESKACCESS_KEYWORD_UNIX_SOCK_CREATION}},
}};

const KindShape& ShapeOf(RuleKind kind) { return kShapes.at(static_cast<std::size_t>(kind)); }

}  // namespace

std::optional<HostError> DomainRefusal(HostState& state, const DomainReference& reference) {
  const Domain* domain = state.Domains().Find(reference.id);
  if (domain == nullptr) return HostError(ENOENT, StrCat("unknown domain ", reference.id));
  if (reference.name.empty() || domain->name == reference.name) return std::nullopt;
  return HostError(ENOENT, StrCat("domain ", reference.id, " is '", domain->name, "', not '",
                                  reference.name, "'"));
}

RuleTable::RuleTable(HostState& owner) : state(owner) {}

std::optional<HostError> RuleTable::Refusal(const Rule& rule) {
  if (auto refusal = DomainRefusal(state, rule.domain)) return refusal;
  if (rule.kind == RuleKind::DomainTransition) {
    if (auto refusal = DomainRefusal(state, {rule.targetId, rule.words[1]})) return refusal;
  }
  const KindShape& shape = ShapeOf(rule.kind);
  for (std::size_t index = 0; index < kMaxRuleWords; ++index) {
    if (!shape.tables[index]) continue;
    if (auto refusal = KeywordRefusal(state, *shape.tables[index], rule.words[index])) {
      return refusal;
    }
  }
  return std::nullopt;
}

// Does nothing and returns false when the tables that the rule was checked against have changed
// since they were read, which nobody can do while a load lasts.
bool RuleTable::InstallIfUnchanged(const Rule& rule) {
  if (state.CurrentLoad() != 0) {
    state.Database().Run(
        "INSERT OR REPLACE INTO rule (domain_id, kind, word1, word2, word3, granted, line, load) "
        "VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8)",
        rule.domain.id, ShapeOf(rule.kind).name, rule.words[0], rule.words[1], rule.words[2],
        rule.granted, rule.line, state.CurrentLoad());
    return true;
  }
  return state.Database().Run(
             "INSERT OR REPLACE INTO rule "
             "(domain_id, kind, word1, word2, word3, granted, line, load) "
             "SELECT ?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8 FROM state "
             "WHERE domain_version = ?9 AND label_version = ?10",
             rule.domain.id, ShapeOf(rule.kind).name, rule.words[0], rule.words[1], rule.words[2],
             rule.granted, rule.line, state.CurrentLoad(), state.Domains().Version(),
             state.Labels().Version()) != 0;
}

void RuleTable::Install(const Rule& rule) {
  InstallChecked(
      state, [&] { return Refusal(rule); }, [&] { return InstallIfUnchanged(rule); });
}

Rows RuleTable::Read(unsigned int domainId, RuleKind kind) {
  // Of a bare ?2 the engine would look whether it fits the condition of transition_target, and
  // prepare the statement again for each other kind.
  return state.Database().Select(
      "SELECT word1, word2, word3, granted, line FROM rule WHERE domain_id = ?1 AND kind = +?2 "
      "ORDER BY id",
      domainId, ShapeOf(kind).name);
}

void RuleTable::RemoveDomain(const Domain& domain) {
  state.Database().Run("DELETE FROM rule WHERE domain_id = ?1", domain.id);
  state.Database().Run("DELETE FROM covered_rule WHERE domain_id = ?1", domain.id);
  state.Database().Run("DELETE FROM rule WHERE kind = 'domain transition' AND word2 = ?1",
                       domain.name);
  RemoveUnnamed();
}

void RuleTable::RemoveUnnamed() {
  state.Database().Run(
      "DELETE FROM rule WHERE kind NOT IN ('system call', 'capability') AND ("
      "word1 NOT IN (SELECT name FROM label UNION ALL SELECT name FROM domain) OR "
      "kind = 'file creation' AND "
      "word2 NOT IN (SELECT name FROM label UNION ALL SELECT name FROM domain))");
  state.Database().Run(
      "DELETE FROM covered_rule WHERE kind NOT IN ('system call', 'capability') AND ("
      "word1 NOT IN (SELECT name FROM label UNION ALL SELECT name FROM domain) OR "
      "kind = 'file creation' AND "
      "word2 NOT IN (SELECT name FROM label UNION ALL SELECT name FROM domain) OR "
      "kind = 'domain transition' AND word2 NOT IN (SELECT name FROM domain))");
}

}  // namespace LinuxHost
