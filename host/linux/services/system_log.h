#pragma once

#include <functional>
#include <string>
#include <vector>

// Where this host's log lines go, and what the command may ask of it.
namespace LinuxHost {

// From now on shows information lines on standard error too, one a line, as they are logged.
// While they are shown the host takes every line itself: SyslogIsRunning() answers false, and
// WriteToKlog() hands the line on to a running system log daemon in the form that the library
// would have given it, else to the kernel log. So each line still reaches the log it belongs to.
void ShowInformation();

// From now on hands every line, errors included, to `watcher` before it goes to its log; an empty
// function ends that. The host takes every line itself meanwhile, as while information is shown.
void WatchLog(const std::function<void(const std::string& message)>& watcher);

// From now on drops every line, those that are shown included: what a process only rehearses has
// not happened.
void DropLog();

// What the kernel's device gets for a line: a text that is too long for one record goes into
// several, each with its priority and the tag.
std::vector<std::string> KernelLogRecords(const std::string& message, const std::string& tag);

// Logs one information line of the host's own, by the same road as those of the library.
void LogInformation(const std::string& message);

}  // namespace LinuxHost
