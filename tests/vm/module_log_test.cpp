// secpolicy-log beside refusals of the module: hunts for a refusal that it tells otherwise than
// `why` would, and for one that it does not tell.

#include <fcntl.h>
#include <sys/ioctl.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string>

#include "vm/module_fixture.h"

namespace EnforceTest {
namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

// What the shell's command wrote, errors included.
std::string OutputOf(const std::string& command) {
  int ends[2];
  EXPECT_EQ(pipe(ends), 0);
  const pid_t child = fork();
  if (child == 0) {
    dup2(ends[1], STDOUT_FILENO);
    dup2(ends[1], STDERR_FILENO);
    close(ends[0]);
    close(ends[1]);
    execl("/bin/bash", "bash", "-c", command.c_str(), nullptr);
    _exit(99);
  }
  close(ends[1]);
  std::string text;
  char bytes[4096];
  for (ssize_t size = 0; (size = read(ends[0], bytes, sizeof bytes)) > 0;)
    text.append(bytes, static_cast<std::size_t>(size));
  close(ends[0]);
  ResultOf(child);
  return text;
}

std::string Built(const std::string& program) {
  return std::string(getenv("BUILD")) + "/bin/" + program;
}

class ModuleLogTest : public ModuleTest {
 protected:
  static constexpr char kRoot[] = "/tmp/log-example";

  // The example is installed in a state of its own, and its sshDom in the kernel.
  static void SetUpTestSuite() {
    const std::string root = kRoot;
    OutputOf(std::string(getenv("SOURCE")) + "/scripts/pack-example " + root);
    OutputOf(Built("secpolicy") + " --root " + root + " boot");
    setenv("SECPOLICY_HOST_STATE", (root + "/run/secpolicy/host.db").c_str(), 1);
    domain =
        std::stoul("0" + OutputOf(Built("secpolicy") +
                                  " display 2>/dev/null | sed -n 's/^Domain Name: sshDom Domain ID "
                                  ":\\([0-9]*\\) .*/\\1/p'"));
  }
  static void TearDownTestSuite() {
    unsetenv("SECPOLICY_HOST_STATE");
    std::filesystem::remove_all(kRoot);
  }

  void Publish(const std::vector<std::string>& rules, Level level = Level::kEnforcing) {
    Policy::InstalledDomain ssh = Numbered(rules);
    ssh.id = static_cast<unsigned int>(domain);
    ssh.level = level;
    module->Publish(PlanModule({ssh}, CAP_LAST_CAP), 2);
    OutputOf(Built("secpolicy-log --once"));
  }

  int InSsh(const Act& act) { return In(static_cast<unsigned int>(domain), act); }

  static std::string Once(const std::string& options = "") {
    return OutputOf(Built("secpolicy-log --once ") + options);
  }

