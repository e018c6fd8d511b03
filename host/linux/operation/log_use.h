#pragma once

#include <string>

// What the command asks of the host's log. Each lasts as long as its object, and what was before
// comes back.
namespace LinuxHost {

// Logs one information line, where those of the library go.
void LogLine(const std::string& line);

// Information lines are shown on standard error too, one a line, as they are logged.
class ShownLog {
 public:
  ShownLog();
  ShownLog(const ShownLog&) = delete;
  ShownLog& operator=(const ShownLog&) = delete;
  ~ShownLog();

 private:
  const bool before;
};

// Every line is dropped, those that are shown included: what is only tried has not happened.
class DroppedLog {
 public:
  DroppedLog();
  DroppedLog(const DroppedLog&) = delete;
  DroppedLog& operator=(const DroppedLog&) = delete;
  ~DroppedLog();

 private:
  const bool before;
};

}  // namespace LinuxHost
