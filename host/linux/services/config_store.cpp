#include "orinconfigstore/config_store.h"

#include "host/linux/state/config_database.h"

namespace OrinConfigStore {
namespace {

class StoredObject : public StoreObject {
 public:
  explicit StoredObject(const ConfigStoreObjectId& object) : id(object) {}

  bool GetValue(const char* key, std::string* value) const override {
    LinuxHost::ConfigDatabase* database = LinuxHost::ConfigDatabase::Find();
    if (database == nullptr) return false;
    std::optional<std::string> stored = database->FindValue(id, key);
    if (!stored) return false;
    *value = std::move(*stored);
    return true;
  }

 private:
  ConfigStoreObjectId id;
};

}  // namespace

// This host knows one way of fetching, so the flag has nothing to choose.
std::shared_ptr<StoreObject> GetDesiredUserConfig(const ConfigStoreObjectId& id, FLAG) {
  LinuxHost::ConfigDatabase* database = LinuxHost::ConfigDatabase::Find();
  if (database == nullptr || !database->HasObject(id)) return nullptr;
  return std::make_shared<StoredObject>(id);
}

void SetBootStatus(const ConfigStoreObjectId& id, bool applied) {
  LinuxHost::ConfigDatabase::Current().SetBootStatus(id, applied);
}

}  // namespace OrinConfigStore
