#pragma once

#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include "host/enforce/supervise/supervisor.h"
#include "verb.h"

namespace SecPolicyCli {

// Opens /proc, by which processes are watched; a root that is entered later may have none.
void OpenProc();

// The number of that descriptor; -1 where there is no /proc.
int ProcDirectory();

// Runs `command` for the verb `verb`, tells `notice` of the calls that `isNoticed` says yes to, and
// returns what to end with: the exit status of the program, 127 when there is none, 126 when it
// could not be started, both of which are told. Where the descriptor `program` is given, that is
// what is started, by the name that the command begins with. Throws Braxo::Lib::BraxoException when
// it cannot be watched.
ExitCode RunWatched(const std::string& verb, const std::vector<std::string>& command,
                    std::function<bool(std::string_view call)> isNoticed,
                    std::function<void(const Enforce::Attempt&)> notice, int program = -1);

}  // namespace SecPolicyCli
