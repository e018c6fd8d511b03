#include "ask.h"

#include "command_line.h"
#include "ending.h"
#include "host/linux/operation/state_use.h"

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
  return answer();
}

}  // namespace SecPolicyCli
