#include "host/linux/state/host_state.h"

#include <sys/stat.h>

#include <cerrno>
#include <filesystem>

#include "host/linux/common/used_paths.h"
#include "host/linux/state/domain_table.h"
#include "host/linux/state/file_policy_table.h"
#include "host/linux/state/label_table.h"
#include "host/linux/state/parameter_rule_table.h"
#include "host/linux/state/rule_table.h"
#include "host/linux/state/world_table.h"

namespace LinuxHost {
namespace {

// Rules and policies are read in the order of their `id`, which is that of their installation.
// Their `load` is the load that installed them, or 0. What one load installs in place of what
// another, or a service, has installed is kept beside it (covered_...), to come back when its file
// drops it.
constexpr char kSchema[] = R"sql(
CREATE TABLE state (
  one INTEGER PRIMARY KEY CHECK (one = 1),
  domain_version INTEGER NOT NULL,
  label_version INTEGER NOT NULL,
  label_attribute TEXT NOT NULL
);
CREATE TABLE domain (
  id INTEGER PRIMARY KEY,
  name TEXT NOT NULL UNIQUE,
  level TEXT NOT NULL,
  default_rules INTEGER NOT NULL,
  created_at_run_time INTEGER NOT NULL
);
CREATE TABLE role (name TEXT PRIMARY KEY, domain_id INTEGER NOT NULL) WITHOUT ROWID;
CREATE TABLE guest_service (
  domain_id INTEGER NOT NULL,
  service TEXT NOT NULL,
  PRIMARY KEY (domain_id, service)
) WITHOUT ROWID;
CREATE TABLE label (
  id INTEGER PRIMARY KEY AUTOINCREMENT CHECK (id BETWEEN 2 AND 4294967295),
  name TEXT NOT NULL UNIQUE
);
CREATE TABLE rule (
  id INTEGER PRIMARY KEY,
  domain_id INTEGER NOT NULL,
  kind TEXT NOT NULL,
  word1 TEXT NOT NULL,
  word2 TEXT NOT NULL,
  word3 TEXT NOT NULL,
  granted INTEGER NOT NULL,
  line INTEGER NOT NULL,
  load INTEGER NOT NULL,
  UNIQUE (domain_id, kind, word1, word2, word3)
);
CREATE INDEX transition_target ON rule (word2) WHERE kind = 'domain transition';
CREATE TABLE parameter_rule (
  id INTEGER PRIMARY KEY,
  domain_id INTEGER NOT NULL,
  parameter_check TEXT NOT NULL,
  first_value INTEGER NOT NULL,
  last_value INTEGER NOT NULL,
  first_word TEXT NOT NULL,
  last_word TEXT NOT NULL,
  granted INTEGER NOT NULL,
  line INTEGER NOT NULL,
  load INTEGER NOT NULL,
  UNIQUE (domain_id, parameter_check, first_value, last_value)
);
CREATE TABLE file_policy (
  id INTEGER PRIMARY KEY,
  domain_id INTEGER NOT NULL,
  world INTEGER NOT NULL,
  path TEXT NOT NULL,
  permission INTEGER NOT NULL,
  line INTEGER NOT NULL,
  load INTEGER NOT NULL,
  UNIQUE (domain_id, world, path)
);
CREATE TABLE policy_load (
  number INTEGER PRIMARY KEY,
  kind INTEGER NOT NULL,
  directory TEXT NOT NULL
);
CREATE TABLE policy_domain (
  kind INTEGER NOT NULL,
  name TEXT NOT NULL,
  load INTEGER NOT NULL,
  PRIMARY KEY (kind, name)
) WITHOUT ROWID;
CREATE TABLE covered_rule (
  id INTEGER NOT NULL,
  domain_id INTEGER NOT NULL,
  kind TEXT NOT NULL,
  word1 TEXT NOT NULL,
  word2 TEXT NOT NULL,
  word3 TEXT NOT NULL,
  granted INTEGER NOT NULL,
  line INTEGER NOT NULL,
  load INTEGER NOT NULL
);
CREATE TABLE covered_parameter_rule (
  id INTEGER NOT NULL,
  domain_id INTEGER NOT NULL,
  parameter_check TEXT NOT NULL,
  first_value INTEGER NOT NULL,
  last_value INTEGER NOT NULL,
  first_word TEXT NOT NULL,
  last_word TEXT NOT NULL,
  granted INTEGER NOT NULL,
  line INTEGER NOT NULL,
  load INTEGER NOT NULL
);
CREATE TABLE covered_file_policy (
  id INTEGER NOT NULL,
  domain_id INTEGER NOT NULL,
  world INTEGER NOT NULL,
  path TEXT NOT NULL,
  permission INTEGER NOT NULL,
  line INTEGER NOT NULL,
  load INTEGER NOT NULL
);
CREATE TABLE world (
  id INTEGER PRIMARY KEY,
  started INTEGER NOT NULL,
  domain_id INTEGER NOT NULL
);
CREATE TABLE inode_origin (
  device INTEGER NOT NULL,
  inode INTEGER NOT NULL,
  tardisk TEXT NOT NULL,
  path TEXT NOT NULL,
  birth INTEGER NOT NULL,
  size INTEGER NOT NULL,
  modified INTEGER NOT NULL,
  PRIMARY KEY (device, inode)
) WITHOUT ROWID;
CREATE TABLE rule_origin (
  domain TEXT NOT NULL,
  rule TEXT NOT NULL,
  file TEXT NOT NULL,
  line INTEGER NOT NULL,
  PRIMARY KEY (domain, rule)
) WITHOUT ROWID;
CREATE TABLE label_origin (
  id INTEGER PRIMARY KEY,
  path TEXT NOT NULL,
  is_tree INTEGER NOT NULL,
  label TEXT NOT NULL,
  file TEXT NOT NULL,
  line INTEGER NOT NULL,
  UNIQUE (path, is_tree)
);
CREATE TABLE load_record (
  one INTEGER PRIMARY KEY CHECK (one = 1),
  verb TEXT NOT NULL,
  directory TEXT NOT NULL,
  time INTEGER NOT NULL,
  ending TEXT NOT NULL,
  error_count INTEGER NOT NULL,
  removed_rules INTEGER NOT NULL,
  removed_domains INTEGER NOT NULL
);
CREATE TABLE load_error (id INTEGER PRIMARY KEY, message TEXT NOT NULL);
INSERT INTO state VALUES (1, 1, 1, '');
INSERT INTO domain VALUES (0, 'hostDom', 'permissive', 0, 0);
INSERT INTO label VALUES (2, 'unlabeled'), (3, 'tardiskDefault');
)sql";

constexpr StoreLayout kLayout = {
    .purpose = "host state",
    .remedy = "Remove the file and run \"secpolicy boot\", which makes a new one",
    .applicationId = 0x5a6f7276,
    .version = kStateVersion,
    .schema = kSchema,
    .survivesPowerLoss = false,
};

}  // namespace

