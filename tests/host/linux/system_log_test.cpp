#include "host/linux/system_log.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <syslog.h>
#include <unistd.h>

#include "scratch_root.h"
#include "teskctl/system.h"

namespace LinuxHostTest {
namespace {

using TeskCtl::System::SyslogIsRunning;
using TeskCtl::System::WriteToKlog;

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
    LinuxHost::DropLog();
    LinuxHost::ShowInformation();
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

TEST_F(SystemLog, FollowsNoLink) {
  scratch.Write("victim", "untouched");
  std::filesystem::create_directories(scratch.Root() / "run/secpolicy");
  std::filesystem::create_symlink("/victim", scratch.Root() / "run/secpolicy/kernel.log");
  EXPECT_EQ(scratch.RunInside([] {
    WriteToKlog("message", "[INFO]");
    return Written();
  }),
            "Unable to write the kernel log /run/secpolicy/kernel.log: Too many levels of "
            "symbolic links");
  EXPECT_EQ(Content(scratch.Root() / "victim"), "untouched");
}

TEST_F(SystemLog, PrefersTheDevice) {
  scratch.Write("dev/kmsg", "");
  scratch.RunInside([] {
    WriteToKlog("message", "[INFO]");
    return Written();
  });
  EXPECT_EQ(Content(scratch.Root() / "dev/kmsg"), "<14>[INFO] message\n");
  EXPECT_EQ(KernelLog(), "");
}

TEST_F(SystemLog, MarksErrorsForTheDevice) {
  scratch.Write("dev/kmsg", "");
  scratch.RunInside([] {
    WriteToKlog("message", "[ERR]");
    return Written();
  });
  EXPECT_EQ(Content(scratch.Root() / "dev/kmsg"), "<11>[ERR] message\n");
}

TEST_F(SystemLog, SplitsWhatIsTooLongForOneRecord) {
  scratch.Write("dev/kmsg", "");
  scratch.RunInside([] {
    WriteToKlog(std::string(900, 'a') + std::string(900, 'b') + "c", "[INFO]");
    return Written();
  });
  EXPECT_EQ(Content(scratch.Root() / "dev/kmsg"), "<14>[INFO] " + std::string(900, 'a') +
                                                      "\n<14>[INFO] " + std::string(900, 'b') +
                                                      "\n<14>[INFO] c\n");
}

TEST_F(SystemLog, WritesAnEmptyMessageAsALine) {
  scratch.Write("dev/kmsg", "");
  scratch.RunInside([] {
    WriteToKlog("", "[INFO]");
    return Written();
  });
  EXPECT_EQ(Content(scratch.Root() / "dev/kmsg"), "<14>[INFO] \n");
}

TEST_F(SystemLog, FailsWithTheSystemsText) {
  std::filesystem::create_directory(scratch.Root() / "dev/kmsg");
  EXPECT_EQ(scratch.RunInside([] {
    WriteToKlog("message", "[INFO]");
    return Written();
  }),
            "Unable to write the kernel log /dev/kmsg: Is a directory");
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
    LinuxHost::ShowInformation();
    return ErrorsOf(log);
  }),
            "information\n");
  EXPECT_EQ(KernelLog(), "[INFO] information\n[ERR] error\n[INFO] information\n[ERR] error\n");
}

TEST_F(SystemLog, HandsShownLinesToTheDaemon) {
  EXPECT_EQ(scratch.RunInside([] {
    const LogDaemon daemon(SOCK_DGRAM);
    LinuxHost::ShowInformation();
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
