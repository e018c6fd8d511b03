#pragma once

namespace LinuxHost {

// Loads libsecpolicyhost-archive.so, which unpacks tardisks, unless it is there already. It and
// what it brings along would make up most of the start of programs that do not boot. A boot loads
// it by itself; who changes the root directory calls this before, while the library is still in
// sight. Throws Braxo::Lib::BraxoException when it is missing.
void LoadArchiveLibrary();

}  // namespace LinuxHost
