#include "saved_name.h"

#include <exception>

#include "command_line.h"
#include "library_call.h"
#include "saved_state.h"

namespace SecPolicyCli {

std::shared_ptr<const std::string> AddSavedName(Syntax& syntax, const std::string& meaning) {
  const auto name = std::make_shared<std::string>();
  syntax.AddOption("NAME", *name, meaning).Require().Check(WhyNoSavedName);
  return name;
}

ExitCode RunOrRefuse(const std::string& verb, const Action& action) {
  try {
    return action();
  } catch (const std::exception& failure) {
    return Refuse(verb, failure.what());
  }
}

}  // namespace SecPolicyCli
