#include "rule_origins.h"

#include "host_state.h"

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

}  // namespace

void RecordOrigins(std::span<const RuleOrigin> rules, std::span<const LabelOrigin> labels) {
  Store& store = HostState::Current().Database();
  Transaction transaction(store);
  for (const RuleOrigin& origin : rules) {
    store.Run("INSERT OR REPLACE INTO rule_origin VALUES (?1, ?2, ?3, ?4)", origin.domain,
              origin.rule, origin.file, origin.line);
  }
  for (const LabelOrigin& origin : labels) {
    store.Run(
        "INSERT OR REPLACE INTO label_origin (path, is_tree, label, file, line) "
        "VALUES (?1, ?2, ?3, ?4, ?5)",
        origin.path, origin.isTree, origin.label, origin.file, origin.line);
  }
  transaction.Commit();
}

std::vector<RuleOrigin> FindRuleOrigins(const std::string& domain) {
  std::vector<RuleOrigin> origins;
  Rows rows = HostState::Current().Database().Select(
      "SELECT rule, file, line FROM rule_origin WHERE domain = ?1", domain);
  while (rows.Next()) {
    origins.push_back({.domain = domain,
                       .rule = rows.Text(0),
                       .file = rows.Text(1),
                       .line = static_cast<unsigned int>(rows.Integer(2))});
  }
  return origins;
}

std::optional<LabelOrigin> FindLabelOrigin(const std::string& path) {
  Store& store = HostState::Current().Database();
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

}  // namespace LinuxHost
