#pragma once

#include <string>
#include <utility>
#include <vector>

#include "host/linux/operation/noted_labels.h"
#include "load/load_run.h"
#include "scratch/scratch_state.h"
#include "verb.h"

namespace SecPolicyCli {

// A whole load of a policy directory on a copy of the host's state. Neither the installed state nor
// a file is changed, and nothing is logged.
class LoadDryRun {
 public:
  // Runs the load dry. Nothing of the host may be in use in this process. Throws
  // std::runtime_error when it cannot be done.
  explicit LoadDryRun(const LoadRequest& load);

  // How the load would end.
  ExitCode Ending() const { return ending; }

  // What it would write to standard error, its summary line included.
  const std::string& Messages() const { return messages; }

  // The errors that it would report.
  const std::vector<std::string>& Errors() const { return errors; }

  // The files that it would label, by path. Not all of them would have another label in the end.
  const std::vector<LinuxHost::LabelChange>& Labels() const { return labels; }

  // The copy of the state that was installed, and the state that the load would leave. There is no
  // file for the first one where nothing is installed yet.
  std::string StateBefore() const { return scratch.File("before.db"); }
  std::string StateAfter() const { return scratch.File("after.db"); }

 private:
  ScratchDirectory scratch;
  ExitCode ending = kFailed;
  std::string messages;
  std::vector<std::string> errors;
  std::vector<LinuxHost::LabelChange> labels;
};

}  // namespace SecPolicyCli
