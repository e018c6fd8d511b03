#include "ask.h"

#include <CLI/App.hpp>
#include <iostream>

#include "library_call.h"
#include "question.h"
#include "scratch/used_state.h"

namespace SecPolicyCli {

std::shared_ptr<const std::string> AddAnswerFormat(CLI::App& app) {
  const auto format = std::make_shared<std::string>("text");
  app.add_option("--format", *format, "How to write the answer: text or json")
      ->check(CLI::IsMember({"text", "json"}))
      ->type_name("FORMAT")
      ->capture_default_str();
  return format;
}

ExitCode Ask(const std::string& verb, const std::function<ExitCode()>& answer) {
  // The host would make a state of its own.
  if (IsStateMissing()) return RefuseWithoutState(verb);
  try {
    return answer();
  } catch (const QuestionError& error) {
    std::cerr << "secpolicy: " << verb << ": " << error.what() << "\n'secpolicy " << verb
              << " --help' explains the usage." << std::endl;
    return kUsage;
  }
}

}  // namespace SecPolicyCli
