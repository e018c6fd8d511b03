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

// Runs `command` for the verb `verb` as `supervision` says, and returns what to end with: the exit
// status of the program, 127 when there is none, 126 when it could not be started, both of which
// are told. The descriptor of /proc is put in. Throws Braxo::Lib::BraxoException when it cannot be
// watched.
ExitCode RunWatched(const std::string& verb, const std::vector<std::string>& command,
                    Enforce::Supervision supervision);

}  // namespace SecPolicyCli
