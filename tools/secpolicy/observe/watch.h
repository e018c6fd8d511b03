#pragma once

#include <string>
#include <vector>

#include "host/enforce/supervise/supervisor.h"
#include "verb.h"

namespace SecPolicyCli {

// Opens /proc, by which processes are watched; a root that is entered later may have none.
void OpenProc();

// The number of that descriptor; -1 where there is no /proc.
int ProcDirectory();

struct WatchedEnd {
  bool isStarted = false;  // the program; why it was not has been told
  ExitCode exitCode =
      kWell;  // of the program; 127 where there is none, 126 where it was not started
};

// Runs `command` for the verb `verb` as `supervision` says. The descriptor of /proc is put in.
// Throws Braxo::Lib::BraxoException when it cannot be watched.
WatchedEnd RunWatched(const std::string& verb, const std::vector<std::string>& command,
                      Enforce::Supervision supervision);

}  // namespace SecPolicyCli
