#include "host/linux/operation/journal.h"

#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstdint>
#include <cstdlib>
#include <cstring>

#include "braxo/misc/strcat.h"
#include "host/linux/common/descriptor.h"

namespace LinuxHost {
namespace {

constexpr char kJournalSocket[] = "/run/systemd/journal/socket";

// Lowest byte first.
std::string LengthOf(const std::string& value) {
  std::string bytes;
  for (std::uint64_t length = value.size(), byte = 0; byte < sizeof length; ++byte, length >>= 8) {
    bytes += static_cast<char>(length & 0xff);
  }
  return bytes;
}

// Only a value of more than one line needs its length.
std::string Encode(const JournalFields& fields) {
  std::string entry;
  for (const auto& [name, value] : fields) {
    if (value.find('\n') == std::string::npos) {
      entry += name + "=" + value + "\n";
    } else {
      entry += name + "\n" + LengthOf(value) + value + "\n";
    }
  }
  return entry;
}

}  // namespace

bool IsUnderJournal() {
  const char* const stream = secure_getenv("JOURNAL_STREAM");
  struct stat status {};
  return stream != nullptr && fstat(STDERR_FILENO, &status) == 0 &&
         Braxo::Misc::StrCat(status.st_dev, ":", status.st_ino) == stream;
}

void SendToJournal(const JournalFields& fields) {
  const Descriptor client(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
  if (!client.IsOpen()) return;
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, kJournalSocket, sizeof address.sun_path - 1);
  const std::string entry = Encode(fields);
  sendto(client.Number(), entry.data(), entry.size(), MSG_DONTWAIT | MSG_NOSIGNAL,
         reinterpret_cast<const sockaddr*>(&address), sizeof address);
}

}  // namespace LinuxHost
