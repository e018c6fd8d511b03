// Lines of the log: no message forges one or follows a link, the device comes first, and the
// daemon is found when it runs.

#include "host/linux/services/system_log.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <sys/un.h>
#include <syslog.h>
#include <unistd.h>

#include <array>

#include "host/linux/common/descriptor.h"
#include "host/linux/operation/log_use.h"
#include "scratch_root.h"
#include "teskctl/system.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::Descriptor;
using LinuxHost::KernelLogRecords;
using TeskCtl::System::SyslogIsRunning;
using TeskCtl::System::WriteToKlog;
using ::testing::ElementsAre;

// Takes messages at /dev/log as the system log daemon does.
class LogDaemon {
 public:
  explicit LogDaemon(int type) : server(socket(AF_UNIX, type, 0)) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::string("/dev/log").copy(address.sun_path, sizeof address.sun_path - 1);
    if (bind(server, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) _exit(1);
    if (type == SOCK_STREAM && listen(server, 8) != 0) _exit(1);
  }
  LogDaemon(const LogDaemon&) = delete;
  LogDaemon& operator=(const LogDaemon&) = delete;
  ~LogDaemon() { close(server); }

  // The next message as it was sent: priority, then the text behind the sender's tag.
  std::string Next() const {
    char buffer[1024];
    const ssize_t size = recv(server, buffer, sizeof buffer, MSG_DONTWAIT);
    if (size < 0) return "(nothing)";
    const std::string message(buffer, static_cast<std::size_t>(size));
    const std::string priority = message.substr(0, message.find('>') + 1);
    return priority + message.substr(message.find(": ") + 2);
  }

 private:
  int server;
};

class SystemLog : public ::testing::Test {
 protected:
  void SetUp() override {
    if (!MayChangeRoot()) GTEST_SKIP() << "the root directory cannot be changed here";
    std::filesystem::create_directory(scratch.Root() / "dev");
  }

  std::string KernelLog() const { return Content(scratch.Root() / "run/secpolicy/kernel.log"); }

  ScratchRoot scratch;
};

std::string Written() { return "written"; }

TEST_F(SystemLog, WritesLinesWithTheirTagToFile) {
  ASSERT_EQ(scratch.RunInside([] {
    WriteToKlog("first", "[INFO]");
    WriteToKlog("second", "[ERR]");
    return Written();
  }),
            "written");
  EXPECT_EQ(KernelLog(), "[INFO] first\n[ERR] second\n");
}

TEST_F(SystemLog, DropsEveryLineWhenToldTo) {
  ASSERT_EQ(scratch.RunInside([] {
    WriteToKlog("first", "[INFO]");
    const LogDaemon daemon(SOCK_DGRAM);
    const LinuxHost::DroppedLog dropped;
    const LinuxHost::ShownLog shown;
    WriteToKlog("second", "[ERR]");
    LinuxHost::LogInformation("third");
    return std::string(SyslogIsRunning() ? "running, " : "not running, ") + daemon.Next();
  }),
            "not running, (nothing)");
  EXPECT_EQ(KernelLog(), "[INFO] first\n");
}

