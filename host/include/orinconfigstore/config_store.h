#pragma once

#include <array>
#include <memory>
#include <string>

/// The configuration store: what the user wants.
namespace OrinConfigStore {

/// How an object is fetched.
enum FLAG : int { FLAG_NONE = 0 };

/// Names one object of the configuration store by four components.
class __attribute__((visibility("default"))) ConfigStoreObjectId {
 public:
  /// Copies the four components, in order.
  ConfigStoreObjectId(const std::string& first, const std::string& second, const std::string& third,
                      const std::string& fourth)
      : components{first, second, third, fourth} {}

  /// The component at `index`, 0 to 3. Throws std::out_of_range for any other index.
  const std::string& Component(unsigned int index) const { return components.at(index); }

 private:
  std::array<std::string, 4> components;
};

/// One stored object.
class __attribute__((visibility("default"))) StoreObject {
 public:
  StoreObject() = default;
  StoreObject(const StoreObject&) = delete;
  StoreObject& operator=(const StoreObject&) = delete;
  virtual ~StoreObject() = default;

  /// Copies the value of `key` to `*value` and returns true; returns false and leaves `*value`
  /// untouched when the key is absent. May throw Braxo::Lib::BraxoException.
  virtual bool GetValue(const char* key, std::string* value) const = 0;
};

/// Returns the object that the user wants at `id`; empty when nothing is stored.
/// May throw Braxo::Lib::BraxoException.
__attribute__((visibility("default"))) std::shared_ptr<StoreObject> GetDesiredUserConfig(
    const ConfigStoreObjectId& id, FLAG flag);

/// Records whether the object at `id` was applied in this boot. May throw
/// Braxo::Lib::BraxoException.
__attribute__((visibility("default"))) void SetBootStatus(const ConfigStoreObjectId& id,
                                                          bool applied);

}  // namespace OrinConfigStore