HostState& HostState::Current() {
  thread_local std::shared_ptr<HostState> current;
  // A load keeps to the state that it began with.
  if (current != nullptr && current->currentLoad != 0 && !current->store.WasForked())
    return *current;
  const std::string path = StatePath();
  if (current == nullptr || current->store.Path() != path || !current->store.IsCurrent()) {
    current.reset();
    current = std::make_shared<HostState>(path);
  }
  return *current;
}

HostState* HostState::Find() {
  struct stat status;
  // Anything but a missing file is for the store to judge.
  const bool isMissing =
      lstat(StatePath().c_str(), &status) != 0 && (errno == ENOENT || errno == ENOTDIR);
  return isMissing ? nullptr : &Current();
}

HostState::HostState(const std::string& path)
    : store(path, kLayout),
      domains(std::make_unique<DomainTable>(*this)),
      labels(std::make_unique<LabelTable>(*this)),
      rules(std::make_unique<RuleTable>(*this)),
      parameterRules(std::make_unique<ParameterRuleTable>(*this)),
      filePolicies(std::make_unique<FilePolicyTable>(*this)),
      worlds(std::make_unique<WorldTable>(*this)) {
  Refresh();
}

HostState::~HostState() = default;

std::string HostState::Directory() const {
  return std::filesystem::path(store.Path()).parent_path();
}