TEST_F(SystemLog, KeepsTheFileToItsOwner) {
  std::filesystem::remove(scratch.Root() / "run");
  scratch.RunInside([] {
    WriteToKlog("first", "[INFO]");
    return Written();
  });
  struct stat status {};
  ASSERT_EQ(stat((scratch.Root() / "run/secpolicy/kernel.log").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode, S_IFREG | 0600U);
  ASSERT_EQ(stat((scratch.Root() / "run/secpolicy").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode, S_IFDIR | 0700U);
}

TEST_F(SystemLog, LetsNoMessageForgeALine) {
  scratch.RunInside([] {
    WriteToKlog("name\n[ERR] forged\x7f\x1b caf\xc3\xa9", "[INFO]");
    return Written();
  });
  EXPECT_EQ(KernelLog(), "[INFO] name\\x0a[ERR] forged\\x7f\\x1b caf\xc3\xa9\n");
}

// What lies in place of the file is refused at once: no link is followed, and no pipe waited for.
TEST_F(SystemLog, WritesToARegularFileOnly) {
  const std::filesystem::path log = scratch.Root() / "run/secpolicy/kernel.log";
  scratch.Write("victim", "untouched");
  std::filesystem::create_directories(log.parent_path());
  const auto refusal = [&] {
    return scratch.RunInside([] {
      WriteToKlog("message", "[INFO]");
      return Written();
    });
  };
  const std::string expected =
      "Refusing the kernel log: /run/secpolicy/kernel.log is not a regular file. Remove it, or "
      "choose another place";
  std::filesystem::create_symlink("/victim", log);
  EXPECT_EQ(refusal(), expected);
  EXPECT_EQ(Content(scratch.Root() / "victim"), "untouched");
  std::filesystem::remove(log);
  ASSERT_EQ(mkfifo(log.c_str(), 0600), 0);
  EXPECT_EQ(refusal(), expected);
  std::filesystem::remove(log);
  EXPECT_EQ(refusal(), "written");
}

TEST_F(SystemLog, WritesToNothingInPlaceOfTheDevice) {
  const std::filesystem::path device = scratch.Root() / "dev/kmsg";
  scratch.Write("victim", "untouched");
  std::string lines;
  const auto write = [&] {
    scratch.RunInside([] {
      WriteToKlog("message", "[INFO]");
      return Written();
    });
    lines += "[INFO] message\n";
    EXPECT_EQ(KernelLog(), lines);
    std::filesystem::remove(device);
  };
  scratch.Write("dev/kmsg", "content");
  write();
  std::filesystem::create_symlink("/victim", device);
  write();
  EXPECT_EQ(Content(scratch.Root() / "victim"), "untouched");
  ASSERT_EQ(mkfifo(device.c_str(), 0600), 0);
  write();
  std::filesystem::create_directory(device);
  write();
}

TEST_F(SystemLog, PrefersTheDevice) {
  const Descriptor reader(open("/dev/kmsg", O_RDONLY | O_NONBLOCK | O_CLOEXEC));
  const std::string device = scratch.Root() / "dev/kmsg";
  if (!reader.IsOpen() || lseek(reader.Number(), 0, SEEK_END) != 0 ||
      mknod(device.c_str(), S_IFCHR | 0600, makedev(1, 11)) != 0) {
    GTEST_SKIP() << "the kernel log cannot be used here";
  }
  const std::string message = "a line of the test " + std::to_string(getpid());
  const std::string ending = scratch.RunInside([&] {
    WriteToKlog(message, "[INFO]");
    return Written();
  });
  if (ending != "written") GTEST_SKIP() << "the kernel log cannot be written here";
  EXPECT_EQ(KernelLog(), "");
  std::string records;
  std::array<char, 8192> record{};
  for (ssize_t size = 0; (size = read(reader.Number(), record.data(), record.size())) > 0;) {
    records.append(record.data(), static_cast<std::size_t>(size));
  }
  EXPECT_NE(records.find("[INFO] " + message + "\n"), std::string::npos);
}

TEST(KernelLogRecords, TellTheirPriority) {
  EXPECT_THAT(KernelLogRecords("message", "[INFO]"), ElementsAre("<14>[INFO] message\n"));
  EXPECT_THAT(KernelLogRecords("message", "[ERR]"), ElementsAre("<11>[ERR] message\n"));
  EXPECT_THAT(KernelLogRecords("", "[INFO]"), ElementsAre("<14>[INFO] \n"));
}

TEST(KernelLogRecords, SplitWhatIsTooLongForOne) {
  const std::string first(900, 'a');
  const std::string second(900, 'b');
  EXPECT_THAT(
      KernelLogRecords(first + second + "c", "[INFO]"),
      ElementsAre("<14>[INFO] " + first + "\n", "<14>[INFO] " + second + "\n", "<14>[INFO] c\n"));
}

TEST_F(SystemLog, DaemonRunsWhileItTakesConnections) {
  for (const int type : {SOCK_DGRAM, SOCK_STREAM}) {
    EXPECT_EQ(scratch.RunInside([type] {
      std::string answers = SyslogIsRunning() ? "yes" : "no";
      {
        const LogDaemon daemon(type);
        answers += SyslogIsRunning() ? " yes" : " no";
      }
      // Its socket is still there, but nobody listens.
      answers += SyslogIsRunning() ? " yes" : " no";
      unlink("/dev/log");
      return answers;
    }),
              "no yes no");
  }
}

// What standard error gets while `body` runs.
std::string ErrorsOf(const std::function<void()>& body) {
  const int file = open("/errors", O_RDWR | O_CREAT | O_TRUNC, 0600);
  dup2(file, STDERR_FILENO);
  body();
  return Content("/errors");
}

TEST_F(SystemLog, ShowsInformationOnlyWhenAsked) {
  const auto log = [] {
    WriteToKlog("information", "[INFO]");
    WriteToKlog("error", "[ERR]");
  };
  EXPECT_EQ(scratch.RunInside([&] { return ErrorsOf(log); }), "");
  EXPECT_EQ(scratch.RunInside([&] {
    const LinuxHost::ShownLog shown;
    return ErrorsOf(log);
  }),
            "information\n");
  EXPECT_EQ(KernelLog(), "[INFO] information\n[ERR] error\n[INFO] information\n[ERR] error\n");
}

TEST_F(SystemLog, HandsShownLinesToTheDaemon) {
  EXPECT_EQ(scratch.RunInside([] {
    const LogDaemon daemon(SOCK_DGRAM);
    const LinuxHost::ShownLog shown;
    std::string answers = SyslogIsRunning() ? "yes" : "no";
    answers += "|" + ErrorsOf([] {
                 WriteToKlog("100%s", "[INFO]");
                 WriteToKlog("100%s", "[ERR]");
               });
    for (int message = 1; message <= 3; ++message) answers += "|" + daemon.Next();
    return answers;
  }),
            "no|100%s\n|<14>100%s|<11>Error: 100%s|(nothing)");
  EXPECT_EQ(KernelLog(), "");
}

}  // namespace
}  // namespace LinuxHostTest
