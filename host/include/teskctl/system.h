#pragma once

#include <string>

/// The logs.
namespace TeskCtl::System {

/// True while the system log daemon takes messages. Never throws.
__attribute__((visibility("default"))) bool SyslogIsRunning();

/// Writes one line to the kernel log: `message` marked with `tag` (such as "[INFO]").
/// May throw Braxo::Lib::BraxoException.
__attribute__((visibility("default"))) void WriteToKlog(const std::string& message,
                                                        const std::string& tag);

}  // namespace TeskCtl::System
