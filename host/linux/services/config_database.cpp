#include "host/linux/services/config_database.h"

#include <sys/stat.h>

#include <cerrno>
#include <filesystem>
#include <system_error>

#include "host/linux/common/used_paths.h"

namespace LinuxHost {
namespace {

using OrinConfigStore::ConfigStoreObjectId;

constexpr StoreLayout kLayout{
    .purpose = "configuration",
    .remedy = "Move the file away and store the wanted settings again",
    .applicationId = 0x5a4f4346,
    .version = 1,
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

}  // namespace LinuxHost
