#pragma once

#include <functional>
#include <string>

#include "host/enforce/broker/message.h"
#include "host/enforce/supervise/file_descriptor.h"

// Starts programs for those who are confined and may not start them themselves.
namespace Enforce {

// What was asked for, by somebody of the same user and group.
struct AskedEntry {
  EntryRequest request;
  FileDescriptor program;    // of a regular file
  FileDescriptor directory;  // of a directory
};

struct Brokerage {
  int procDirectory = -1;  // of the /proc of this process's own PID namespace

  // Judges and becomes what was asked for, or returns what to end with. Called in a process of its
  // own that has the standard descriptors, the process group and the end of who asked.
  std::function<int(AskedEntry)> enter;
};

// Forks a process that is nobody's child, has none of the descriptors that are open over execution,
// and answers until all have closed the descriptor that is returned, which is of a socket and
// closed on execution. When who asked ends, so does the program that was started; signals are
// handed on to it. Throws Braxo::Lib::BraxoException when there can be no such process.
FileDescriptor StartBroker(const Brokerage& brokerage);

}  // namespace Enforce
