#include "host/linux/state/config_database.h"

#include <sys/stat.h>

#include <cerrno>
#include <filesystem>
#include <set>
#include <system_error>

#include "host/linux/common/used_paths.h"

namespace LinuxHost {
namespace {

using OrinConfigStore::ConfigStoreObjectId;

constexpr StoreLayout kLayout{
    .purpose = "configuration",
    .remedy = "Move the file away and store the wanted settings again",
    .applicationId = 0x5a4f4346,
    .version = 2,
    .schema = R"(
        CREATE TABLE advanced_option(
          path TEXT PRIMARY KEY,
          value ANY NOT NULL  -- INTEGER or TEXT
        ) STRICT, WITHOUT ROWID;
        CREATE TABLE object_value(
          first TEXT, second TEXT, third TEXT, fourth TEXT,
          key TEXT,
          value TEXT NOT NULL,
          PRIMARY KEY(first, second, third, fourth, key)
        ) STRICT, WITHOUT ROWID;
        CREATE TABLE boot_status(
          first TEXT, second TEXT, third TEXT, fourth TEXT,
          applied INTEGER NOT NULL,
          PRIMARY KEY(first, second, third, fourth)
        ) STRICT, WITHOUT ROWID;
      )",
    // Names stay when their labels are removed: files elsewhere may carry the number.
    .addition = R"(
        CREATE TABLE label_number(
          id INTEGER PRIMARY KEY AUTOINCREMENT CHECK (id BETWEEN 2 AND 4294967295),
          name TEXT NOT NULL UNIQUE
        ) STRICT;
        INSERT INTO label_number VALUES (2, 'unlabeled'), (3, 'tardiskDefault');
      )",
    .survivesPowerLoss = true,
};

// Anything but a missing file is for the store to judge.
bool IsMissing(const std::string& path) {
  struct stat status;
  return lstat(path.c_str(), &status) != 0 && (errno == ENOENT || errno == ENOTDIR);
}

}  // namespace

ConfigDatabase& ConfigDatabase::Current() {
  static thread_local std::unique_ptr<ConfigDatabase> current;
  const std::string& path = SettingsPath();
  if (!current || current->store.Path() != path || !current->store.IsCurrent()) {
    current.reset();
    // A root that has never run lacks even /var; what cannot be made, the store reports.
    std::error_code ignored;
    std::filesystem::create_directories(std::filesystem::path(path).parent_path().parent_path(),
                                        ignored);
    current = std::make_unique<ConfigDatabase>(path);
  }
  return *current;
}

ConfigDatabase* ConfigDatabase::Find() { return IsMissing(SettingsPath()) ? nullptr : &Current(); }

ConfigDatabase::ConfigDatabase(const std::string& path) : store(path, kLayout) {}

std::optional<OptionValue> ConfigDatabase::FindOption(const std::string& path) {
  Rows rows = store.Select(
      "SELECT typeof(value) = 'integer', value FROM advanced_option WHERE path = ?1", path);
  if (!rows.Next()) return std::nullopt;
  if (rows.Integer(0) != 0) return static_cast<long>(rows.Integer(1));
  return rows.Text(1);
}

void ConfigDatabase::StoreOption(const std::string& path, const OptionValue& value) {
  const auto replace = [&](const auto& stored) {
    store.Run("INSERT OR REPLACE INTO advanced_option VALUES(?1, ?2)", path, stored);
  };
  std::visit(replace, value);
}

std::map<std::string, OptionValue> ConfigDatabase::ListOptions() {
  std::map<std::string, OptionValue> options;
  Rows rows = store.Select("SELECT path, typeof(value) = 'integer', value FROM advanced_option");
  while (rows.Next()) {
    OptionValue& value = options[rows.Text(0)];
    if (rows.Integer(1) != 0) {
      value = static_cast<long>(rows.Integer(2));
    } else {
      value = rows.Text(2);
    }
  }
  return options;
}

bool ConfigDatabase::RemoveOption(const std::string& path) {
  return store.Run("DELETE FROM advanced_option WHERE path = ?1", path) > 0;
}

bool ConfigDatabase::HasObject(const ConfigStoreObjectId& id) {
  Rows rows = store.Select(
      "SELECT 1 FROM object_value"
      " WHERE first = ?1 AND second = ?2 AND third = ?3 AND fourth = ?4 LIMIT 1",
      id.Component(0), id.Component(1), id.Component(2), id.Component(3));
  return rows.Next();
}

