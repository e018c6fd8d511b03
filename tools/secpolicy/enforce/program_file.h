#pragma once

#include <optional>
#include <string>

#include "braxo/lib/exception.h"
#include "host/linux/common/descriptor.h"

namespace SecPolicyCli {

// There is nothing where a program is said to be.
class NoSuchProgram : public Braxo::Lib::BraxoException {
 public:
  using BraxoException::BraxoException;
};

// A program that was opened once, so that what is asked about is what is started.
struct ProgramFile {
  LinuxHost::Descriptor file;  // for reading, closed on execution
  std::string path;            // that it was opened by: from the root on, without a link
};

// True where the path leads to a file that this user may execute.
bool IsProgram(const std::string& path);

// The path of the program, as a shell finds it; nothing where PATH has no such name. A path is
// returned as it is.
std::optional<std::string> FindProgram(const std::string& program);

// Opens the program that `path` leads to. Throws NoSuchProgram when there is nothing, and
// Braxo::Lib::BraxoException when that is no program, or this user may not read it: then nobody
// knows its label.
ProgramFile OpenProgram(const std::string& path);

// The program that somebody else has opened, as this process sees it. Throws
// Braxo::Lib::BraxoException where it sees no such program.
ProgramFile SeeProgram(int received);

}  // namespace SecPolicyCli
