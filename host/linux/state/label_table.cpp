#include "host/linux/state/label_table.h"

#include <cerrno>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/require_text.h"
#include "host/linux/state/removal.h"

using Braxo::Misc::StrCat;

namespace LinuxHost {
namespace {

constexpr TextLimit kName = {.noun = "label", .whenEmpty = "a label needs a name", .maxSize = 255};

}  // namespace

void LabelTable::Load() {
  if (loadedVersion == base.LabelVersion()) return;
  identifiers.clear();
  names.clear();
  Rows rows = base.Database().Select("SELECT id, name FROM label");
  while (rows.Next()) {
    const auto id = static_cast<unsigned int>(rows.Integer(0));
    identifiers.emplace(rows.Text(1), id);
    names.emplace(id, rows.Text(1));
  }
  loadedVersion = base.LabelVersion();
}

unsigned int LabelTable::Lookup(std::string_view name) {
  Load();
  const auto found = identifiers.find(name);
  return found == identifiers.end() ? kNoLabel : found->second;
}

const std::string& LabelTable::Name(unsigned int id) {
  Load();
  const auto found = names.find(id);
  if (found == names.end()) {
    throw HostError(ENOENT, StrCat("no label has the identifier ", id));
  }
  return found->second;
}

bool LabelTable::IsPredefined(std::string_view name) {
  return name == kUnlabeled || name == kDefaultTardiskLabel;
}

std::map<std::string, long> LabelTable::All() {
  Load();
  return {identifiers.begin(), identifiers.end()};
}

void LabelTable::Add(const std::vector<std::string>& added) {
  for (const auto& name : added) RequireText(name, kName);
  Transaction transaction(base.Database());
  base.Refresh();
  int changes = 0;
  for (const auto& name : added) {
    changes += base.Database().Run(
        "INSERT INTO label (name) SELECT ?1 WHERE NOT EXISTS (SELECT 1 FROM label WHERE name = ?1)",
        name);
  }
  if (changes != 0) base.CommitLabels(transaction);
}

void LabelTable::Remove(const std::vector<std::string>& removed) {
  Transaction transaction(base.Database());
  base.Refresh();
  int changes = 0;
  for (const auto& name : removed) {
    if (IsPredefined(name)) continue;
    changes += base.Database().Run("DELETE FROM label WHERE name = ?1", name);
  }
  if (changes == 0) return;
  RemoveUnnamedRules(base.Database());
  base.CommitLabels(transaction);
}

}  // namespace LinuxHost
