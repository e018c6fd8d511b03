#pragma once

#include <string>

#include "braxo/adv/advanced_option.h"

/// The way to the host's advanced options.
namespace TeskCtl::Adv {

/// Access to the host's advanced options.
class __attribute__((visibility("default"))) AdvancedOptionImpl {
 public:
  /// Returns the option at `path` (such as "/UserVars/Name"), or null when there is no such option.
  /// The caller deletes the result. May throw Braxo::Lib::BraxoException.
  static Braxo::Adv::AdvancedOption* FindOption(const std::string& path);
};

}  // namespace TeskCtl::Adv