void HostState::Refresh() {
  if (marked && store.IsAt(seen)) return;
  // The mark is taken first: what is then read is at least as new.
  Store::CommitMark now{};
  const bool told = store.ReadCommitMark(&now);
  Rows rows = store.Select("SELECT domain_version, label_version, label_attribute FROM state");
  if (!rows.Next()) store.TellDamage("the table state is empty");
  domains->Notice(rows.Integer(0));
  labels->Notice(rows.Integer(1));
  labelAttribute = rows.Text(2);
  marked = told;
  seen = now;
}

void HostState::Forget() {
  domains->Forget();
  labels->Forget();
  marked = false;
}

void HostState::Reset() {
  Transaction transaction(store);
  store.Run("DELETE FROM domain");
  store.Run("DELETE FROM role");
  store.Run("DELETE FROM guest_service");
  store.Run("DELETE FROM label");
  store.Run("DELETE FROM sqlite_sequence");
  store.Run("DELETE FROM rule");
  store.Run("DELETE FROM parameter_rule");
  store.Run("DELETE FROM file_policy");
  store.Run("DELETE FROM policy_load");
  store.Run("DELETE FROM policy_domain");
  store.Run("DELETE FROM covered_rule");
  store.Run("DELETE FROM covered_parameter_rule");
  store.Run("DELETE FROM covered_file_policy");
  store.Run("DELETE FROM world");
  store.Run("DELETE FROM inode_origin");
  store.Run("DELETE FROM rule_origin");
  store.Run("DELETE FROM label_origin");
  store.Run("DELETE FROM load_record");
  store.Run("DELETE FROM load_error");
  store.Run("INSERT INTO domain VALUES (0, 'hostDom', 'permissive', 0, 0)");
  store.Run("INSERT INTO label VALUES (2, 'unlabeled'), (3, 'tardiskDefault')");
  // The versions go on, so that every process notices.
  store.Run(
      "UPDATE state SET domain_version = domain_version + 1, label_version = label_version + 1, "
      "label_attribute = ''");
  transaction.Commit();
  Forget();
  Refresh();
}

void HostState::RecordOrigins(std::span<const InodeOrigin> origins) {
  Transaction transaction(store);
  for (const auto& origin : origins) {
    store.Run("INSERT OR REPLACE INTO inode_origin VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7)",
              origin.device, origin.inode, origin.tardisk, origin.path, origin.birth, origin.size,
              origin.modified);
  }
  transaction.Commit();
}

std::optional<InodeOrigin> HostState::FindOrigin(dev_t device, ino_t inode) {
  Rows rows = store.Select(
      "SELECT tardisk, path, birth, size, modified FROM inode_origin WHERE device = ?1 AND inode = "
      "?2",
      device, inode);
  if (!rows.Next()) return std::nullopt;
  return InodeOrigin{.device = device,
                     .inode = inode,
                     .tardisk = rows.Text(0),
                     .path = rows.Text(1),
                     .birth = rows.Integer(2),
                     .size = static_cast<std::uint64_t>(rows.Integer(3)),
                     .modified = rows.Integer(4)};
}

const std::string& HostState::LabelAttribute() {
  Refresh();
  return labelAttribute;
}

const std::string& HostState::ChooseLabelAttribute(const std::string& name) {
  store.Run("UPDATE state SET label_attribute = ?1 WHERE label_attribute = ''", name);
  Forget();
  return LabelAttribute();
}

}  // namespace LinuxHost
