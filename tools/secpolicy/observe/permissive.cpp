#include "permissive.h"

#include <iostream>
#include <vector>

#include "asked_rules.h"
#include "environment.h"
#include "host/enforce/supervise/asked.h"
#include "host/linux/operation/log_use.h"
#include "monitor/journal.h"
#include "proposal.h"
#include "text/visible.h"
#include "watch.h"

namespace SecPolicyCli {
namespace {

using Policy::RuleKind;
using Policy::WordsQuestion;

Policy::Question AskCall(std::string_view call) {
  return WordsQuestion{.kind = RuleKind::kSyscall, .words = {std::string(call)}};
}

// In one write, for the program may be writing lines, too.
void TellRefused(const std::string& verb, const std::string& domain,
                 const Policy::Question& question) {
  const std::string line = domain + " would be refused: " + Visible(TextOf(question));
  std::cerr << "secpolicy: " + verb + ": " + line + "\n" << std::flush;
  LinuxHost::LogLine(line);
  TellJournal(Event::kWouldBeRefused, line,
              {{"SECPOLICY_DOMAIN", domain}, {"SECPOLICY_QUESTION", TextOf(question)}});
}

}  // namespace

ExitCode RunPermissive(const std::string& verb, const Entry& entry,
                       const Policy::InstalledDomain& domain,
                       SecPolicy::TeskAccessInterfaceImpl& access) {
  Observations seen;
  const auto judge = [&](const Policy::Question& question, const std::string& program) {
    if (!seen.Note(question, program) || IsGranted(question, domain)) return;
    TellRefused(verb, domain.name, question);
  };
  const auto isNoticed = [&](std::string_view call) {
    return Enforce::AsksMore(call) || !Decide(AskCall(call), domain).granted;
  };
  const auto notice = [&](const Enforce::Attempt& attempt) {
    if (!attempt.isStart) judge(AskCall(attempt.call), attempt.program);
    for (const Policy::Question& asked : attempt.asked) {
      judge(WithLabel(asked, access), attempt.program);
    }
  };
  std::vector<std::string> variables = EnvironmentOf(entry);
  const std::vector<char*> environment = PointersTo(variables);
  const WatchedEnd end = RunWatched(verb, entry.command,
                                    {.program = entry.program.Number(),
                                     .environment = environment.data(),
                                     .isKilledAlong = entry.isForAnother,
                                     .isNoticed = isNoticed,
                                     .notice = notice});
  return end.exitCode;
}

}  // namespace SecPolicyCli
