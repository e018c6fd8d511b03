#include "host/linux/state/file_policy_table.h"

#include <algorithm>
#include <cerrno>
#include <optional>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/require_text.h"
#include "host/linux/state/checked_install.h"
#include "host/linux/state/world_table.h"

using Braxo::Misc::StrCat;

namespace LinuxHost {
namespace {

constexpr TextLimit kPath = {
    .noun = "path", .whenEmpty = "a file policy needs a path", .maxSize = kMaxPolicyPath};

void RequirePermission(unsigned int permission) {
  if ((permission & ~Policy::Permissions::kAllBits) != 0) {
    throw HostError(EINVAL, StrCat("unknown permission bits in ", permission));
  }
}

void RequireWorld(int world) {
  if (world != 0) WorldTable::RequireAlive(world);
}

bool IsForTheSame(const FilePolicy& one, const FilePolicy& other) {
  return one.path == other.path && one.world == other.world && one.domain.id == other.domain.id &&
         one.domain.name == other.domain.name;
}

bool AreForTheSame(std::span<const FilePolicy> policies) {
  return std::ranges::all_of(
      policies, [&](const FilePolicy& policy) { return IsForTheSame(policy, policies.front()); });
}

}  // namespace

void FilePolicyTable::RequireDomain(unsigned int domainId) {
  base.Refresh();
  domains.Get(domainId);
}

void FilePolicyTable::Install(std::span<const FilePolicy> policies) {
  // A single row is a step by itself.
  std::optional<Transaction> transaction;
  if (!AreForTheSame(policies)) transaction.emplace(base.Database());
  for (std::size_t index = 0; index < policies.size(); ++index) {
    const FilePolicy& policy = policies[index];
    RequireWorld(policy.world);
    RequireText(policy.path, kPath);
    RequirePermission(policy.permission);
    // A path often comes twice in a row, as it is written and as it resolves: the second one would
    // replace the first.
    if (index + 1 < policies.size() && IsForTheSame(policy, policies[index + 1])) continue;
    InstallChecked(
        base, [&] { return domains.Refusal(policy.domain); },
        [&] { return InstallIfUnchanged(policy); });
  }
  if (transaction) transaction->Commit();
}

bool FilePolicyTable::InstallIfUnchanged(const FilePolicy& policy) {
  if (base.CurrentLoad() != 0) {
    base.Database().Run(
        "INSERT OR REPLACE INTO file_policy (domain_id, world, path, permission, line, load) "
        "VALUES (?1, ?2, ?3, ?4, ?5, ?6)",
        policy.domain.id, policy.world, policy.path, policy.permission, policy.line,
        base.CurrentLoad());
    return true;
  }
  return base.Database().Run(
             "INSERT OR REPLACE INTO file_policy (domain_id, world, path, permission, line, load) "
             "SELECT ?1, ?2, ?3, ?4, ?5, ?6 FROM state WHERE domain_version = ?7",
             policy.domain.id, policy.world, policy.path, policy.permission, policy.line,
             base.CurrentLoad(), base.DomainVersion()) != 0;
}

void FilePolicyTable::Remove(unsigned int domainId, int world, const std::string& path) {
  Transaction transaction(base.Database());
  RequireDomain(domainId);
  const int removed = base.Database().Run(
      "DELETE FROM file_policy WHERE domain_id = ?1 AND world = ?2 AND path = ?3", domainId, world,
      path);
  if (removed == 0) throw HostError(ENOENT, StrCat("no file policy for '", path, "'"));
  base.Database().Run(
      "DELETE FROM covered_file_policy WHERE domain_id = ?1 AND world = ?2 AND path = ?3", domainId,
      world, path);
  transaction.Commit();
}

void FilePolicyTable::Update(unsigned int domainId, const std::string& path,
                             unsigned int permission) {
  Transaction transaction(base.Database());
  RequireDomain(domainId);
  RequirePermission(permission);
  const int updated = base.Database().Run(
      "UPDATE file_policy SET permission = ?3 WHERE domain_id = ?1 AND path = ?2", domainId, path,
      permission);
  if (updated == 0) throw HostError(ENOENT, StrCat("no file policy for '", path, "'"));
  transaction.Commit();
}

void FilePolicyTable::RePoint(const std::string& oldPath, const std::string& newPath) {
  RequireText(newPath, kPath);
  const int moved = base.Database().Run(
      "UPDATE OR REPLACE file_policy SET path = ?2 WHERE path = ?1 AND world <> 0", oldPath,
      newPath);
  if (moved == 0) throw HostError(ENOENT, StrCat("no world has a file policy for '", oldPath, "'"));
}

unsigned int FilePolicyTable::Count(unsigned int domainId) {
  const Transaction transaction(base.Database());
  RequireDomain(domainId);
  Rows rows =
      base.Database().Select("SELECT count(*) FROM file_policy WHERE domain_id = ?1", domainId);
  rows.Next();
  return static_cast<unsigned int>(rows.Integer(0));
}

std::vector<FilePolicy> FilePolicyTable::All(unsigned int domainId) {
  const Transaction transaction(base.Database());
  RequireDomain(domainId);
  std::vector<FilePolicy> policies;
  Rows rows = base.Database().Select(
      "SELECT world, path, permission, line FROM file_policy WHERE domain_id = ?1 ORDER BY id",
      domainId);
  while (rows.Next()) {
    policies.push_back({.domain = {domainId, {}},
                        .world = static_cast<int>(rows.Integer(0)),
                        .path = rows.Text(1),
                        .permission = static_cast<unsigned int>(rows.Integer(2)),
                        .line = static_cast<unsigned int>(rows.Integer(3))});
  }
  return policies;
}

std::vector<Policy::Rule> FilePolicyTable::Read(unsigned int domainId) {
  Rows rows = base.Database().Select(
      "SELECT path, permission, line FROM file_policy WHERE id IN "
      "(SELECT id FROM file_policy WHERE domain_id = ?1 AND world = 0) ORDER BY id",
      domainId);
  // Growing from nothing would move each rule twice; few domains have more.
  constexpr std::size_t kRoom = 128;
  std::vector<Policy::Rule> rules;
  rules.reserve(kRoom);
  while (rows.Next()) {
    Policy::Rule& rule = rules.emplace_back();
    rule.kind = Policy::RuleKind::kFilePath;
    rule.words[0] = rows.Text(0);
    rule.verdict = Policy::Permissions(static_cast<unsigned int>(rows.Integer(1)));
    rule.line = static_cast<unsigned int>(rows.Integer(2));
  }
  return rules;
}

}  // namespace LinuxHost
