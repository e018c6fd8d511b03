#include "ending.h"

#include <exception>
#include <iostream>

#include "error_list.h"
#include "refusal.h"
#include "root.h"
#include "text/format.h"
#include "text/visible.h"

namespace SecPolicyCli {

void Summarize(const std::string& verb, const std::string& text) {
  std::cout.flush();
  std::cerr << "secpolicy: " << verb << ": " << Visible(text) << std::endl;
}

ExitCode CallLibrary(const std::string& verb, const std::function<void(ErrorList& errors)>& call,
                     const std::function<std::string()>& advice,
                     const std::function<std::string()>& ending) {
  ErrorList errors;
  std::string failure;
  try {
    call(errors);
  } catch (const QuestionError&) {
    throw;
  } catch (const std::exception& raised) {
    failure = raised.what();
    if (failure.empty()) failure = "failed";
  }
  std::cout.flush();
  if (failure.empty() && errors.Count() == 0) {
    Summarize(verb, ending ? ending() : "done");
    return kWell;
  }
  std::string summary = failure.empty() ? "failed" : failure;
  if (errors.Count() > 0) summary += " (" + CountOf(errors.Count(), "error") + " above)";
  const std::string next = advice();
  Summarize(verb, next.empty() ? summary : summary + ". " + next);
  return kFailed;
}

ExitCode Refuse(const std::string& verb, const std::string& why) {
  Summarize(verb, why);
  return kFailed;
}

std::string WhyWithoutState() {
  return "nothing is installed below this root. Name the root that was booted (--root DIR), or "
         "run " +
         Call("boot") + " first.";
}

ExitCode RefuseWithoutState(const std::string& verb) { return Refuse(verb, WhyWithoutState()); }

}  // namespace SecPolicyCli
