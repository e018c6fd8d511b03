#pragma once

/// Advanced options of the host.
namespace Braxo::Adv {

/// One advanced option of the host. Its kind is told by `dynamic_cast` to a derived class.
class __attribute__((visibility("default"))) AdvancedOption {
 public:
  AdvancedOption() = default;
  AdvancedOption(const AdvancedOption&) = delete;
  AdvancedOption& operator=(const AdvancedOption&) = delete;
  virtual ~AdvancedOption() = default;
};

/// An option that holds an integer.
class __attribute__((visibility("default"))) AdvancedIntegerOption : public AdvancedOption {
 public:
  /// The current value. May throw Braxo::Lib::BraxoException.
  virtual long GetValue() const = 0;
};

}  // namespace Braxo::Adv
