#include "host/linux/operation/log_use.h"

#include <utility>

#include "host/linux/services/system_log.h"

namespace LinuxHost {

void LogLine(const std::string& line) { LogInformation(line); }

ShownLog::ShownLog() : before(std::exchange(CurrentLogUse().showsInformation, true)) {}

ShownLog::~ShownLog() { CurrentLogUse().showsInformation = before; }

DroppedLog::DroppedLog() : before(std::exchange(CurrentLogUse().dropsLines, true)) {}

DroppedLog::~DroppedLog() { CurrentLogUse().dropsLines = before; }

}  // namespace LinuxHost
