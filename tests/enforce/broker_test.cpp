// What the broker of a domain takes from those who are confined, who may send it anything: hunts
// for a message by which it starts what it should not, waits for somebody, keeps what it was sent,
// or ends. Whom it starts is judged elsewhere.

#include "host/enforce/broker/broker.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <poll.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <optional>
#include <utility>
#include <vector>

#include "host/enforce/broker/seen_file.h"
#include "support/temporary_directory.h"

namespace Enforce {
namespace {

// ---- Messages

EntryRequest RequestFor(std::vector<std::string> command) {
  return {.command = std::move(command), .environment = {}};
}

TEST(BrokerMessage, IsReadAsItWasWritten) {
  const EntryRequest request = {.command = {"name", "", "two words"},
                                .environment = {"TERM=dumb", "LC_ALL=C"}};
  EntryRequest read;
  ASSERT_TRUE(Parse(Serialize(request), &read));
  EXPECT_EQ(read.command, request.command);
  EXPECT_EQ(read.environment, request.environment);
}

std::string Bytes(std::uint32_t words, std::uint32_t variables, std::string_view rest) {
  std::string bytes(reinterpret_cast<const char*>(&words), sizeof(words));
  bytes.append(reinterpret_cast<const char*>(&variables), sizeof(variables)).append(rest);
  return bytes;
}

std::vector<std::string> NoRequests() {
  using std::string_view_literals::operator""sv;
  return {"",
          "x",
          Bytes(0, 0, ""),
          Bytes(0, 1, "TERM=dumb\0"sv),
          Bytes(1, 0, ""),
          Bytes(1, 0, "name"),
          Bytes(2, 0, "name\0"sv),
          Bytes(1, 0, "name\0more\0"sv),
          Bytes(1, 1, "name\0"sv),
          Bytes(0xffff'ffff, 0, "name\0"sv),
          Bytes(1, 0xffff'ffff, "name\0TERM=dumb\0"sv),
          Bytes(1, 1, "name\0LD_PRELOAD=library.so\0"sv),
          Bytes(1, 1, "name\0PATH=here\0"sv),
          Bytes(1, 1, "name\0TERM\0"sv),
          Bytes(1, 1, "name\0TERM=/etc/terminal\0"sv),
          Bytes(1, 1, "name\0LC_ALL=%n\0"sv),
          Bytes(1, 0, std::string(kMostRequestBytes, 'x') + '\0')};
}

TEST(BrokerMessage, IsNothingElse) {
  EntryRequest read;
  for (const std::string& bytes : NoRequests()) {
    EXPECT_FALSE(Parse(bytes, &read)) << testing::PrintToString(bytes.substr(0, 64));
  }
}

TEST(BrokerMessage, HandsOnNothingThatSteersPrograms) {
  for (const char* const variable :
       {"TERM=xterm-256color", "LANG=de_DE.UTF-8", "LC_ALL=", "COLUMNS=80"}) {
    EXPECT_TRUE(MayBeHandedOn(variable)) << variable;
  }
  for (const char* const variable :
       {"", "TERM", "=TERM", "LD_PRELOAD=x", "LD_LIBRARY_PATH=x", "PATH=x", "BASH_ENV=x", "ENV=x",
        "PYTHONPATH=x", "IFS=x", "GLIBC_TUNABLES=x", "LANG=../x", "LC_ALL=/x", "TERM=%s",
        "SECPOLICY_BROKER=3", "SECPOLICY_HOST_STATE=x", "TERMINFO=x", "LOCPATH=x"}) {
    EXPECT_FALSE(MayBeHandedOn(variable)) << variable;
  }
}

// ---- The broker

FileDescriptor Open(const std::string& path, int flags) {
  return FileDescriptor(open(path.c_str(), flags | O_CLOEXEC));
}

struct Pipe {
  Pipe() {
    int ends[2] = {};
    EXPECT_EQ(pipe2(ends, O_CLOEXEC), 0);
    reading = FileDescriptor(ends[0]);
    writing = FileDescriptor(ends[1]);
  }
  FileDescriptor reading;
  FileDescriptor writing;
};

// All that is written until nobody can write any more.
std::string ReadAll(const FileDescriptor& file) {
  std::string text;
  std::array<char, 256> block{};
  ssize_t size = 0;
  while ((size = read(file.Number(), block.data(), block.size())) > 0) {
    text.append(block.data(), static_cast<std::size_t>(size));
  }
  return text;
}

class BrokerTest : public testing::Test {
 protected:
  BrokerTest() {
    // Sends what it was asked for, and ends with the number of its words.
    brokerage.enter = [](const AskedEntry& asked) {
      std::string text;
      for (const std::string& word : asked.request.command) text += word + "\n";
      for (const std::string& word : asked.request.environment) text += word + "\n";
      static_cast<void>(!write(STDOUT_FILENO, text.data(), text.size()));
      if (asked.request.command.front() == "wait") pause();
      if (asked.request.command.front() == "parent") {
        text = std::to_string(getppid());
        static_cast<void>(!write(STDOUT_FILENO, text.data(), text.size()));
      }
      return static_cast<int>(asked.request.command.size());
    };
    brokerage.procDirectory = proc.Number();
  }

  void Start() { broker = StartBroker(brokerage); }

  const FileDescriptor proc = Open("/proc", O_PATH | O_DIRECTORY);
  Brokerage brokerage;
  FileDescriptor broker;
};

// Who asks, and all that goes along.
struct Asking {
  Asking() {
    descriptors[kProgram] = Open("/bin/true", O_PATH);
    descriptors[kDirectory] = Open("/usr", O_PATH | O_DIRECTORY);
    descriptors[kInput] = Open("/dev/null", O_RDONLY);
    descriptors[kOutput] = std::move(outputPipe.writing);
    descriptors[kErrors] = Open("/dev/null", O_WRONLY);
    descriptors[kAnswers] = std::move(answersPipe.writing);
    descriptors[kSignals] = std::move(signalsPipe.reading);
    output = std::move(outputPipe.reading);
    answers = std::move(answersPipe.reading);
    signals = std::move(signalsPipe.writing);
  }

  bool Send(const FileDescriptor& broker, const std::string& bytes) {
    std::vector<int> numbers;
    for (const FileDescriptor& descriptor : descriptors) numbers.push_back(descriptor.Number());
    iovec part = {const_cast<char*>(bytes.data()), bytes.size()};
    std::vector<char> control(CMSG_SPACE(sizeof(int) * numbers.size()));
    msghdr message = {};
    message.msg_iov = &part;
    message.msg_iovlen = 1;
    if (!numbers.empty()) {
      message.msg_control = control.data();
      message.msg_controllen = control.size();
      cmsghdr* const rights = CMSG_FIRSTHDR(&message);
      rights->cmsg_level = SOL_SOCKET;
      rights->cmsg_type = SCM_RIGHTS;
      rights->cmsg_len = CMSG_LEN(sizeof(int) * numbers.size());
      std::memcpy(CMSG_DATA(rights), numbers.data(), sizeof(int) * numbers.size());
    }
    const bool isSent = sendmsg(broker.Number(), &message, MSG_NOSIGNAL) >= 0;
    descriptors.clear();
    return isSent;
  }

  // "ended 3", "refused EPERM", or "nothing" when no answer will ever come.
  std::string Answer() {
    EntryAnswer answer;
    if (read(answers.Number(), &answer, sizeof(answer)) != sizeof(answer)) return "nothing";
    // It comes once, and then the broker has nothing left of this.
    EXPECT_EQ(read(answers.Number(), &answer, sizeof(answer)), 0);
    if (answer.kind == EntryAnswer::kEnded) return "ended " + std::to_string(answer.value);
    return std::string("refused ") + strerrorname_np(static_cast<int>(answer.value));
  }

  std::string Ask(const FileDescriptor& broker, const std::string& bytes) {
    if (!Send(broker, bytes)) return strerrorname_np(errno);
    return Answer();
  }

  std::vector<FileDescriptor> descriptors{kEntryDescriptors};
  FileDescriptor output;
  FileDescriptor answers;
  FileDescriptor signals;

 private:
  Pipe outputPipe;
  Pipe answersPipe;
  Pipe signalsPipe;
};

const std::string& GoodRequest() {
  static const std::string bytes =
      Serialize({.command = {"name", "word"}, .environment = {"TERM=dumb"}});
  return bytes;
}

std::string AskWell(const FileDescriptor& broker) { return Asking().Ask(broker, GoodRequest()); }

TEST_F(BrokerTest, StartsWhatItIsAskedFor) {
  Start();
  Asking asking;
  EXPECT_EQ(asking.Ask(broker, GoodRequest()), "ended 2");
  EXPECT_EQ(ReadAll(asking.output), "name\nword\nTERM=dumb\n");
}

TEST_F(BrokerTest, GivesTheDescriptorsThatWereSent) {
  brokerage.enter = [](const AskedEntry& asked) {
    struct stat program = {};
    struct stat directory = {};
    struct stat expected = {};
    struct stat usr = {};
    const bool isWell = fstat(asked.program.Number(), &program) == 0 &&
                        fstat(asked.directory.Number(), &directory) == 0 &&
                        stat("/bin/true", &expected) == 0 && stat("/usr", &usr) == 0 &&
                        program.st_ino == expected.st_ino && directory.st_ino == usr.st_ino;
    return isWell ? 0 : 1;
  };
  Start();
  EXPECT_EQ(AskWell(broker), "ended 0");
}

TEST_F(BrokerTest, RefusesWhatIsNoRequest) {
  Start();
  for (const std::string& bytes : NoRequests()) {
    EXPECT_EQ(Asking().Ask(broker, bytes), "refused EBADMSG")
        << testing::PrintToString(bytes.substr(0, 64));
  }
  EXPECT_EQ(AskWell(broker), "ended 2");
}

TEST_F(BrokerTest, StartsNothingByTooFewDescriptorsOrTooMany) {
  Start();
  for (const std::size_t count : {0U, 1U, 6U, 8U, 9U, 100U, 253U}) {
    Asking asking;
    asking.descriptors.resize(std::min<std::size_t>(count, kEntryDescriptors));
    while (asking.descriptors.size() < count) {
      asking.descriptors.push_back(Open("/dev/null", O_RDONLY));
    }
    EXPECT_EQ(asking.Ask(broker, GoodRequest()), "nothing") << count;
    EXPECT_EQ(ReadAll(asking.output), "") << count;
  }
  EXPECT_EQ(AskWell(broker), "ended 2");
}

struct Misfit {
  EntryDescriptor place;
  const char* path;
  int flags;
  const char* answer;
};

TEST_F(BrokerTest, StartsNothingByDescriptorsOfOtherKinds) {
  const SecPolicyTest::TemporaryDirectory directory;
  const std::string fifo = directory.Path() + "/fifo";
  ASSERT_EQ(mkfifo(fifo.c_str(), 0600), 0);
  // So that it can be opened at once, and what is written to it would be seen.
  const FileDescriptor reader = Open(fifo, O_RDWR | O_NONBLOCK);
  const std::vector<Misfit> misfits = {
      {kProgram, "/usr", O_PATH, "refused EBADMSG"},
      {kProgram, "/dev/null", O_PATH, "refused EBADMSG"},
      {kProgram, fifo.c_str(), O_PATH, "refused EBADMSG"},
      {kDirectory, "/bin/true", O_PATH, "refused EBADMSG"},
      {kSignals, "/dev/null", O_RDONLY, "refused EBADMSG"},
      {kSignals, fifo.c_str(), O_PATH, "refused EBADMSG"},
      {kSignals, fifo.c_str(), O_WRONLY | O_NONBLOCK, "refused EBADMSG"},
      {kAnswers, "/dev/null", O_WRONLY, "nothing"},
      {kAnswers, fifo.c_str(), O_PATH, "nothing"},
      {kAnswers, fifo.c_str(), O_RDONLY | O_NONBLOCK, "nothing"},
  };
  Start();
  for (const Misfit& misfit : misfits) {
    Asking asking;
    asking.descriptors[misfit.place] = Open(misfit.path, misfit.flags);
    ASSERT_TRUE(asking.descriptors[misfit.place].IsOpen()) << misfit.path;
    EXPECT_EQ(asking.Ask(broker, GoodRequest()), misfit.answer) << misfit.place << misfit.path;
    EXPECT_EQ(ReadAll(asking.output), "") << misfit.place << misfit.path;
  }
  char byte = 0;
  EXPECT_EQ(read(reader.Number(), &byte, 1), -1) << "nobody may have it write to a path";
  EXPECT_EQ(AskWell(broker), "ended 2");
}

TEST_F(BrokerTest, IsNotEndedByAnEmptyMessage) {
  Start();
  for (int time = 0; time < 3; ++time) {
    EXPECT_EQ(send(broker.Number(), "", 0, 0), 0);
    EXPECT_EQ(AskWell(broker), "ended 2");
  }
}

// Whose rights it would be started with is the broker's user.
TEST_F(BrokerTest, ServesNoOtherUser) {
  if (geteuid() != 0) GTEST_SKIP() << "only root can become another user";
  Start();
  for (const auto& become : {+[] { return setresuid(65534, 65534, 65534); },
                             +[] { return setresgid(65534, 65534, 65534); }}) {
    Asking asking;
    const pid_t other = fork();
    if (other == 0) _exit(become() == 0 && asking.Send(broker, GoodRequest()) ? 0 : 1);
    int status = -1;
    ASSERT_EQ(waitpid(other, &status, 0), other);
    ASSERT_EQ(status, 0);
    asking.descriptors.clear();
    EXPECT_EQ(asking.Answer(), "refused EPERM");
  }
  EXPECT_EQ(AskWell(broker), "ended 2");
}

TEST_F(BrokerTest, HasALimitOfProgramsAtOnce) {
  constexpr int kMost = 256;
  Start();
  std::vector<Asking> all(kMost);
  for (Asking& asking : all) ASSERT_TRUE(asking.Send(broker, Serialize(RequestFor({"wait"}))));
  EXPECT_EQ(AskWell(broker), "refused EAGAIN");
  // One that ends makes room.
  const auto kill = static_cast<unsigned char>(SIGTERM);
  ASSERT_EQ(write(all.front().signals.Number(), &kill, 1), 1);
  EXPECT_EQ(all.front().Answer(), "ended 143");
  EXPECT_EQ(AskWell(broker), "ended 2");
}

TEST_F(BrokerTest, WaitsForNobodyWhoDoesNotRead) {
  Start();
  Asking deaf;
  const int end = deaf.descriptors[kAnswers].Number();
  const int flags = fcntl(end, F_GETFL);
  ASSERT_EQ(fcntl(end, F_SETFL, flags | O_NONBLOCK), 0);
  while (write(end, "x", 1) == 1) continue;
  ASSERT_EQ(fcntl(end, F_SETFL, flags), 0);
  ASSERT_TRUE(deaf.Send(broker, GoodRequest()));
  EXPECT_EQ(AskWell(broker), "ended 2");
  Asking gone;
  ASSERT_TRUE(gone.Send(broker, GoodRequest()));
  gone.answers = {};
  EXPECT_EQ(AskWell(broker), "ended 2");
}

TEST_F(BrokerTest, HandsOnSignals) {
  Start();
  Asking asking;
  ASSERT_TRUE(asking.Send(broker, Serialize(RequestFor({"wait"}))));
  // None of these is a signal, or does anything to who waits.
  const std::array<unsigned char, 5> signals = {0, 255, 65, SIGCONT, SIGUSR1};
  ASSERT_EQ(write(asking.signals.Number(), signals.data(), signals.size()), 5);
  EXPECT_EQ(asking.Answer(), "ended " + std::to_string(128 + SIGUSR1));
}

TEST_F(BrokerTest, EndsWhatItStartedWithWhoAsked) {
  Start();
  Asking asking;
  ASSERT_TRUE(asking.Send(broker, Serialize(RequestFor({"wait"}))));
  std::array<char, 5> ready{};
  ASSERT_EQ(read(asking.output.Number(), ready.data(), ready.size()), 5);
  asking.signals = {};
  EXPECT_EQ(asking.Answer(), "ended " + std::to_string(128 + SIGKILL));
}

pid_t ProcessOf(const FileDescriptor& broker) {
  Asking asking;
  EXPECT_EQ(asking.Ask(broker, Serialize(RequestFor({"parent"}))), "ended 1");
  return std::stoi(ReadAll(asking.output).substr(std::strlen("parent\n")));
}

// Somebody else buries it.
bool HasEnded(pid_t process) {
  std::ifstream status("/proc/" + std::to_string(process) + "/stat");
  std::string text;
  return !std::getline(status, text) || text.find(") Z ") != std::string::npos;
}

TEST_F(BrokerTest, EndsWhenNobodyCanAskAnyMore) {
  Start();
  const pid_t process = ProcessOf(broker);
  EXPECT_FALSE(HasEnded(process));
  Asking waiting;
  ASSERT_TRUE(waiting.Send(broker, Serialize(RequestFor({"wait"}))));
  broker = {};
  EXPECT_EQ(kill(process, SIGTERM), 0) << "that ends nobody but those who can be ended by it";
  usleep(100'000);
  EXPECT_FALSE(HasEnded(process));
  waiting.signals = {};
  EXPECT_EQ(waiting.Answer(), "ended " + std::to_string(128 + SIGKILL));
  for (int tries = 0; tries < 100 && !HasEnded(process); ++tries) usleep(20'000);
  EXPECT_TRUE(HasEnded(process));
}

std::ptrdiff_t DescriptorsOf(pid_t process) {
  const std::filesystem::directory_iterator all("/proc/" + std::to_string(process) + "/fd");
  return std::distance(begin(all), end(all));
}

TEST_F(BrokerTest, KeepsNothingThatItWasSent) {
  Start();
  const pid_t process = ProcessOf(broker);
  const auto before = DescriptorsOf(process);
  for (int time = 0; time < 100; ++time) {
    EXPECT_EQ(Asking().Ask(broker, "x"), "refused EBADMSG");
    Asking few;
    few.descriptors.pop_back();
    EXPECT_EQ(few.Ask(broker, GoodRequest()), "nothing");
  }
  EXPECT_EQ(AskWell(broker), "ended 2");
  EXPECT_EQ(DescriptorsOf(process), before);
}

// Or whoever waits for its end, such as a pipe of a shell, would wait for the broker.
TEST_F(BrokerTest, KeepsNoDescriptorOfItsCaller) {
  Pipe pipe;
  ASSERT_EQ(fcntl(pipe.writing.Number(), F_SETFD, 0), 0);
  Start();
  pipe.writing = {};
  pollfd source = {pipe.reading.Number(), POLLIN, 0};
  EXPECT_EQ(poll(&source, 1, 5000), 1);
  EXPECT_EQ(ReadAll(pipe.reading), "");
}

// ---- Files as the broker sees them

class SeenFileTest : public testing::Test {
 protected:
  std::string See(const FileDescriptor& file) const {
    const SeenFile seen = SeeAgain(file.Number(), proc.Number(), O_RDONLY);
    return seen.file.IsOpen() ? seen.path : "not seen";
  }

  const FileDescriptor proc = Open("/proc", O_PATH | O_DIRECTORY);
  const SecPolicyTest::TemporaryDirectory directory;
  const std::string real = std::filesystem::canonical(directory.Path());
};

TEST_F(SeenFileTest, HasAPathWithoutLinks) {
  std::ofstream(real + "/file") << "text";
  std::filesystem::create_symlink(real + "/file", real + "/link");
  EXPECT_EQ(See(Open(real + "/link", O_PATH)), real + "/file");
  EXPECT_EQ(See(Open(real + "/link", O_PATH | O_NOFOLLOW)), "not seen");
}

TEST_F(SeenFileTest, IsNotWhatHasComeInItsPlace) {
  std::ofstream(real + "/file") << "text";
  std::ofstream(real + "/other") << "another";
  const FileDescriptor file = Open(real + "/file", O_PATH);
  std::filesystem::rename(real + "/file", real + "/moved");
  EXPECT_EQ(See(file), real + "/moved");
  std::filesystem::rename(real + "/other", real + "/moved");
  EXPECT_EQ(See(file), "not seen");
  std::ofstream(real + "/moved (deleted)") << "text";
  EXPECT_EQ(See(file), "not seen");
  EXPECT_EQ(See(FileDescriptor(memfd_create("program", MFD_CLOEXEC))), "not seen");
}

}  // namespace
}  // namespace Enforce
