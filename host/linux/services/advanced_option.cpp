#include "braxo/adv/advanced_option.h"

#include <optional>

#include "host/linux/state/config_database.h"
#include "teskctl/adv.h"

namespace TeskCtl::Adv {
namespace {

class IntegerOption : public Braxo::Adv::AdvancedIntegerOption {
 public:
  explicit IntegerOption(long stored) : value(stored) {}

  long GetValue() const override { return value; }

 private:
  long value;
};

// Nobody reads the text through the contract: that the option is no integer is all it tells.
class TextOption : public Braxo::Adv::AdvancedOption {};

}  // namespace

Braxo::Adv::AdvancedOption* AdvancedOptionImpl::FindOption(const std::string& path) {
  LinuxHost::ConfigDatabase* const database = LinuxHost::ConfigDatabase::Find();
  if (database == nullptr) return nullptr;
  const std::optional<LinuxHost::OptionValue> value = database->FindOption(path);
  if (!value) return nullptr;
  if (const long* number = std::get_if<long>(&*value)) return new IntegerOption(*number);
  return new TextOption;
}

}  // namespace TeskCtl::Adv
