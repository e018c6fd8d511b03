#include "host/linux/operation/load_record.h"

#include <algorithm>

#include "host/linux/state/host_state.h"

namespace LinuxHost {

void RecordLoad(HostState& state, const LoadRecord& record) {
  Store& store = state.Database();
  Transaction transaction(store);
  store.Run("DELETE FROM load_record");
  store.Run("DELETE FROM load_error");
  store.Run("INSERT INTO load_record VALUES (1, ?1, ?2, ?3, ?4, ?5, ?6, ?7)", record.verb,
            record.directory, record.time, record.ending, record.errorCount, record.removedRules,
            record.removedDomains);
  const std::size_t kept = std::min(record.errors.size(), kKeptErrors);
  for (std::size_t index = 0; index < kept; ++index) {
    store.Run("INSERT INTO load_error VALUES (?1, ?2)", index, record.errors[index]);
  }
  transaction.Commit();
}

std::optional<LoadRecord> LatestLoad(HostState& state) {
  Store& store = state.Database();
  LoadRecord record;
  {
    Rows rows = store.Select(
        "SELECT verb, directory, time, ending, error_count, removed_rules, removed_domains FROM "
        "load_record");
    if (!rows.Next()) return std::nullopt;
    record.verb = rows.Text(0);
    record.directory = rows.Text(1);
    record.time = rows.Integer(2);
    record.ending = rows.Text(3);
    record.errorCount = static_cast<std::uint64_t>(rows.Integer(4));
    record.removedRules = static_cast<std::uint64_t>(rows.Integer(5));
    record.removedDomains = static_cast<std::uint64_t>(rows.Integer(6));
  }
  Rows rows = store.Select("SELECT message FROM load_error ORDER BY id");
  while (rows.Next()) record.errors.push_back(rows.Text(0));
  return record;
}

void RecordLoadedBundle(HostState& state, const std::string& digest) {
  Store& store = state.Database();
  Transaction transaction(store);
  store.Run("DELETE FROM loaded_bundle");
  if (!digest.empty()) store.Run("INSERT INTO loaded_bundle VALUES (?1)", digest);
  transaction.Commit();
}

std::string LoadedBundle(HostState& state) {
  Rows rows = state.Database().Select("SELECT digest FROM loaded_bundle");
  return rows.Next() ? rows.Text(0) : "";
}

}  // namespace LinuxHost
