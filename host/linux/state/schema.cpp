#include "host/linux/state/schema.h"

namespace LinuxHost {
namespace {

// Rules and policies are read in the order of their `id`, which is that of their installation.
// Their `load` is the load that installed them, or 0. What one load installs in place of what
// another, or a service, has installed is kept beside it (covered_...), to come back when its file
// drops it.
constexpr char kTables[] = R"sql(
CREATE TABLE state (
  one INTEGER PRIMARY KEY CHECK (one = 1),
  domain_version INTEGER NOT NULL,
  label_version INTEGER NOT NULL,
  label_attribute TEXT NOT NULL,
  label_index INTEGER NOT NULL
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
  domain_id INTEGER NOT NULL,
  level TEXT NOT NULL
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
CREATE TABLE loaded_bundle (digest TEXT NOT NULL);
INSERT INTO state VALUES (1, 1, 1, '', 0);
)sql";

// The regular files among the inodes, as a kernel knows them.
constexpr char kAddition[] = R"sql(
CREATE TABLE unpacked_file (
  device INTEGER NOT NULL,
  inode INTEGER NOT NULL,
  generation INTEGER NOT NULL,
  tardisk TEXT NOT NULL,
  PRIMARY KEY (device, inode)
) WITHOUT ROWID;
)sql";

constexpr char kFirstRows[] = R"sql(
INSERT INTO domain VALUES (0, 'hostDom', 'permissive', 0, 0);
INSERT INTO label VALUES (2, 'unlabeled'), (3, 'tardiskDefault');
)sql";

}  // namespace

const StoreLayout kStateLayout = {
    .purpose = "host state",
    .remedy = "Remove the file and run \"secpolicy boot\", which makes a new one",
    .applicationId = 0x5a6f7276,
    .version = 6,
    .schema = kTables,
    .addition = kAddition,
    .firstRows = kFirstRows,
    .survivesPowerLoss = false,
};

}  // namespace LinuxHost