std::optional<std::string> ConfigDatabase::FindValue(const ConfigStoreObjectId& id,
                                                     const std::string& key) {
  Rows rows = store.Select(
      "SELECT value FROM object_value"
      " WHERE first = ?1 AND second = ?2 AND third = ?3 AND fourth = ?4 AND key = ?5",
      id.Component(0), id.Component(1), id.Component(2), id.Component(3), key);
  if (!rows.Next()) return std::nullopt;
  return rows.Text(0);
}

void ConfigDatabase::StoreValue(const ConfigStoreObjectId& id, const std::string& key,
                                const std::string& value) {
  store.Run("INSERT OR REPLACE INTO object_value VALUES(?1, ?2, ?3, ?4, ?5, ?6)", id.Component(0),
            id.Component(1), id.Component(2), id.Component(3), key, value);
}

std::map<std::string, std::string> ConfigDatabase::ListValues(const ConfigStoreObjectId& id,
                                                              const std::string& key) {
  std::map<std::string, std::string> values;
  Rows rows = store.Select(
      "SELECT fourth, value FROM object_value"
      " WHERE first = ?1 AND second = ?2 AND third = ?3 AND key = ?4",
      id.Component(0), id.Component(1), id.Component(2), key);
  while (rows.Next()) values.emplace(rows.Text(0), rows.Text(1));
  return values;
}

bool ConfigDatabase::RemoveValue(const ConfigStoreObjectId& id, const std::string& key) {
  return store.Run(
             "DELETE FROM object_value"
             " WHERE first = ?1 AND second = ?2 AND third = ?3 AND fourth = ?4 AND key = ?5",
             id.Component(0), id.Component(1), id.Component(2), id.Component(3), key) > 0;
}

bool ConfigDatabase::BootStatus(const ConfigStoreObjectId& id) {
  Rows rows = store.Select(
      "SELECT applied FROM boot_status"
      " WHERE first = ?1 AND second = ?2 AND third = ?3 AND fourth = ?4",
      id.Component(0), id.Component(1), id.Component(2), id.Component(3));
  return rows.Next() && rows.Integer(0) != 0;
}

void ConfigDatabase::SetBootStatus(const ConfigStoreObjectId& id, bool applied) {
  store.Run("INSERT OR REPLACE INTO boot_status VALUES(?1, ?2, ?3, ?4, ?5)", id.Component(0),
            id.Component(1), id.Component(2), id.Component(3), applied);
}

void ConfigDatabase::ClearBootStatus() { store.Run("DELETE FROM boot_status"); }

std::int64_t ConfigDatabase::HighestLabelNumber() {
  Rows rows = store.Select("SELECT seq FROM sqlite_sequence WHERE name = 'label_number'");
  return rows.Next() ? rows.Integer(0) : 0;
}

void ConfigDatabase::TakeOverLabelNumbers(const LabelNumbers& used, std::int64_t highest) {
  Transaction transaction(store);
  for (const auto& [name, number] : used) {
    store.Run("INSERT OR IGNORE INTO label_number VALUES (?1, ?2)", number, name);
  }
  store.Run("UPDATE sqlite_sequence SET seq = max(seq, ?1) WHERE name = 'label_number'", highest);
  transaction.Commit();
}

std::vector<std::uint32_t> ConfigDatabase::NumberLabels(const std::vector<std::string>& names,
                                                        const LabelNumbers& used,
                                                        std::int64_t highest) {
  std::set<std::int64_t> taken;
  for (const auto& [name, number] : used) taken.insert(number);
  Transaction transaction(store);
  if (HighestLabelNumber() < highest) TakeOverLabelNumbers(used, highest);
  std::vector<std::uint32_t> numbers;
  numbers.reserve(names.size());
  for (const std::string& name : names) {
    std::optional<std::int64_t> number = FindNumber(name);
    if (number && taken.contains(*number)) {
      // These settings come from another host, or from earlier times.
      store.Run("DELETE FROM label_number WHERE name = ?1", name);
      number.reset();
    }
    numbers.push_back(static_cast<std::uint32_t>(number ? *number : GiveNumber(name)));
  }
  transaction.Commit();
  return numbers;
}

std::optional<std::int64_t> ConfigDatabase::FindNumber(const std::string& name) {
  Rows rows = store.Select("SELECT id FROM label_number WHERE name = ?1", name);
  if (!rows.Next()) return std::nullopt;
  return rows.Integer(0);
}

std::int64_t ConfigDatabase::GiveNumber(const std::string& name) {
  store.Run("INSERT INTO label_number (name) VALUES (?1)", name);
  return HighestLabelNumber();
}

}  // namespace LinuxHost
