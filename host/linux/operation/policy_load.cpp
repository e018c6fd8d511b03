// A load is one transaction: it can be undone until its end, and others see nothing of it before.
//
// To know what no file has any more without comparing rules, each rule keeps the number of the load
// that installed it: what a load finds again gets its number, and of its own kind the rest is to
// go. What belonged to others, an early load or a service, and is covered by a rule of the load is
// kept aside (covered_...), and comes back when a later load of the kind leaves it uncovered.
#include "host/linux/operation/policy_load.h"

#include <algorithm>
#include <set>
#include <utility>

#include "braxo/misc/strcat.h"
#include "host/linux/state/host_state.h"

namespace LinuxHost {
namespace {

using Braxo::Misc::StrCat;

// A table of rules that a load may cover, which the table covered_... keeps then. A rule that the
// load covers has got another identifier with its new content.
struct RuleTableColumns {
  const char* name;
  const char* key;      // what a rule is about: no two have the same
  const char* content;  // all columns but the identifier
  const char* isOfLoads;
};

constexpr RuleTableColumns kRuleTables[] = {
    {.name = "rule",
     .key = "domain_id, kind, word1, word2, word3",
     .content = "domain_id, kind, word1, word2, word3, granted, line, load",
     .isOfLoads = "true"},
    {.name = "parameter_rule",
     .key = "domain_id, parameter_check, first_value, last_value",
     .content = "domain_id, parameter_check, first_value, last_value, first_word, last_word, "
                "granted, line, load",
     .isOfLoads = "true"},
    {.name = "file_policy",
     .key = "domain_id, world, path",
     .content = "domain_id, world, path, permission, line, load",
     .isOfLoads = "world = 0"},
};

std::string LoadsOf(int kind) {
  return StrCat("(SELECT number FROM policy_load WHERE kind = ", kind, ")");
}

// Keeps all rules of others, of which the load may cover some.
void KeepOthers(Store& store, const RuleTableColumns& table, int kind) {
  store.RunScript(StrCat("INSERT INTO covered_", table.name, " SELECT * FROM ", table.name,
                         " WHERE ", table.isOfLoads, " AND load NOT IN ", LoadsOf(kind)));
}

// Forgets the kept rules that have one with the same `columns` in the table itself.
void DropKept(Store& store, const RuleTableColumns& table, const std::string& columns) {
  // In the order that uses the index of the second.
  store.RunScript(StrCat("DELETE FROM covered_", table.name,
                         " WHERE rowid IN (SELECT kept.rowid FROM covered_", table.name,
                         " AS kept CROSS JOIN ", table.name, " USING (", columns, "))"));
}

// False at a boot: then nothing can stay, and all rules need not be looked at.
bool HasEarlierLoad(Store& store, int kind, std::int64_t load) {
  return store.ReadInteger(StrCat("SELECT count(*) FROM policy_load WHERE kind = ", kind,
                                  " AND number <> ", load)) != 0;
}

// The rules of the load's own kind that it has not installed.
std::string StayingRules(const RuleTableColumns& table, int kind, std::int64_t load) {
  return StrCat(" FROM ", table.name, " WHERE load <> ", load, " AND load IN ", LoadsOf(kind));
}

// Removes them, and puts back what is not covered any more. Returns how many are gone then.
int RemoveStaying(Store& store, const RuleTableColumns& table, int kind, std::int64_t load) {
  // What the kind itself had, and others had covered.
  store.RunScript(StrCat("DELETE FROM covered_", table.name, " WHERE load IN ", LoadsOf(kind)));
  const int gone = HasEarlierLoad(store, kind, load)
                       ? store.RunScript("DELETE" + StayingRules(table, kind, load))
                       : 0;
  const int back =
      store.RunScript(StrCat("INSERT OR IGNORE INTO ", table.name, " (", table.content, ") SELECT ",
                             table.content, " FROM (SELECT *, max(id) FROM covered_", table.name,
                             " GROUP BY ", table.key, ") ORDER BY id"));
  DropKept(store, table, StrCat(table.key, ", load"));
  return gone - back;
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

// Some of those that go uncover what an early load, or a service, wants.
std::uint64_t RemoveStayingRules(Store& store, int kind, std::int64_t load) {
  std::uint64_t removed = 0;
  for (const RuleTableColumns& table : kRuleTables) {
    removed += static_cast<std::uint64_t>(std::max(RemoveStaying(store, table, kind, load), 0));
  }
  return removed;
}

std::uint64_t CountStayingRules(Store& store, int kind, std::int64_t load) {
  if (!HasEarlierLoad(store, kind, load)) return 0;
  std::int64_t staying = 0;
  for (const RuleTableColumns& table : kRuleTables) {
    staying += store.ReadInteger("SELECT count(*)" + StayingRules(table, kind, load));
  }
  return static_cast<std::uint64_t>(staying);
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

PolicyTransaction::PolicyTransaction(HostState& hostState)
    : state(hostState.shared_from_this()),
      transaction(std::make_unique<Transaction>(state->Database())) {
  state->Refresh();
}

PolicyTransaction::~PolicyTransaction() { Undo(); }

void PolicyTransaction::BeginLoad(const LoadSource& source) {
  Store& store = state->Database();
  kind = source.kind;
  defined = source.domains;
  const int kindNumber = static_cast<int>(kind);
  const std::int64_t number =
      1 + store.ReadInteger("SELECT coalesce(max(number), 0) FROM policy_load");
  store.Run("INSERT INTO policy_load VALUES (?1, ?2, ?3)", number, kindNumber, source.directory);
  for (const RuleTableColumns& table : kRuleTables) KeepOthers(store, table, kindNumber);
  std::set<std::string, std::less<>> hidden;
  for (std::string& name : DomainsWithoutFile(*state, kindNumber, defined)) {
    hidden.insert(std::move(name));
  }
  state->Domains().Hide(std::move(hidden));
  state->SetCurrentLoad(number);
}

void PolicyTransaction::SetLine(unsigned int line) { state->SetCurrentLine(line); }

LoadEnding PolicyTransaction::EndLoad(bool remove) {
  Store& store = state->Database();
  const int kindNumber = static_cast<int>(kind);
  const std::int64_t number = state->CurrentLoad();
  state->SetCurrentLoad(0);
  state->SetCurrentLine(0);
  state->Domains().Hide({});
  // What is still there was not covered.
  for (const RuleTableColumns& table : kRuleTables) DropKept(store, table, "id, load");

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
