#pragma once

#include <string>
#include <utility>
#include <vector>

// The journal of systemd, which keeps fields beside a message.
namespace LinuxHost {

// A name, of A-Z, 0-9 and _, and a value, which may hold any byte.
using JournalFields = std::vector<std::pair<std::string, std::string>>;

// True when standard error of this process leads into the journal, as that of a unit does.
bool IsUnderJournal();

// Hands one entry to the journal. It is lost, and nobody is told, where none listens or it does not
// take more at once.
void SendToJournal(const JournalFields& fields);

}  // namespace LinuxHost
