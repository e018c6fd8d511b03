#include "saved_name.h"

#include <CLI/App.hpp>
#include <exception>

#include "library_call.h"
#include "saved_state.h"

namespace SecPolicyCli {

std::shared_ptr<const std::string> AddSavedName(CLI::App& app, const std::string& meaning) {
  const auto name = std::make_shared<std::string>();
  app.add_option("NAME", *name, meaning)->required()->check(CLI::Validator(WhyNoSavedName, ""));
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
