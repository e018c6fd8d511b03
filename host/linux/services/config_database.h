#pragma once

#include <memory>
#include <optional>
#include <string>
#include <variant>

#include "host/linux/state/store.h"
#include "orinconfigstore/config_store.h"

namespace LinuxHost {

// An advanced option is an integer or a text.
using OptionValue = std::variant<long, std::string>;

// The database of wanted settings. Failures are HostErrors.
class ConfigDatabase {
 public:
  // The calling thread's connection; the database is created if it is not there. The reference
  // holds until the next call of Current() or Find().
  static ConfigDatabase& Current();

  // The same, but null when there is no database.
  static ConfigDatabase* Find();

  explicit ConfigDatabase(const std::string& path);

  std::optional<OptionValue> FindOption(const std::string& path);
  void StoreOption(const std::string& path, const OptionValue& value);

  // True when any key of the object is stored.
  bool HasObject(const OrinConfigStore::ConfigStoreObjectId& id);
  std::optional<std::string> FindValue(const OrinConfigStore::ConfigStoreObjectId& id,
                                       const std::string& key);
  void StoreValue(const OrinConfigStore::ConfigStoreObjectId& id, const std::string& key,
                  const std::string& value);

  // Whether the object was applied in this boot.
  bool BootStatus(const OrinConfigStore::ConfigStoreObjectId& id);
  void SetBootStatus(const OrinConfigStore::ConfigStoreObjectId& id, bool applied);
  void ClearBootStatus();

 private:
  Store store;
};

}  // namespace LinuxHost
