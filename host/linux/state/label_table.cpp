#include "host/linux/state/label_table.h"

#include <cerrno>
#include <numeric>
#include <set>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/require_text.h"
#include "host/linux/common/used_paths.h"
#include "host/linux/state/config_database.h"
#include "host/linux/state/removal.h"

using Braxo::Misc::StrCat;

namespace LinuxHost {
namespace {

constexpr TextLimit kLabelName = {
    .noun = "label", .whenEmpty = "a label needs a name", .maxSize = 255};

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
  for (const auto& name : added) RequireText(name, kLabelName);
  Transaction transaction(base.Database());
  base.Refresh();
  const std::vector<std::string> missing = Missing(added);
  if (missing.empty()) return;
  const std::vector<std::uint32_t> numbers = NumbersFor(missing);
  for (std::size_t index = 0; index < missing.size(); ++index) {
    base.Database().Run("INSERT INTO label VALUES (?1, ?2)", numbers[index], missing[index]);
  }
  base.CommitLabels(transaction);
}

// Each once, in the order of `wanted`.
std::vector<std::string> LabelTable::Missing(const std::vector<std::string>& wanted) {
  Load();
  std::vector<std::string> missing;
  std::set<std::string_view> seen;
  for (const std::string& name : wanted) {
    if (!identifiers.contains(name) && seen.insert(name).second) missing.push_back(name);
  }
  return missing;
}

std::vector<std::uint32_t> LabelTable::NumbersFor(const std::vector<std::string>& added) {
  const std::int64_t highest = HighestNumber();
  if (AreLabelNumbersKept()) return ConfigDatabase::Current().NumberLabels(added, All(), highest);
  std::vector<std::uint32_t> numbers(added.size());
  std::iota(numbers.begin(), numbers.end(), static_cast<std::uint32_t>(highest + 1));
  return numbers;
}

std::int64_t LabelTable::HighestNumber() {
  Rows rows = base.Database().Select("SELECT seq FROM sqlite_sequence WHERE name = 'label'");
  return rows.Next() ? rows.Integer(0) : kNoLabel;
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
