#pragma once

#include <string>

namespace LinuxHost {

// What a database is that is copied.
enum class CopyOf {
  kState,        // may be in use
  kPublicState,  // the same; who uses the copy copies it again first
  kSettings,     // may be in use
  kSavedState,   // never changes once it has its name
  kOwnCopy       // known to nobody else
};

// Copies the database at `from`, which is only read, to the file `to` (mode 0600), as it was at one
// moment: waits for writers as other writers do. Throws HostError, and leaves no file, when
// anybody else may write `from` or it is no regular file, and when it is damaged; of a public state
// whether its indexes fit is left to who copies the copy. The copy survives no power loss. Of a
// saved state it is verified as a whole.
void CopyDatabase(const std::string& from, CopyOf what, const std::string& to);

}  // namespace LinuxHost
