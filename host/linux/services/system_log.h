#pragma once

#include <string>
#include <vector>

// Where this host's log lines go.
namespace LinuxHost {

// What becomes of lines beside, or in place of, going to their log. While they are shown the
// host takes every line itself: SyslogIsRunning() answers false, and WriteToKlog() hands the
// line on to a running system log daemon in the form that the library would have given it, else to
// the kernel log. So each line still reaches the log it belongs to.
struct LogUse {
  bool showsInformation = false;  // on standard error too, one a line
  bool dropsLines = false;        // those that are shown included
};

// That of this process: the functions of the contract take no parameter for it. Only
// operation/log_use changes it.
LogUse& CurrentLogUse();

// What the kernel's device gets for a line: a text that is too long for one record goes into
// several, each with its priority and the tag.
std::vector<std::string> KernelLogRecords(const std::string& message, const std::string& tag);

// Logs one information line of the host's own, by the same road as those of the library.
void LogInformation(const std::string& message);

}  // namespace LinuxHost
