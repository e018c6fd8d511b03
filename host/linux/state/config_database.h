#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "host/linux/state/store.h"
#include "orinconfigstore/config_store.h"

namespace LinuxHost {

// An advanced option is an integer or a text.
using OptionValue = std::variant<long, std::string>;

// Labels by name, with their numbers.
using LabelNumbers = std::map<std::string, long>;

// The database of what outlives a boot: the wanted settings, and which label has which number.
// Failures are HostErrors.
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
  std::map<std::string, OptionValue> ListOptions();

  // False when there was none.
  bool RemoveOption(const std::string& path);

  // True when any key of the object is stored.
  bool HasObject(const OrinConfigStore::ConfigStoreObjectId& id);
  std::optional<std::string> FindValue(const OrinConfigStore::ConfigStoreObjectId& id,
                                       const std::string& key);
  void StoreValue(const OrinConfigStore::ConfigStoreObjectId& id, const std::string& key,
                  const std::string& value);

  // The values of `key` of all objects whose first three components are those of `id`, by the
  // fourth.
  std::map<std::string, std::string> ListValues(const OrinConfigStore::ConfigStoreObjectId& id,
                                                const std::string& key);

  // False when there was none.
  bool RemoveValue(const OrinConfigStore::ConfigStoreObjectId& id, const std::string& key);

  // Whether the object was applied in this boot.
  bool BootStatus(const OrinConfigStore::ConfigStoreObjectId& id);
  void SetBootStatus(const OrinConfigStore::ConfigStoreObjectId& id, bool applied);
  void ClearBootStatus();

  // The number of each label of `names`: the one that it has ever had, or else a new one above all
  // that are known here and above `highest`, in the order of `names`. What is new survives the
  // power of the machine when this returns. No label gets a number that another one has in `used`.
  std::vector<std::uint32_t> NumberLabels(const std::vector<std::string>& names,
                                          const LabelNumbers& used, std::int64_t highest);

  // The highest number that was ever given here.
  std::int64_t HighestLabelNumber();

  // Takes the numbers of `used` over for the labels that have none here. New ones are above
  // `highest` from now on.
  void TakeOverLabelNumbers(const LabelNumbers& used, std::int64_t highest);

 private:
  std::optional<std::int64_t> FindNumber(const std::string& name);
  std::int64_t GiveNumber(const std::string& name);

  Store store;
};

}  // namespace LinuxHost
