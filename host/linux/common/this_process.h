#pragma once

#include <sys/types.h>

// To ask the system for the process would cost a call for each statement and each copied record.
namespace LinuxHost {

// How often this process, or the one that it is a copy of, was forked into what it is.
unsigned int ForksUntilNow();

// The number of this process, as getpid(2) tells it.
pid_t ThisProcess();

}  // namespace LinuxHost
