#include "ask.h"

#include <iostream>

#include "command_line.h"
#include "ending.h"
#include "host/linux/operation/state_use.h"
#include "question.h"
#include "text/visible.h"

namespace SecPolicyCli {

std::shared_ptr<const std::string> AddAnswerFormat(Syntax& syntax) {
  const auto format = std::make_shared<std::string>();
  syntax.AddFormat(*format, "the answer", {"text", "json"});
  return format;
}

ExitCode Ask(const std::string& verb, const std::function<ExitCode()>& answer,
             ExitCode withoutState) {
  // The host would make a state of its own.
  if (LinuxHost::IsStateMissing()) {
    RefuseWithoutState(verb);
    return withoutState;
  }
  try {
    return answer();
  } catch (const QuestionError& error) {
    std::cerr << "secpolicy: " << verb << ": " << Visible(error.what()) << "\n'secpolicy " << verb
              << " --help' explains the usage." << std::endl;
    return kUsage;
  }
}

}  // namespace SecPolicyCli
