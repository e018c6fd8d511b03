#include "journal.h"

#include <syslog.h>

#include <array>

#include "policy_dir.h"

namespace SecPolicyCli {
namespace {

struct EventForm {
  const char* id;
  int priority;
};

// In the order of Event.
constexpr std::array<EventForm, 10> kForms = {{
    {"840401faa7694a3f99c654ce45357c01", LOG_INFO},
    {"1df6f2e4bf3049699bc7ebf5cb11431f", LOG_ERR},
    {"50acbe999869435dab522730651b031b", LOG_CRIT},
    {"efc4f46bcf414f678c852d327254f8b3", LOG_ERR},
    {"5ca76aaf785146b8b0d9ad82ab381262", LOG_NOTICE},
    {"eb912851ab2e404d931614e7abde76bd", LOG_NOTICE},
    {"9d8b91af9e9a4f0ab4348815cfd06536", LOG_WARNING},
    {"f88412bf019d41e1b51e7b85a86c3e79", LOG_WARNING},
    {"3abfec11643a484cb873e0dda124b9b4", LOG_WARNING},
    {"8be76e4adb1b4b4d83acbd7e60a4b2b1", LOG_WARNING},
}};

Event EventOf(ExitCode code) {
  if (code == kWell) return Event::kLoaded;
  return code == kStopped ? Event::kLoadStopped : Event::kLoadFailed;
}

}  // namespace

void TellJournal(Event event, const std::string& message, const LinuxHost::JournalFields& fields) {
  if (!LinuxHost::IsUnderJournal()) return;
  const EventForm& form = kForms.at(static_cast<std::size_t>(event));
  LinuxHost::JournalFields entry = {{"MESSAGE", message},
                                    {"MESSAGE_ID", form.id},
                                    {"PRIORITY", std::to_string(form.priority)},
                                    {"SYSLOG_IDENTIFIER", "secpolicy"}};
  entry.insert(entry.end(), fields.begin(), fields.end());
  LinuxHost::SendToJournal(entry);
}

void JournalledLoad::OnProblem(const SecPolicy::Problem& problem) {
  ++problems;
  LinuxHost::JournalFields fields = {{"SECPOLICY_VERB", verb}, {"SECPOLICY_FILE", problem.file}};
  std::string place = problem.file;
  if (problem.line > 0) {
    fields.emplace_back("SECPOLICY_LINE", std::to_string(problem.line));
    place += ":" + std::to_string(problem.line);
  }
  const std::string domain = DomainOfFile(problem.file);
  if (!domain.empty()) fields.emplace_back("SECPOLICY_DOMAIN", domain);
  TellJournal(Event::kProblem, place + ": " + problem.reason, fields);
}

void JournalledLoad::OnOutcome(const LoadOutcome& outcome) {
  const std::string ending = outcome.code == kWell ? "done" : outcome.reason;
  TellJournal(EventOf(outcome.code), verb + " from " + policyDir + ": " + ending,
              {{"SECPOLICY_VERB", verb},
               {"SECPOLICY_DIRECTORY", policyDir},
               {"SECPOLICY_PROBLEMS", std::to_string(problems)}});
}

}  // namespace SecPolicyCli
