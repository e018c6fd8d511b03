#pragma once

#include <cstdint>
#include <string>

#include "host/linux/state/store.h"

namespace LinuxHost {

// What the state has in place of the number of a label index: no file was ever labelled, or files
// were labelled since. What is lower is an index in the making.
constexpr std::int64_t kNeverLabelled = 0;
constexpr std::int64_t kLabelsChanged = -1;

// What every table of a state stands on: the database, the versions of what is kept in memory, and
// the load that is installing its policy. Failures are HostErrors.
class StateBase {
 public:
  // Opens the state at `path`, and creates it with its first rows where there is none.
  StateBase(const std::string& path, const std::string& shownAs);
  StateBase(const StateBase&) = delete;
  StateBase& operator=(const StateBase&) = delete;

  Store& Database() { return database; }

  // True once when this thread has committed something to the state that the module keeps.
  static bool TakeCommitForModule();

  // Looks at the versions, so that what other processes have changed since is read again when it is
  // wanted. Looks at the database only when something was committed since the last call.
  void Refresh();

  // Makes all that is kept in memory old: it may have been undone.
  void Forget();

  // The versions of the domains and of the labels, as of the last look. No two states of a table
  // have the same; what was read of one version holds as long as the version does.
  std::int64_t DomainVersion() const { return domainVersion; }
  std::int64_t LabelVersion() const { return labelVersion; }

  // Ends the transaction in which a table was changed, with a new version of the table.
  void CommitDomains(Transaction& transaction);
  void CommitLabels(Transaction& transaction);

  // The real extended attribute that carries labels on this machine, empty while none is chosen.
  const std::string& LabelAttribute();

  // Chooses the attribute for the life of this state; the first choice stays. Returns the one that
  // holds.
  const std::string& ChooseLabelAttribute(const std::string& name);

  // The number of the index that has the labels as they are, as of the last look, or what stands
  // for none; and the file that it lies in.
  std::int64_t LabelIndex() const { return labelIndex; }
  std::string LabelIndexPath() const;

  // To be told before and after a file is labelled, so that no index that was made meanwhile
  // counts, nor one of a process that died in between. Looks at the database only when there is
  // something to write, or something was committed since the last look.
  void TellLabelsChange();

  // The number of the load that is installing its policy, 0 while none is.
  std::int64_t CurrentLoad() const { return currentLoad; }
  void SetCurrentLoad(std::int64_t number) { currentLoad = number; }

  // The line of the policy that is installed now, for what is installed without one; 0 for none.
  unsigned int CurrentLine() const { return currentLine; }
  void SetCurrentLine(unsigned int line) { currentLine = line; }

 private:
  Store database;
  std::int64_t domainVersion = 0;
  std::int64_t labelVersion = 0;
  std::int64_t unknownVersion = 0;  // below those of any state
  std::string labelAttribute;
  std::int64_t labelIndex = kNeverLabelled;
  bool marked = false;
  Store::CommitMark seen{};
  std::int64_t currentLoad = 0;
  unsigned int currentLine = 0;
};

}  // namespace LinuxHost