  static unsigned long domain;
};

unsigned long ModuleLogTest::domain = 0;

int BindToDevice() { return ErrorOf(socket(AF_PACKET, SOCK_RAW, 0)); }
int NameHost() { return ErrorOf(sethostname("host", 4)); }

TEST_F(ModuleLogTest, TellsTheRuleBehindEachRefusal) {
  ASSERT_NE(domain, 0U);
  Publish({"-p socket_family 1 grant", "-p ioctl_request 1 grant"});
  EXPECT_EQ(InSsh(NameHost), EPERM);
  EXPECT_THAT(Once(),
              AllOf(HasSubstr(" sshDom was refused: use cap_sys_admin, by module_tests, process "),
                    HasSubstr(" of user 0; missing in /etc/zorvan/secpolicy/domains/sshDom: -c "
                              "cap_sys_admin grant\n")));
  EXPECT_EQ(InSsh(BindToDevice), EPERM);
  EXPECT_THAT(Once(), HasSubstr(" sshDom was refused: pass socket_family 17, by "));
  EXPECT_EQ(InSsh([] {
              int value = 0;
              return ErrorOf(ioctl(open("/etc/passwd", O_RDONLY | O_CLOEXEC), FIONREAD, &value));
            }),
            EPERM);
  EXPECT_THAT(Once("--format json"),
              AllOf(HasSubstr("\"act\": \"pass ioctl_request 0x541b\""),
                    HasSubstr("\"path\": \"/etc/passwd\""), HasSubstr("\"refused\": true")));
  EXPECT_EQ(InSsh([] { return ErrorOf(unlink("/sys/fs/bpf/secpolicy/events")); }), EPERM);
  EXPECT_THAT(Once(), AllOf(HasSubstr("sshDom was refused: reach what enforces the policy"),
                            HasSubstr("; no rule grants it")));
  EXPECT_THAT(Once(), IsEmpty());
}

TEST_F(ModuleLogTest, TellsWhatRulesGrantByNow) {
  Publish({});
  EXPECT_EQ(InSsh(ChangeRoot), EPERM);
  EXPECT_THAT(Once(), HasSubstr("; by now the rules grant it: /etc/zorvan/secpolicy/domains/"
                                "sshDom:6: -c cap_sys_chroot grant\n"));
}

TEST_F(ModuleLogTest, TellsPermissiveDomainsApart) {
  Publish({}, Level::kPermissive);
  EXPECT_EQ(InSsh(NameHost), 0);
  EXPECT_THAT(Once(), HasSubstr(" sshDom would be refused: use cap_sys_admin, by "));
}

TEST_F(ModuleLogTest, TellsOfADomainThatIsNotInstalled) {
  module->Publish({}, 2);
  Once();
  EXPECT_EQ(In(500, NameHost), EPERM);
  EXPECT_THAT(Once(), AllOf(HasSubstr(" 500 was refused: use cap_sys_admin, by "),
                            HasSubstr("; there is no such domain any more\n")));
}

TEST_F(ModuleLogTest, TellsAFloodInOneLine) {
  Publish({});
  EXPECT_EQ(InSsh([] {
              for (int number = 0; number < 500; ++number) {
                if (NameHost() != EPERM) return 0;
              }
              return EPERM;
            }),
            EPERM);
  const std::string told = Once();
  EXPECT_THAT(told, HasSubstr(", 500 times; missing in "));
  EXPECT_EQ(std::ranges::count(told, '\n'), 1);
}

TEST_F(ModuleLogTest, CountsWhatIsTooMuch) {
  Publish({"-p prctl_option 1000000 grant"});
  EXPECT_EQ(InSsh([] {
              for (unsigned int option = 2000; option < 2100; ++option)
                prctl(static_cast<int>(option), 0, 0, 0, 0);
              return EPERM;
            }),
            EPERM);
  const std::string told = Once();
  EXPECT_EQ(std::ranges::count(told, '\n'), 65);
  EXPECT_THAT(told, HasSubstr("sshDom: 36 more refusals at a time when there were too many"));
}

TEST_F(ModuleLogTest, FollowsAndIsExplained) {
  Publish({});
  const std::string output = "/tmp/log-output";
  const pid_t log = fork();
  if (log == 0) {
    const int file = open(output.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    dup2(file, STDOUT_FILENO);
    execl(Built("secpolicy-log").c_str(), "secpolicy-log", nullptr);
    _exit(99);
  }
  sleep(1);
  const Worker worker(NameHost);
  module->Place(worker.Process(), static_cast<unsigned int>(domain));
  EXPECT_EQ(worker.Do(), EPERM);
  sleep(2);
  EXPECT_THAT(
      OutputOf("cat " + output),
      HasSubstr("sshDom was refused: use cap_sys_admin, by " + Built("module_tests") +
                ", process " + std::to_string(worker.Process()) + " of user 0; missing in "));
  EXPECT_EQ(InSsh([] { return ErrorOf(unlink("/sys/fs/bpf/secpolicy/events")); }), EPERM);
  kill(log, SIGTERM);
  EXPECT_EQ(ResultOf(log), 0);
  EXPECT_THAT(OutputOf("cat " + output), HasSubstr("sshDom was refused: reach what enforces"));
  const std::string why = Built("secpolicy why --last-refusal sshDom");
  EXPECT_THAT(OutputOf(why), HasSubstr("\nno: no rule grants to reach what enforces the policy"));
  EXPECT_EQ(InSsh(NameHost), EPERM);
  Once();
  EXPECT_THAT(OutputOf(why), AllOf(HasSubstr("sshDom was refused: use cap_sys_admin, by "),
                                   HasSubstr("\nno: sshDom may not use cap_sys_admin\nmissing in "
                                             "/etc/zorvan/secpolicy/domains/sshDom:\n")));
  EXPECT_THAT(OutputOf("ls -l " + std::string(kRoot) + "/run/secpolicy/refusals"),
              HasSubstr("-rw------- "));
}

// Receives what is sent to the journal, while it lives.
class Journal {
 public:
  Journal() {
    std::filesystem::create_directories("/run/systemd/journal");
    sockaddr_un address = {};
    address.sun_family = AF_UNIX;
    std::strcpy(address.sun_path, kSocket);
    EXPECT_EQ(bind(socket, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
  }
  ~Journal() {
    close(socket);
    unlink(kSocket);
  }
  Journal(const Journal&) = delete;
  Journal& operator=(const Journal&) = delete;

  std::string Take() const {
    char bytes[8192];
    const ssize_t size = recv(socket, bytes, sizeof bytes, MSG_DONTWAIT);
    return size < 0 ? "" : std::string(bytes, static_cast<std::size_t>(size));
  }

 private:
  static constexpr char kSocket[] = "/run/systemd/journal/socket";

  const int socket = ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
};

TEST_F(ModuleLogTest, TellsTheJournal) {
  Publish({});
  const Journal journal;
  EXPECT_EQ(InSsh(NameHost), EPERM);
  EXPECT_EQ(InSsh(ChangeRoot), EPERM);
  EXPECT_THAT(
      OutputOf("(exec 2>/tmp/log-errors; JOURNAL_STREAM=$(stat -c %d:%i /tmp/log-errors) exec " +
               Built("secpolicy-log --once)")),
      HasSubstr("sshDom was refused: use cap_sys_admin"));
  EXPECT_THAT(
      journal.Take(),
      AllOf(HasSubstr("MESSAGE=sshDom was refused: use cap_sys_admin, by "),
            HasSubstr("\nMESSAGE_ID=3abfec11643a484cb873e0dda124b9b4\nPRIORITY=4\n"),
            HasSubstr("\nSECPOLICY_DOMAIN=sshDom\nSECPOLICY_QUESTION=use cap_sys_admin\n"
                      "SECPOLICY_LEVEL=enforcing\nSECPOLICY_COUNT=1\nSECPOLICY_PROCESS="),
            HasSubstr("\nSECPOLICY_PROGRAM=module_tests\nSECPOLICY_PARENT="),
            HasSubstr("\nSECPOLICY_USER=0\nSECPOLICY_FILE=/etc/zorvan/secpolicy/domains/sshDom\n"
                      "SECPOLICY_REASON=missing in ")));
  EXPECT_THAT(journal.Take(),
              AllOf(HasSubstr("\nSECPOLICY_QUESTION=use cap_sys_chroot\n"),
                    HasSubstr("\nSECPOLICY_FILE=/etc/zorvan/secpolicy/domains/sshDom\n"
                              "SECPOLICY_LINE=6\n")));
  EXPECT_EQ(journal.Take(), "");
}

TEST_F(ModuleLogTest, EndsWithTheModule) {
  Publish({});
  const pid_t log = fork();
  if (log == 0) {
    execl(Built("secpolicy-log").c_str(), "secpolicy-log", nullptr);
    _exit(99);
  }
  sleep(1);
  module.reset();
  Module::Stop();
  EXPECT_EQ(ResultOf(log), 0);
  EXPECT_EQ(Once(), "secpolicy-log: the module: it does not run, so it refuses nothing\n");
}

}  // namespace
}  // namespace EnforceTest
