#pragma once

#include <cstddef>
#include <string>

#include "host/linux/operation/journal.h"
#include "load/load_watcher.h"

// What the journal of systemd is told beside the log when this command runs as a unit.
namespace SecPolicyCli {

// The kinds of entries; packaging/systemd/secpolicy.catalog explains each.
enum class Event {
  kLoaded,
  kLoadFailed,
  kLoadStopped,
  kProblem,
  kLevelChanged,
  kRolledBack,
  kDrifted,
  kWouldBeRefused,
  kRefused,
  kUntold
};

// Tells it of an event; nothing where this command is not under a journal. `fields` are those that
// the kind has beside the message.
void TellJournal(Event event, const std::string& message, const LinuxHost::JournalFields& fields);

// Tells it of each problem of a load, and how that ended.
class JournalledLoad : public LoadWatcher {
 public:
  // `verb` loads the policy directory `policyDir`.
  JournalledLoad(const std::string& loadVerb, const std::string& loadDir)
      : verb(loadVerb), policyDir(loadDir) {}

  void OnProblem(const SecPolicy::Problem& problem) override;
  void OnOutcome(const LoadOutcome& outcome) override;

 private:
  const std::string verb;
  const std::string policyDir;
  std::size_t problems = 0;
};

}  // namespace SecPolicyCli
