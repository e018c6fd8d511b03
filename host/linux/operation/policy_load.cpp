#include "host/linux/operation/policy_load.h"

#include <algorithm>
#include <set>
#include <utility>

#include "host/linux/state/domain_table.h"
#include "host/linux/state/host_state.h"
#include "host/linux/state/store.h"

namespace LinuxHost {
namespace {

// The statements of a load for one of the tables of rules. ?1 is the kind of the load, ?2 its
// number. A rule that the load covers has got another identifier with its new content.
struct TableStatements {
  Sql keepOthers;     // all rules of others, of which the load may cover some
  Sql dropUncovered;  // those that it did not
  Sql dropOwn;        // what the kind itself had, and others had covered
  Sql countStaying;
  Sql removeStaying;
  Sql putBack;  // what was covered by what is removed
  Sql dropPutBack;
};

constexpr TableStatements kTables[] = {
    {
        "INSERT INTO covered_rule SELECT * FROM rule "
        "WHERE load NOT IN (SELECT number FROM policy_load WHERE kind = ?1)",
        "DELETE FROM covered_rule WHERE EXISTS (SELECT 1 FROM rule AS r "
        "WHERE r.id = covered_rule.id AND r.load = covered_rule.load)",
        "DELETE FROM covered_rule WHERE load IN (SELECT number FROM policy_load WHERE kind = ?1)",
        "SELECT count(*) FROM rule "
        "WHERE load <> ?2 AND load IN (SELECT number FROM policy_load WHERE kind = ?1)",
        "DELETE FROM rule "
        "WHERE load <> ?2 AND load IN (SELECT number FROM policy_load WHERE kind = ?1)",
        "INSERT INTO rule (domain_id, kind, word1, word2, word3, granted, line, load) "
        "SELECT domain_id, kind, word1, word2, word3, granted, line, load FROM "
        "(SELECT *, max(id) FROM covered_rule GROUP BY domain_id, kind, word1, word2, word3) AS c "
        "WHERE NOT EXISTS (SELECT 1 FROM rule AS r WHERE r.domain_id = c.domain_id AND "
        "r.kind = c.kind AND r.word1 = c.word1 AND r.word2 = c.word2 AND r.word3 = c.word3) "
        "ORDER BY id",
        "DELETE FROM covered_rule WHERE EXISTS (SELECT 1 FROM rule AS r "
        "WHERE r.domain_id = covered_rule.domain_id AND r.kind = covered_rule.kind AND "
        "r.word1 = covered_rule.word1 AND r.word2 = covered_rule.word2 AND "
        "r.word3 = covered_rule.word3 AND r.load = covered_rule.load)",
    },
    {
        "INSERT INTO covered_parameter_rule SELECT * FROM parameter_rule "
        "WHERE load NOT IN (SELECT number FROM policy_load WHERE kind = ?1)",
        "DELETE FROM covered_parameter_rule WHERE EXISTS (SELECT 1 FROM parameter_rule AS r "
        "WHERE r.id = covered_parameter_rule.id AND r.load = covered_parameter_rule.load)",
        "DELETE FROM covered_parameter_rule "
        "WHERE load IN (SELECT number FROM policy_load WHERE kind = ?1)",
        "SELECT count(*) FROM parameter_rule "
        "WHERE load <> ?2 AND load IN (SELECT number FROM policy_load WHERE kind = ?1)",
        "DELETE FROM parameter_rule "
        "WHERE load <> ?2 AND load IN (SELECT number FROM policy_load WHERE kind = ?1)",
        "INSERT INTO parameter_rule (domain_id, parameter_check, first_value, last_value, "
        "first_word, last_word, granted, line, load) "
        "SELECT domain_id, parameter_check, first_value, last_value, first_word, last_word, "
        "granted, line, load FROM (SELECT *, max(id) FROM covered_parameter_rule "
        "GROUP BY domain_id, parameter_check, first_value, last_value) AS c "
        "WHERE NOT EXISTS (SELECT 1 FROM parameter_rule AS r WHERE r.domain_id = c.domain_id AND "
        "r.parameter_check = c.parameter_check AND r.first_value = c.first_value AND "
        "r.last_value = c.last_value) ORDER BY id",
        "DELETE FROM covered_parameter_rule WHERE EXISTS (SELECT 1 FROM parameter_rule AS r "
        "WHERE r.domain_id = covered_parameter_rule.domain_id AND "
        "r.parameter_check = covered_parameter_rule.parameter_check AND "
        "r.first_value = covered_parameter_rule.first_value AND "
        "r.last_value = covered_parameter_rule.last_value AND "
        "r.load = covered_parameter_rule.load)",
    },
    {
        "INSERT INTO covered_file_policy SELECT * FROM file_policy "
        "WHERE world = 0 AND load NOT IN (SELECT number FROM policy_load WHERE kind = ?1)",
        "DELETE FROM covered_file_policy WHERE EXISTS (SELECT 1 FROM file_policy AS r "
        "WHERE r.id = covered_file_policy.id AND r.load = covered_file_policy.load)",
        "DELETE FROM covered_file_policy "
        "WHERE load IN (SELECT number FROM policy_load WHERE kind = ?1)",
        "SELECT count(*) FROM file_policy "
        "WHERE load <> ?2 AND load IN (SELECT number FROM policy_load WHERE kind = ?1)",
        "DELETE FROM file_policy "
        "WHERE load <> ?2 AND load IN (SELECT number FROM policy_load WHERE kind = ?1)",
        "INSERT INTO file_policy (domain_id, world, path, permission, line, load) "
        "SELECT domain_id, world, path, permission, line, load FROM "
        "(SELECT *, max(id) FROM covered_file_policy GROUP BY domain_id, world, path) AS c "
        "WHERE NOT EXISTS (SELECT 1 FROM file_policy AS r WHERE r.domain_id = c.domain_id AND "
        "r.world = c.world AND r.path = c.path) ORDER BY id",
        "DELETE FROM covered_file_policy WHERE EXISTS (SELECT 1 FROM file_policy AS r "
        "WHERE r.domain_id = covered_file_policy.domain_id AND "
        "r.world = covered_file_policy.world AND r.path = covered_file_policy.path AND "
        "r.load = covered_file_policy.load)",
    },
};

std::uint64_t Number(Rows rows) {
  return rows.Next() ? static_cast<std::uint64_t>(rows.Integer(0)) : 0;
}

// The domains that files of the kind have brought and, going by `defined`, bring no more; those of
// the other kind's files, and those that a service has made, are not theirs to take.
std::vector<std::string> DomainsWithoutFile(HostState& state, int kind,
                                            const std::vector<std::string>& defined) {
  const std::set<std::string_view> still(defined.begin(), defined.end());
  std::vector<std::string> names;
  Rows rows = state.Database().Select(
      "SELECT d.name FROM policy_domain AS p JOIN domain AS d ON d.name = p.name "
      "WHERE p.kind = ?1 AND NOT d.created_at_run_time AND d.id <> 0 AND NOT EXISTS "
      "(SELECT 1 FROM policy_domain AS o WHERE o.name = p.name AND o.kind <> p.kind) "
      "ORDER BY d.name",
      kind);
  while (rows.Next()) {
    std::string name = rows.Text(0);
    if (!still.contains(name)) names.push_back(std::move(name));
  }
  return names;
}

// Removes the rules of the load's own kind that it has not installed, and returns how many of them
// are gone: some uncover what an early load, or a service, wants.
std::uint64_t RemoveStayingRules(Store& store, int kind, std::int64_t load) {
  std::uint64_t removed = 0;
  for (const TableStatements& table : kTables) {
    store.Run(table.dropOwn, kind);
    const int gone = store.Run(table.removeStaying, kind, load);
    const int back = store.Run(table.putBack);
    store.Run(table.dropPutBack);
    removed += static_cast<std::uint64_t>(std::max(gone - back, 0));
  }
  return removed;
}

std::uint64_t CountStayingRules(Store& store, int kind, std::int64_t load) {
  std::uint64_t staying = 0;
  for (const TableStatements& table : kTables) {
    staying += Number(store.Select(table.countStaying, kind, load));
  }
  return staying;
}

void DestroyUnused(HostState& state, const std::vector<std::string>& names, LoadEnding& ending) {
  for (const std::string& name : names) {
    const Domain domain = state.Domains().Get(name);
    const DomainReferences references = state.Domains().CountReferences(domain);
    if (references.worlds + references.roles != 0) {
      ending.staying.domains.push_back(name);
      continue;
    }
    state.Domains().Destroy(domain.id);
    ending.removed.domains.push_back(name);
  }
}

}  // namespace

PolicyTransaction::PolicyTransaction()
    : state(HostState::Current().shared_from_this()),
      transaction(std::make_unique<Transaction>(state->Database())) {
  state->Refresh();
}

PolicyTransaction::~PolicyTransaction() { Undo(); }

void PolicyTransaction::BeginLoad(const LoadSource& source) {
  Store& store = state->Database();
  kind = source.kind;
  defined = source.domains;
  const int kindNumber = static_cast<int>(kind);
  const std::uint64_t number =
      1 + Number(store.Select("SELECT coalesce(max(number), 0) FROM policy_load"));
  store.Run("INSERT INTO policy_load VALUES (?1, ?2, ?3)", number, kindNumber, source.directory);
  for (const TableStatements& table : kTables) store.Run(table.keepOthers, kindNumber);
  std::set<std::string, std::less<>> hidden;
  for (std::string& name : DomainsWithoutFile(*state, kindNumber, defined)) {
    hidden.insert(std::move(name));
  }
  state->Domains().Hide(std::move(hidden));
  state->SetCurrentLoad(static_cast<std::int64_t>(number));
}

void PolicyTransaction::SetLine(unsigned int line) { state->SetCurrentLine(line); }

LoadEnding PolicyTransaction::EndLoad(bool remove) {
  Store& store = state->Database();
  const int kindNumber = static_cast<int>(kind);
  const std::int64_t number = state->CurrentLoad();
  state->SetCurrentLoad(0);
  state->SetCurrentLine(0);
  state->Domains().Hide({});
  for (const TableStatements& table : kTables) store.Run(table.dropUncovered);

  LoadEnding ending;
  std::vector<std::string> leaving = DomainsWithoutFile(*state, kindNumber, defined);
  if (remove) {
    ending.removed.rules = RemoveStayingRules(store, kindNumber, number);
    DestroyUnused(*state, leaving, ending);
  } else {
    ending.staying = {.rules = CountStayingRules(store, kindNumber, number),
                      .domains = std::move(leaving)};
  }
  for (const std::string& name : defined) {
    store.Run("INSERT OR REPLACE INTO policy_domain VALUES (?1, ?2, ?3)", kindNumber, name, number);
  }
  for (const std::string& name : ending.removed.domains) {
    store.Run("DELETE FROM policy_domain WHERE name = ?1", name);
  }
  if (remove) {
    store.Run("DELETE FROM policy_load WHERE kind = ?1 AND number <> ?2", kindNumber, number);
  }
  return ending;
}

void PolicyTransaction::Commit() {
  transaction->Commit();
  transaction.reset();
}

void PolicyTransaction::Undo() {
  if (transaction == nullptr) return;
  transaction.reset();
  state->SetCurrentLoad(0);
  state->SetCurrentLine(0);
  state->Domains().Hide({});
  state->Forget();
}

}  // namespace LinuxHost
