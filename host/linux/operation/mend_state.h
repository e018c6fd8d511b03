#pragma once

#include <string>

namespace LinuxHost {

// Makes room for a new state where the host's is damaged, of another version, or no state at all:
// that one is moved aside. Returns what to tell of it; empty when nothing was done. Throws
// Braxo::Lib::BraxoException for a state that others may write, and is no file.
std::string MendState();

}  // namespace LinuxHost
