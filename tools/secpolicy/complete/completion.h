#pragma once

#include <string>
#include <vector>

#include "command_line.h"

namespace SecPolicyCli {

// The first word of a command line by which a shell asks what can stand where the last word stands.
inline constexpr char kAskForWords[] = "__complete";

// Answers on standard output: in the first line "words", or which of the shell's own "files",
// "directories" or "programs" can stand there, too; then a word a line, perhaps with a tab and what
// it means. Below a root the files there are words; one that ends in a slash can go on. Who is
// typing must not be disturbed, so a failure is no answer.
ExitCode Complete(CommandLine& line, std::vector<std::string> words);

}  // namespace SecPolicyCli
