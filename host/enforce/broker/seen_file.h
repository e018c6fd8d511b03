#pragma once

#include <string>

#include "host/enforce/supervise/file_descriptor.h"

namespace Enforce {

struct SeenFile {
  FileDescriptor file;
  std::string path;  // no part of which is a link
};

// The file that `received` stands for as this process sees it itself, opened with `flags` of
// open(2), closed on execution. Not open where this process sees no such file, or may not open it.
// `procDirectory` is of the /proc of this process's own PID namespace.
SeenFile SeeAgain(int received, int procDirectory, int flags);

}  // namespace Enforce
