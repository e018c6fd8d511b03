#include <iostream>
#include <memory>
#include <string>
#include <vector>

#include "command_line.h"
#include "ending.h"
#include "installed/installed_json.h"
#include "installed/installed_policy.h"
#include "query/answer.h"
#include "query/ask.h"
#include "query/question.h"
#include "query/search.h"
#include "text/format.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

void WriteText(const std::vector<Found>& found) {
  for (const auto& [domain, decision] : found) WriteAnswerLine(domain, decision, std::cout);
}

ExitCode Answer(const std::vector<std::string>& words, const std::string& format) {
  SecPolicy::TeskAccessInterfaceImpl access;
  const Policy::InstalledPolicy policy = ReadInstalledPolicy(access);
  const Question question = ReadQuestion(words, access);
  const std::vector<Found> found = FindDomains(question, policy);
  if (format == "json") {
    std::cout << WhoCanToJson(question, found).Text();
  } else {
    WriteText(found);
  }
  Summarize("who-can", CountOf(found.size(), "domain") + " may " + question.Text());
  return found.empty() ? kFailed : kWell;
}

Action Define(Syntax& syntax) {
  const auto words = std::make_shared<std::vector<std::string>>();
  syntax.AddList("WHAT", *words, "What is done, as for 'secpolicy why'").Require();
  const auto format = AddAnswerFormat(syntax);
  return [=] { return Ask("who-can", [=] { return Answer(*words, *format); }); };
}

}  // namespace

const Verb kWhoCan = {
    "who-can", "List the domains that may do something, each with the rule that says so",
    "Asks every installed domain what 'secpolicy why' asks one, and prints those that may, with\n"
    "policy file, line and rule. WHAT is written as for 'why'. Exit status: 0 some domain may,\n"
    "1 none may, 2 a word is not known.\n"
    "\n"
    "Examples:\n"
    "  secpolicy who-can write /etc/ssh/host_key\n"
    "  secpolicy who-can use cap_sys_module\n"
    "  secpolicy who-can enter sshDom",
    Define};

}  // namespace SecPolicyCli
