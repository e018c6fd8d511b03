#include "host/linux/services/system_log.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <sys/un.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <iostream>
#include <string_view>

#include "braxo/misc/strcat.h"
#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/private_file.h"
#include "teskctl/system.h"

namespace LinuxHost {
namespace {

constexpr char kKernelLogDevice[] = "/dev/kmsg";
constexpr char kKernelLogFile[] = "/run/secpolicy/kernel.log";
constexpr char kInformationTag[] = "[INFO]";

// The kernel refuses a record of more than about 976 bytes.
constexpr std::size_t kMaxRecordText = 900;

// Never waits: a daemon with a full queue does not take messages.
bool AcceptsConnection(const char* path, int type) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, path, sizeof address.sun_path - 1);
  const Descriptor client(socket(AF_UNIX, type | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
  return client.IsOpen() &&
         connect(client.Number(), reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0;
}

// The two kinds of socket that syslog(3) itself tries.
bool SyslogDaemonListens() {
  return AcceptsConnection(_PATH_LOG, SOCK_DGRAM) || AcceptsConnection(_PATH_LOG, SOCK_STREAM);
}

[[noreturn]] void FailToWrite(const char* path) {
  ThrowErrno("Unable to write the kernel log ", path);
}

void WriteWhole(const Descriptor& log, const char* path, std::string_view record) {
  const ssize_t written = write(log.Number(), record.data(), record.size());
  if (written < 0) FailToWrite(path);
  if (static_cast<std::size_t>(written) == record.size()) return;
  errno = ENOSPC;
  FailToWrite(path);
}

// A message may quote a file name, and a file name may hold anything: control characters are
// written as the kernel log shows them, so that no name can forge a line.
std::string Printable(const std::string& message) {
  constexpr char kDigits[] = "0123456789abcdef";
  std::string text;
  text.reserve(message.size());
  for (const char character : message) {
    const auto byte = static_cast<unsigned char>(character);
    if (byte >= 0x20 && byte != 0x7f) {
      text += character;
      continue;
    }
    text += "\\x";
    text += kDigits[byte >> 4];
    text += kDigits[byte & 0xf];
  }
  return text;
}

// What else lies there, a pipe or a link perhaps, would keep the writer waiting or be written over.
bool HasKernelLogDevice() {
  struct stat status {};
  return lstat(kKernelLogDevice, &status) == 0 && S_ISCHR(status.st_mode) &&
         status.st_rdev == makedev(1, 11);
}

void AppendLine(std::string_view text, const std::string& tag) {
  mkdir("/run", 0755);
  PreparePrivateFile(kKernelLogFile, "kernel log");
  const Descriptor file(
      open(kKernelLogFile, O_WRONLY | O_APPEND | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
  if (!file.IsOpen()) FailToWrite(kKernelLogFile);
  // One write: lines of several processes stay whole.
  WriteWhole(file, kKernelLogFile, Braxo::Misc::StrCat(tag, " ", text, "\n"));
}

void WriteToKernelLog(const std::string& message, const std::string& tag) {
  if (!HasKernelLogDevice()) return AppendLine(Printable(message), tag);
  const Descriptor device(open(kKernelLogDevice, O_WRONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
  if (!device.IsOpen()) FailToWrite(kKernelLogDevice);
  for (const std::string& record : KernelLogRecords(message, tag)) {
    WriteWhole(device, kKernelLogDevice, record);
  }
}

void WriteToSyslog(const std::string& message, const std::string& tag) {
  if (tag == kInformationTag) {
    syslog(LOG_INFO, "%s", message.c_str());
  } else {
    syslog(LOG_ERR, "Error: %s", message.c_str());
  }
}

}  // namespace

LogUse& CurrentLogUse() {
  static LogUse use;
  return use;
}

std::vector<std::string> KernelLogRecords(const std::string& message, const std::string& tag) {
  const int priority = LOG_USER | (tag == kInformationTag ? LOG_INFO : LOG_ERR);
  const std::string text = Printable(message);
  std::vector<std::string> records;
  std::size_t begin = 0;
  do {
    records.push_back(Braxo::Misc::StrCat("<", priority, ">", tag, " ",
                                          text.substr(begin, kMaxRecordText), "\n"));
    begin += kMaxRecordText;
  } while (begin < text.size());
  return records;
}

void LogInformation(const std::string& message) {
  if (TeskCtl::System::SyslogIsRunning()) return WriteToSyslog(message, kInformationTag);
  TeskCtl::System::WriteToKlog(message, kInformationTag);
}

}  // namespace LinuxHost

namespace TeskCtl::System {

bool SyslogIsRunning() {
  const LinuxHost::LogUse& use = LinuxHost::CurrentLogUse();
  return !use.dropsLines && !use.showsInformation && LinuxHost::SyslogDaemonListens();
}

void WriteToKlog(const std::string& message, const std::string& tag) {
  const LinuxHost::LogUse& use = LinuxHost::CurrentLogUse();
  if (use.dropsLines) return;
  if (use.showsInformation && tag == LinuxHost::kInformationTag) {
    std::cerr << message << std::endl;
  }
  if (use.showsInformation && LinuxHost::SyslogDaemonListens()) {
    return LinuxHost::WriteToSyslog(message, tag);
  }
  LinuxHost::WriteToKernelLog(message, tag);
}

}  // namespace TeskCtl::System
