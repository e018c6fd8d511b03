#include "host/linux/operation/rule_origins.h"

#include <utility>

#include "host/linux/state/host_state.h"

namespace LinuxHost {
namespace {

// The latest of some lines that give labels.
struct LatestLabel {
  std::int64_t id = 0;
  std::optional<LabelOrigin> origin;
};

void KeepLater(Store& store, const std::string& path, bool isTree, LatestLabel& latest) {
  Rows rows = store.Select(
      "SELECT id, label, file, line FROM label_origin WHERE path = ?1 AND is_tree = ?2", path,
      isTree);
  if (!rows.Next() || rows.Integer(0) < latest.id) return;
  latest.id = rows.Integer(0);
  latest.origin = LabelOrigin{.path = path,
                              .isTree = isTree,
                              .label = rows.Text(1),
                              .file = rows.Text(2),
                              .line = static_cast<unsigned int>(rows.Integer(3))};
}

std::vector<RuleSource> ReadSources(Rows rows) {
  std::vector<RuleSource> sources;
  while (rows.Next()) {
    RuleSource source{
        .kind = std::nullopt, .directory = rows.Text(1), .isCurrent = rows.Integer(2) != 0};
    if (rows.Integer(0) != 0) source.kind = static_cast<LoadKind>(rows.Integer(0));
    sources.push_back(std::move(source));
  }
  return sources;
}

}  // namespace

std::vector<RuleSource> FindRuleSources(HostState& state, unsigned int id, Policy::RuleKind kind) {
  Store& store = state.Database();
  if (kind == Policy::RuleKind::kParameterCheck) {
    return ReadSources(store.Select(
        "SELECT p.kind, p.directory, p.kind IS NULL OR p.number = "
        "(SELECT max(number) FROM policy_load WHERE kind = p.kind) FROM parameter_rule AS r "
        "LEFT JOIN policy_load AS p ON p.number = r.load WHERE r.domain_id = ?1 ORDER BY r.id",
        id));
  }
  if (kind == Policy::RuleKind::kFilePath) {
    return ReadSources(store.Select(
        "SELECT p.kind, p.directory, p.kind IS NULL OR p.number = "
        "(SELECT max(number) FROM policy_load WHERE kind = p.kind) FROM file_policy AS r "
        "LEFT JOIN policy_load AS p ON p.number = r.load "
        "WHERE r.domain_id = ?1 AND r.world = 0 ORDER BY r.id",
        id));
  }
  return ReadSources(
      store.Select("SELECT p.kind, p.directory, p.kind IS NULL OR p.number = "
                   "(SELECT max(number) FROM policy_load WHERE kind = p.kind) FROM rule AS r "
                   "LEFT JOIN policy_load AS p ON p.number = r.load "
                   "WHERE r.domain_id = ?1 AND r.kind = +?2 ORDER BY r.id",
                   id, FormOf(kind).name));
}

std::vector<std::string> FindDomainsWithoutFile(HostState& state) {
  std::vector<std::string> names;
  Rows rows = state.Database().Select(
      "SELECT p.name FROM policy_domain AS p JOIN domain AS d ON d.name = p.name "
      "WHERE NOT d.created_at_run_time AND d.id <> 0 GROUP BY p.name HAVING max(p.load = "
      "(SELECT max(number) FROM policy_load WHERE kind = p.kind)) = 0 ORDER BY p.name");
  while (rows.Next()) names.push_back(rows.Text(0));
  return names;
}

void RecordOrigins(HostState& state, std::span<const RuleOrigin> rules,
                   std::span<const LabelOrigin> labels) {
  Store& store = state.Database();
  Transaction transaction(store);
  for (const RuleOrigin& origin : rules) {
    store.Run("INSERT OR REPLACE INTO rule_origin VALUES (?1, ?2, ?3, ?4)", origin.domain,
              origin.rule.Text(), origin.rule.origin.file, origin.rule.origin.line);
  }
  for (const LabelOrigin& origin : labels) {
    store.Run(
        "INSERT OR REPLACE INTO label_origin (path, is_tree, label, file, line) "
        "VALUES (?1, ?2, ?3, ?4, ?5)",
        origin.path, origin.isTree, origin.label, origin.file, origin.line);
  }
  transaction.Commit();
}

void FindRuleOrigins(HostState& state, const std::string& domain, std::span<Policy::Rule> rules) {
  // A rule's text stands for its kind, words and verdict.
  std::unordered_map<std::string, Policy::Origin> recorded;
  Rows rows =
      state.Database().Select("SELECT rule, file, line FROM rule_origin WHERE domain = ?1", domain);
  while (rows.Next()) {
    recorded[rows.Text(0)] = {.file = rows.Text(1),
                              .line = static_cast<unsigned int>(rows.Integer(2))};
  }
  if (recorded.empty()) return;
  for (Policy::Rule& rule : rules) {
    const auto found = recorded.find(rule.Text());
    if (found == recorded.end()) continue;
    rule.origin.file = found->second.file;
    rule.origin.line = found->second.line;
  }
}

std::optional<LabelOrigin> FindLabelOrigin(HostState& state, const std::string& path) {
  Store& store = state.Database();
  LatestLabel latest;
  KeepLater(store, path, false, latest);
  std::string tree = path;
  KeepLater(store, tree, true, latest);
  while (!tree.empty()) {
    tree.resize(tree.find_last_of('/') == std::string::npos ? 0 : tree.find_last_of('/'));
    KeepLater(store, tree, true, latest);
  }
  return latest.origin;
}

std::vector<LabelOrigin> ListLabelOrigins(HostState& state) {
  std::vector<LabelOrigin> origins;
  Rows rows = state.Database().Select(
      "SELECT path, is_tree, label, file, line FROM label_origin ORDER BY id");
  while (rows.Next()) {
    origins.push_back({.path = rows.Text(0),
                       .isTree = rows.Integer(1) != 0,
                       .label = rows.Text(2),
                       .file = rows.Text(3),
                       .line = static_cast<unsigned int>(rows.Integer(4))});
  }
  return origins;
}

}  // namespace LinuxHost
