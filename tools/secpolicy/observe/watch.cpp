#include "watch.h"

#include <fcntl.h>

#include <cerrno>
#include <cstring>
#include <iostream>

#include "braxo/lib/exception.h"
#include "host/enforce/features.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

int proc = -1;

}  // namespace

void OpenProc() { proc = open("/proc", O_PATH | O_DIRECTORY | O_CLOEXEC); }

int ProcDirectory() { return proc; }

WatchedEnd RunWatched(const std::string& verb, const std::vector<std::string>& command,
                      Enforce::Supervision supervision) {
  if (proc < 0) throw Braxo::Lib::BraxoException("programs cannot be watched without /proc");
  if (!Enforce::ProbeFeatures().notifies) {
    throw Braxo::Lib::BraxoException("this kernel has no filters that ask a supervisor");
  }
  supervision.procDirectory = proc;
  const Enforce::SupervisedEnd end = Enforce::Supervise(command, supervision);
  if (end.startError == 0) return {true, static_cast<ExitCode>(end.exitStatus)};
  std::cerr << "secpolicy: " << verb << ": cannot start " << Visible(command.front()) << ": "
            << std::strerror(end.startError) << std::endl;
  return {false, end.startError == ENOENT ? kNoProgram : kNotConfined};
}

}  // namespace SecPolicyCli
