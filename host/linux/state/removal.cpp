#include "host/linux/state/removal.h"

#include "braxo/misc/strcat.h"
#include "host/linux/state/schema.h"

namespace LinuxHost {

using Braxo::Misc::StrCat;

void RemoveWithRules(Store& store, const Domain& domain) {
  store.Run("DELETE FROM domain WHERE id = ?1", domain.id);
  for (const StateTable& table : kStateTables) {
    if (!table.isOfDomains) continue;
    store.RunScript(StrCat("DELETE FROM ", table.name, " WHERE domain_id = ", domain.id));
  }
  store.Run("DELETE FROM rule WHERE kind = 'domain transition' AND word2 = ?1", domain.name);
  RemoveUnnamedRules(store);
}

void RemoveUnnamedRules(Store& store) {
  store.Run(
      "DELETE FROM rule WHERE kind NOT IN ('system call', 'capability') AND ("
      "word1 NOT IN (SELECT name FROM label UNION ALL SELECT name FROM domain) OR "
      "kind = 'file creation' AND "
      "word2 NOT IN (SELECT name FROM label UNION ALL SELECT name FROM domain))");
  store.Run(
      "DELETE FROM covered_rule WHERE kind NOT IN ('system call', 'capability') AND ("
      "word1 NOT IN (SELECT name FROM label UNION ALL SELECT name FROM domain) OR "
      "kind = 'file creation' AND "
      "word2 NOT IN (SELECT name FROM label UNION ALL SELECT name FROM domain) OR "
      "kind = 'domain transition' AND word2 NOT IN (SELECT name FROM domain))");
}

}  // namespace LinuxHost
