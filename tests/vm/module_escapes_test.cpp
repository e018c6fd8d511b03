// Ways out of a domain: hunts for one that is open. Each is tried in kDomain, which has to refuse
// it, and beside it in kOther, whose rules grant it, or outside where no rule can: there the same
// act has to work. By root, by an ordinary user, and by root of a user namespace, as far as they
// could do it.

#include <arpa/inet.h>
#include <fcntl.h>
#include <linux/capability.h>
#include <linux/fs.h>
#include <linux/io_uring.h>
#include <linux/sched.h>
#include <mqueue.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sched.h>
#include <sys/inotify.h>
#include <sys/ioctl.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/uio.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <string>
#include <thread>
#include <tuple>
#include <utility>
#include <vector>

#include "host/enforce/supervise/file_descriptor.h"
#include "vm/module_fixture.h"
#include "vm/unix_sockets.h"

namespace EnforceTest {
namespace {

namespace fs = std::filesystem;
using Enforce::FileDescriptor;

const Enforce::LabelNumbers kLabels = {{"public", 300}, {"secret", 301}};
const std::string kTree = "/tmp/escapes";

std::string At(const std::string& name) { return kTree + "/" + name; }

// A rule about a path of the tree, which may be empty.
std::string About(const std::string& name, const std::string& rights = "") {
  return "-r " + (name.empty() ? kTree : At(name)) + " " + rights;
}

void Label(const std::string& path, const std::string& label) {
  const std::uint32_t number = kLabels.at(label);
  ASSERT_EQ(setxattr(path.c_str(), "security.bpf.zorvan", &number, sizeof(number), 0), 0) << path;
}

int Open(const std::string& path, int flags) {
  const FileDescriptor file(open(path.c_str(), flags | O_CLOEXEC, 0666));
  return file.IsOpen() ? 0 : errno;
}

Act Opens(const std::string& path, int flags) {
  return [path, flags] { return Open(path, flags); };
}

Act Reads(const std::string& path) { return Opens(path, O_RDONLY); }

int Descriptor(long result) {
  const FileDescriptor made(static_cast<int>(result));
  return made.IsOpen() ? 0 : errno;
}

int Rename(const std::string& from, const std::string& to, unsigned int flags = 0) {
  return ErrorOf(syscall(SYS_renameat2, AT_FDCWD, from.c_str(), AT_FDCWD, to.c_str(), flags));
}

// Nothing went wrong, and it ends as it should; else the error of what was executed.
int Execute(const std::vector<std::string>& words) {
  std::vector<char*> arguments;
  for (const std::string& word : words) arguments.push_back(const_cast<char*>(word.c_str()));
  arguments.push_back(nullptr);
  return InChild([&] {
    execv(arguments[0], arguments.data());
    return errno;
  });
}

int MapToExecute(const std::string& path) {
  const FileDescriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  if (!file.IsOpen()) return errno;
  void* const memory = mmap(nullptr, 4096, PROT_READ | PROT_EXEC, MAP_PRIVATE, file.Number(), 0);
  return memory == MAP_FAILED ? errno : ErrorOf(munmap(memory, 4096));
}

struct Somebody {
  const char* name;
  int (*become)();
};

constexpr Somebody kRoot = {"Root", [] { return 0; }};
constexpr Somebody kOrdinary = {"User", BecomeUser};
constexpr Somebody kInNamespace = {"RootOfNamespace", BecomeRootOfNamespace};

class ModuleEscapes : public ModuleTest {
 protected:
  void SetUp() override {
    ModuleTest::SetUp();
    if (IsSkipped()) return;
    module->Publish({}, 1);
    // So that nobody is kept from it by modes.
    umask(0);
    fs::remove_all(kTree);
    for (const char* const place : {"public", "secret"}) {
      fs::create_directories(At(place) + "/directory");
      for (const char* const directory : {"", "/directory"}) {
        const FileDescriptor file(
            open((At(place) + directory + "/file").c_str(), O_CREAT | O_WRONLY, 0666));
        EXPECT_EQ(write(file.Number(), place, 6), 6);
      }
      fs::copy_file("/bin/busybox", At(place) + "/true");
      fs::permissions(At(place) + "/true", fs::perms::all);
      Label(At(place), place);
    }
    if (!std::exchange(isLearned, true)) module->LearnLabels();
  }
  // With the module what was learned ends, and until then it is kept current.
  static void SetUpTestSuite() { isLearned = false; }

  // What kDomain and kOther may; all that is not about files both may.
  void Publish(const std::vector<std::string>& narrow, const std::vector<std::string>& wide,
               std::uint64_t capabilities = kAll) {
    std::vector<Policy::InstalledDomain> domains = {NumberedStrictly(narrow),
                                                    NumberedStrictly(wide)};
    domains[1].id = kOther;
    ModulePlan plan = PlanModule(domains, CAP_LAST_CAP, kLabels);
    plan[0].rules.capabilities = capabilities;
    plan[1].rules.capabilities = kAll;
    module->Publish(plan, 2);
  }

  // The same beside all files.
  void PublishOpen(std::vector<std::string> narrow, std::vector<std::string> wide = {},
                   std::uint64_t capabilities = kAll) {
    narrow.emplace_back(kAllFiles);
    wide.emplace_back(kAllFiles);
    Publish(narrow, wide, capabilities);
  }

  void ExpectRefusedTo(const Somebody& who, const std::string& what, const Act& act) {
    SCOPED_TRACE(what);
    EXPECT_EQ(InAfter(kDomain, who.become, act), EPERM);
    EXPECT_EQ(InAfter(kOther, who.become, act), 0);
  }

  // What no rule grants works outside.
  void ExpectRefusedInside(const Somebody& who, const std::string& what, const Act& act) {
    SCOPED_TRACE(what);
    EXPECT_EQ(InAfter(kDomain, who.become, act), EPERM);
    EXPECT_EQ(InChild([&] { return who.become() == 0 ? act() : 1000; }), 0);
  }

 private:
  inline static bool isLearned = false;
};

class ModuleEscapesOfAll : public ModuleEscapes, public testing::WithParamInterface<Somebody> {
 protected:
  void Refuses(const std::string& what, const Act& act) { ExpectRefusedTo(GetParam(), what, act); }
  void RefusesInside(const std::string& what, const Act& act) {
    ExpectRefusedInside(GetParam(), what, act);
  }
  void Grants(const std::string& what, const Act& act) {
    SCOPED_TRACE(what);
    EXPECT_EQ(InAfter(kDomain, GetParam().become, act), 0);
  }
};

INSTANTIATE_TEST_SUITE_P(By, ModuleEscapesOfAll, testing::Values(kRoot, kOrdinary, kInNamespace),
                         [](const auto& one) { return std::string(one.param.name); });

// ---- Files

TEST_P(ModuleEscapesOfAll, ReadingWhatHasAnotherLabel) {
  Publish({"-a public read grant"}, {"-a public read grant", "-a secret read grant"});
  Refuses("read", Reads(At("secret/file")));
  Refuses("read below", Reads(At("secret/directory/file")));
  Grants("of its label", Reads(At("public/file")));
}

TEST_P(ModuleEscapesOfAll, WritingToWhatMayOnlyBeRead) {
  Publish({About("", "r")}, {About("", "rw")});
  for (const int flags : {O_WRONLY, O_RDWR, O_WRONLY | O_APPEND})
    Refuses(std::to_string(flags), Opens(At("secret/file"), flags));
  Grants("read", Reads(At("secret/file")));
}

std::vector<std::pair<const char*, Act>> WaysToEmpty(const std::string& path) {
  return {{"truncate", [path] { return ErrorOf(truncate(path.c_str(), 0)); }},
          {"open to read", Opens(path, O_RDONLY | O_TRUNC)},
          {"open to write", Opens(path, O_WRONLY | O_TRUNC)},
          {"ftruncate", [path] {
             const FileDescriptor file(open(path.c_str(), O_WRONLY | O_CLOEXEC));
             return file.IsOpen() ? ErrorOf(ftruncate(file.Number(), 0)) : errno;
           }}};
}

TEST_P(ModuleEscapesOfAll, EmptyingWhatMayNotBeTruncated) {
  Publish({About("", "r")}, {About("", "rw")});
  for (const auto& [name, act] : WaysToEmpty(At("secret/file"))) Refuses(name, act);
  const std::vector<std::string> writing = {"-a secret read grant", "-a secret write grant"};
  Publish(writing, {writing[0], writing[1], "-a secret truncate grant"});
  for (const auto& [name, act] : WaysToEmpty(At("secret/file"))) Refuses(name, act);
  Grants("write", Opens(At("secret/file"), O_WRONLY));
}

// A file without a name, which gets one.
int LinkNameless(const std::string& directory, const std::string& path) {
  const FileDescriptor file(open(directory.c_str(), O_TMPFILE | O_WRONLY | O_CLOEXEC, 0666));
  if (!file.IsOpen()) return errno;
  const std::string link = "/proc/self/fd/" + std::to_string(file.Number());
  return ErrorOf(linkat(AT_FDCWD, link.c_str(), AT_FDCWD, path.c_str(), AT_SYMLINK_FOLLOW));
}

TEST_P(ModuleEscapesOfAll, MakingAFileWhereNothingMayBeWritten) {
  Publish({About("", "r"), About("public", "rw")}, {About("", "rw")});
  Refuses("open", Opens(At("secret/new"), O_CREAT | O_EXCL | O_WRONLY));
  Refuses("without a name", [] { return LinkNameless(At("secret"), At("secret/nameless")); });
  Refuses("linked from where it may",
          [] { return LinkNameless(At("public"), At("secret/linked")); });
  Grants("where it may", [] { return LinkNameless(At("public"), At("public/linked")); });
}

TEST_P(ModuleEscapesOfAll, MakingAnotherKindThanIsGranted) {
  const std::vector<std::pair<std::string, Act>> kinds = {
      {"regular", [] { return ErrorOf(mknod(At("public/r").c_str(), S_IFREG | 0666, 0)); }},
      {"directory", [] { return ErrorOf(mkdir(At("public/d").c_str(), 0777)); }},
      {"symlink", [] { return ErrorOf(symlink("file", At("public/s").c_str())); }},
      {"fifo", [] { return ErrorOf(mkfifo(At("public/p").c_str(), 0666)); }}};
  for (const auto& [granted, itsAct] : kinds) {
    Publish({"-f public public " + granted + " grant"}, {About("", "rw")});
    for (const auto& [kind, act] : kinds) {
      if (kind != granted) Refuses(kind, act);
      for (const char* const name : {"r", "d", "s", "p"}) fs::remove(At("public/") + name);
    }
    Grants(granted, itsAct);
    for (const char* const name : {"r", "d", "s", "p"}) fs::remove(At("public/") + name);
  }
}

TEST_P(ModuleEscapesOfAll, RemovingFromWhatMayOnlyBeRead) {
  Publish({About("", "rw"), About("secret", "r")}, {About("", "rw")});
  Refuses("file", [] { return ErrorOf(unlink(At("secret/directory/file").c_str())); });
  Refuses("directory", [] { return ErrorOf(rmdir(At("secret/directory").c_str())); });
  Refuses("the directory itself", [] { return Rename(At("secret"), At("other")); });
}

TEST_P(ModuleEscapesOfAll, MovingOrLinkingToWhereItMayBeRead) {
  Publish({About("public", "rw"), About("secret", "w")}, {About("", "rw")});
  Refuses("link",
          [] { return ErrorOf(link(At("secret/file").c_str(), At("public/linked").c_str())); });
  Refuses("by a descriptor", [] {
    const FileDescriptor file(open(At("secret/file").c_str(), O_PATH | O_CLOEXEC));
    const std::string path = "/proc/self/fd/" + std::to_string(file.Number());
    return ErrorOf(
        linkat(AT_FDCWD, path.c_str(), AT_FDCWD, At("public/other").c_str(), AT_SYMLINK_FOLLOW));
  });
  Refuses("move", [] { return Rename(At("secret/file"), At("public/moved")); });
  Refuses("its directory", [] { return Rename(At("secret/directory"), At("public/moving")); });
  Grants("within", [] { return Rename(At("public/file"), At("public/again")); });
}

TEST_P(ModuleEscapesOfAll, ExchangingWithWhatMayBeRead) {
  Publish({About("public", "rw"), About("secret", "w")}, {About("", "rw")});
  const std::string files[] = {At("public/file"), At("secret/file")};
  Refuses("to there", [&] { return Rename(files[1], files[0], RENAME_EXCHANGE); });
  Refuses("from there", [&] { return Rename(files[0], files[1], RENAME_EXCHANGE); });
}

TEST_P(ModuleEscapesOfAll, Listing) {
  Publish({"-a secret read grant"}, {"-a secret read grant", "-a secret list grant"});
  Refuses("directory", Reads(At("secret")));
  Refuses("directory below", Reads(At("secret/directory")));
  Grants("file", Reads(At("secret/file")));
}

// Whoever watches is told names, and what becomes of files.
TEST_P(ModuleEscapesOfAll, Watching) {
  Publish({About("public", "r"), About("secret", "w")}, {About("", "r")});
  const auto watch = [](const std::string& path) {
    const FileDescriptor watcher(inotify_init1(IN_CLOEXEC));
    return ErrorOf(inotify_add_watch(watcher.Number(), path.c_str(), IN_ALL_EVENTS));
  };
  Refuses("directory", [&] { return watch(At("secret")); });
  Refuses("file", [&] { return watch(At("secret/file")); });
  Refuses("directory above", [&] { return watch(kTree); });
  Grants("directory", [&] { return watch(At("public")); });
  Grants("file", [&] { return watch(At("public/file")); });
}

// A process of the same domain has it open, in its directory.
int ReadByLinksOfChild(const char* what) {
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) return errno;
  const pid_t child = fork();
  if (child == 0) {
    const int error = ErrorOf(chdir(At("secret").c_str()));
    open(At("secret/file").c_str(), O_PATH);
    if (write(ends[1], &error, sizeof(error)) == sizeof(error)) pause();
    _exit(1);
  }
  int error = -1;
  if (read(ends[0], &error, sizeof(error)) != sizeof(error)) return 1000;
  if (error == 0) error = Open("/proc/" + std::to_string(child) + what, O_RDONLY);
  kill(child, SIGKILL);
  ResultOf(child);
  close(ends[0]);
  close(ends[1]);
  return error;
}

TEST_P(ModuleEscapesOfAll, ByTheLinksOfProcesses) {
  Publish({About("public", "r"), "-r /proc r"}, {About("", "r"), "-r /proc r"});
  Refuses("own root", Reads("/proc/self/root" + At("secret/file")));
  Refuses("own directory", [] {
    if (chdir(At("secret").c_str()) != 0) return 1000;
    return Open("/proc/thread-self/cwd/file", O_RDONLY);
  });
  Refuses("own descriptor", [] {
    const FileDescriptor file(open(At("secret/file").c_str(), O_PATH | O_CLOEXEC));
    return Open("/proc/self/fd/" + std::to_string(file.Number()), O_RDONLY);
  });
  Refuses("root of a child", [] { return ReadByLinksOfChild("/root/tmp/escapes/secret/file"); });
  Refuses("directory of a child", [] { return ReadByLinksOfChild("/cwd/file"); });
  Grants("own root", Reads("/proc/self/root" + At("public/file")));
}

// Opens a link that others turn from one file to the other all the time: 0 where the other one was
// reached.
int ReachByTurningLink(ino_t other) {
  for (int turn = 0; turn < 3000; ++turn) {
    // Where there is one processor, so that others turn it.
    if (turn % 50 == 0) sched_yield();
    const FileDescriptor file(open(At("link").c_str(), O_RDONLY | O_CLOEXEC));
    struct stat status = {};
    if (!file.IsOpen() && errno != EPERM) return errno;
    if (file.IsOpen() && fstat(file.Number(), &status) == 0 && status.st_ino == other) return 0;
  }
  return EPERM;
}

TEST_P(ModuleEscapesOfAll, ByALinkThatTurnsToAnotherFile) {
  Publish({About("public", "r")}, {About("", "r")});
  fs::create_symlink(At("public/file"), At("link"));
  struct stat status = {};
  ASSERT_EQ(stat(At("secret/file").c_str(), &status), 0);
  std::atomic<bool> isOver = false;
  std::thread turner([&isOver] {
    for (int turn = 0; !isOver; ++turn) {
      fs::create_symlink(At(turn % 2 != 0 ? "public/file" : "secret/file"), At("next"));
      fs::rename(At("next"), At("link"));
    }
  });
  Refuses("turning", [other = status.st_ino] { return ReachByTurningLink(other); });
  isOver = true;
  turner.join();
}

TEST_P(ModuleEscapesOfAll, ByTheDirectoryAbove) {
  Publish({About("public", "r")}, {About("", "r")});
  Refuses("path", Reads(At("public/directory/../../secret/file")));
  Refuses("from a directory", [] {
    const FileDescriptor directory(open(At("public").c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    return Descriptor(openat(directory.Number(), "../secret/file", O_RDONLY));
  });
  Refuses("list", Reads(At("public/..")));
}

TEST_P(ModuleEscapesOfAll, AllThatMayBeDoneAboveANarrowerPart) {
  Publish({About("", "rwx"), About("secret")}, {About("", "rwx")});
  Refuses("read", Reads(At("secret/file")));
  Refuses("write", Opens(At("secret/file"), O_WRONLY));
  Refuses("list", Reads(At("secret")));
  Refuses("make", Opens(At("secret/new"), O_CREAT | O_WRONLY));
  Refuses("execute", [] { return Execute({At("secret/true")}); });
  Publish({About("", "rwx"), About("secret", "rw")}, {About("", "rwx")});
  Refuses("execute what may be read", [] { return Execute({At("secret/true")}); });
  Refuses("map", [] { return MapToExecute(At("secret/true")); });
  Refuses("by a descriptor", [] {
    return InChild([] {
      const int file = open(At("secret/true").c_str(), O_PATH);
      const char* const words[] = {"true", nullptr};
      syscall(SYS_execveat, file, "", words, nullptr, AT_EMPTY_PATH);
      return errno;
    });
  });
  Grants("execute beside it", [] { return Execute({At("public/true")}); });
}

TEST_P(ModuleEscapesOfAll, ANarrowerPartThatIsMadeLater) {
  Publish({About("", "rw"), About("later")}, {About("", "rw")});
  Refuses("make", [] { return ErrorOf(mkdir(At("later").c_str(), 0777)); });
  fs::remove(At("later"));
  Refuses("move", [] { return Rename(At("secret"), At("later")); });
  Refuses("list", Reads(At("later")));
  Refuses("read", Reads(At("later/file")));
}

TEST_P(ModuleEscapesOfAll, ALinkInPlaceOfTheDirectoryOfARule) {
  Publish({About("public/directory", "rw")}, {About("", "rw")});
  fs::remove_all(At("public/directory"));
  fs::create_symlink(At("secret"), At("public/directory"));
  Refuses("read", Reads(At("public/directory/file")));
  Refuses("make", Opens(At("public/directory/new"), O_CREAT | O_WRONLY));
}

// ---- What was there before

// Kept by whoever was prepared.
int keptDescriptor = -1;

int KeepOpen(const Somebody& who, const std::string& name) {
  if (const int error = who.become()) return error;
  keptDescriptor = open(At(name).c_str(), O_RDONLY);
  return ErrorOf(keptDescriptor);
}

TEST_P(ModuleEscapesOfAll, ReopeningWhatWasInherited) {
  Publish({About("public", "rw"), "-r /proc r"}, {About("", "rw"), "-r /proc r"});
  const Act prepare = [this] { return KeepOpen(GetParam(), "secret/file"); };
  const Act reopen = [] { return Open("/proc/self/fd/" + std::to_string(keptDescriptor), O_RDWR); };
  EXPECT_EQ(InAfter(kDomain, prepare, reopen), EPERM);
  EXPECT_EQ(InAfter(kOther, prepare, reopen), 0);
}

TEST_P(ModuleEscapesOfAll, FromADirectoryThatWasOpenBefore) {
  Publish({About("public", "rw")}, {About("", "rw")});
  const Act prepare = [this] { return KeepOpen(GetParam(), "secret"); };
  const std::vector<std::pair<const char*, Act>> ways = {
      {"read", [] { return Descriptor(openat(keptDescriptor, "file", O_RDONLY)); }},
      {"make", [] { return Descriptor(openat(keptDescriptor, "new", O_CREAT | O_WRONLY, 0666)); }},
      {"go there",
       [] { return fchdir(keptDescriptor) == 0 ? Open("directory/file", O_RDONLY) : 1000; }},
      {"remove", [] { return ErrorOf(unlinkat(keptDescriptor, "directory/file", 0)); }}};
  for (const auto& [name, act] : ways) {
    SCOPED_TRACE(name);
    EXPECT_EQ(InAfter(kDomain, prepare, act), EPERM);
    EXPECT_EQ(InAfter(kOther, prepare, act), 0);
  }
}

// ---- Programs

TEST_P(ModuleEscapesOfAll, ByTheLoaderAndByAScript) {
  fs::copy_file("/usr/bin/env", At("secret/env"));
  fs::permissions(At("secret/env"), fs::perms::all);
  for (const char* const place : {"public", "secret"}) {
    const std::string path = At(std::string("public/by_") + place);
    std::ofstream(path) << "#!" << At(place) << "/true\n";
    fs::permissions(path, fs::perms::all);
  }
  const std::vector<std::string> libraries = {"-r /usr rx", "-r /etc r", "-r /dev rw"};
  std::vector<std::string> narrow = libraries;
  narrow.push_back(About("", "r"));
  narrow.push_back(About("public", "rx"));
  std::vector<std::string> wide = libraries;
  wide.push_back(About("", "rx"));
  Publish(narrow, wide);
  // The loader tells in its own way.
  const Act byLoader = [] {
    const int end = Execute({"/lib64/ld-linux-x86-64.so.2", At("secret/env"), "/bin/true"});
    return end == 127 ? EPERM : end;
  };
#if defined(__x86_64__)
  Refuses("loader", byLoader);
#endif
  Refuses("plainly", [] { return Execute({At("secret/env"), "/bin/true"}); });
  Refuses("script", [] { return Execute({At("public/by_secret")}); });
  Grants("its own script", [] { return Execute({At("public/by_public")}); });
}

TEST_P(ModuleEscapesOfAll, AProgramFromMemory) {
  PublishOpen({});
  RefusesInside("memory", [] {
    return InChild([] {
      const int program = static_cast<int>(syscall(SYS_memfd_create, "", 0));
      const FileDescriptor file(open(At("public/true").c_str(), O_RDONLY | O_CLOEXEC));
      std::vector<char> bytes(1 << 16);
      for (ssize_t size = 0; (size = read(file.Number(), bytes.data(), bytes.size())) > 0;) {
        if (write(program, bytes.data(), static_cast<std::size_t>(size)) != size) return 1000;
      }
      const char* const words[] = {"true", nullptr};
      syscall(SYS_execveat, program, "", words, nullptr, AT_EMPTY_PATH);
      return errno;
    });
  });
}

// ---- Sockets

sockaddr_in LocalAddress(int port) {
  sockaddr_in address = {};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<std::uint16_t>(port));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  return address;
}

constexpr int kMptcp = 262;

FileDescriptor Make(int type, int protocol = 0) {
  return FileDescriptor(socket(AF_INET, type | SOCK_CLOEXEC, protocol));
}

int Bind(const FileDescriptor& made, int port) {
  const sockaddr_in address = LocalAddress(port);
  return ErrorOf(bind(made.Number(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)));
}

// Nobody listens there.
int WithoutAnswer(int error) { return error == ECONNREFUSED || error == EINPROGRESS ? 0 : error; }

int Connect(const FileDescriptor& made, int port) {
  const sockaddr_in address = LocalAddress(port);
  return WithoutAnswer(ErrorOf(
      connect(made.Number(), reinterpret_cast<const sockaddr*>(&address), sizeof(address))));
}

int SendMessage(const FileDescriptor& made, int port, int flags) {
  sockaddr_in address = LocalAddress(port);
  char text[] = "x";
  iovec part = {text, 1};
  msghdr message = {};
  message.msg_name = &address;
  message.msg_namelen = sizeof(address);
  message.msg_iov = &part;
  message.msg_iovlen = 1;
  return WithoutAnswer(ErrorOf(sendmsg(made.Number(), &message, flags | MSG_NOSIGNAL)));
}

// A namespace of users has its own network only where it asks for one, so this is everybody's.
TEST_P(ModuleEscapesOfAll, OtherPorts) {
  PublishOpen({"-p bind_port 4001 grant", "-p connect_port 4001 grant"});
  const std::vector<std::tuple<const char*, int, int>> kinds = {
      {"TCP", SOCK_STREAM, 0}, {"MPTCP", SOCK_STREAM, kMptcp}, {"UDP", SOCK_DGRAM, 0}};
  for (const auto& [name, type, protocol] : kinds) {
    const auto make = [type = type, protocol = protocol] { return Make(type, protocol); };
    Refuses(name, [&] { return Bind(make(), 4002); });
    Refuses(name, [&] { return Bind(make(), 0); });
    Refuses(name, [&] { return Connect(make(), 4002); });
    Grants(name, [&] { return Bind(make(), 4001); });
    Grants(name, [&] { return Connect(make(), 4001); });
  }
  Refuses("listen", [] { return ErrorOf(listen(Make(SOCK_STREAM).Number(), 1)); });
  Refuses("send", [] { return SendMessage(Make(SOCK_DGRAM), 4002, 0); });
}

TEST_P(ModuleEscapesOfAll, PortsByFastOpenInThreeWays) {
  PublishOpen({"-p connect_port 4001 grant"});
  const auto sendTo = [](int port) {
    const FileDescriptor made = Make(SOCK_STREAM);
    const sockaddr_in address = LocalAddress(port);
    return WithoutAnswer(
        ErrorOf(sendto(made.Number(), "x", 1, MSG_FASTOPEN | MSG_NOSIGNAL,
                       reinterpret_cast<const sockaddr*>(&address), sizeof(address))));
  };
  const auto connectLater = [](int port) {
    const FileDescriptor made = Make(SOCK_STREAM);
    const int one = 1;
    if (setsockopt(made.Number(), IPPROTO_TCP, TCP_FASTOPEN_CONNECT, &one, sizeof(one)) != 0)
      return 1000;
    return Connect(made, port);
  };
  Refuses("sendto", [&] { return sendTo(4002); });
  Refuses("sendmsg", [] { return SendMessage(Make(SOCK_STREAM), 4002, MSG_FASTOPEN); });
  Refuses("connect", [&] { return connectLater(4002); });
  Grants("sendto", [&] { return sendTo(4001); });
  Grants("connect", [&] { return connectLater(4001); });
}

int BindOrReach(int type, const std::string& name, bool binds) {
  if (binds) return BindUnix(OpenUnix(type), name);
  return type == SOCK_DGRAM ? SendUnix(name) : ConnectUnix(type, name);
}

TEST_P(ModuleEscapesOfAll, UnixSocketsOfOthers) {
  Publish({About("public", "rw")}, {About("", "rw")});
  const std::string name("\0secpolicy-escape", 17);
  for (const int type : kUnixTypes) {
    const std::string end = "/socket" + std::to_string(type);
    const FileDescriptor hidden = ServeUnix(type, At("secret") + end);
    const FileDescriptor shown = ServeUnix(type, At("public") + end);
    const FileDescriptor named = ServeUnix(type, name);
    Refuses("by a path", [&] { return BindOrReach(type, At("secret") + end, false); });
    Grants("by a path", [&] { return BindOrReach(type, At("public") + end, false); });
    RefusesInside("by a name", [&] { return BindOrReach(type, name, false); });
  }
}

TEST_P(ModuleEscapesOfAll, UnixSocketsElsewhereOrOfAnotherKind) {
  Publish({"-u public stream grant"}, {About("", "rw")});
  for (const int type : kUnixTypes) {
    const std::string end = "/made" + std::to_string(type);
    Refuses("elsewhere", [&] { return BindOrReach(type, At("secret") + end, true); });
    if (type != SOCK_STREAM)
      Refuses("another kind", [&] { return BindOrReach(type, At("public") + end, true); });
  }
  Grants("its kind", [] { return BindOrReach(SOCK_STREAM, At("public/made"), true); });
}

// ---- Numbers that are more than they say

constexpr long kHighBit = 1L << 32;

TEST_P(ModuleEscapesOfAll, NumbersWithHighBits) {
  PublishOpen({"-p socket_family 2 grant", "-p socket_type 1 grant", "-p prctl_option 3 grant",
               "-p ioctl_request 0x5450 grant"});
  const auto make = [](long family, long type) {
    return Descriptor(syscall(SYS_socket, family, type, 0));
  };
  Refuses("family", [&] { return make(AF_UNIX | kHighBit, SOCK_STREAM); });
  Refuses("type", [&] { return make(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC | kHighBit); });
  Refuses("option",
          [] { return ErrorOf(syscall(SYS_prctl, PR_GET_TIMERSLACK | kHighBit, 0, 0, 0, 0)); });
  Refuses("request", [] {
    const FileDescriptor file(open("/dev/null", O_RDONLY));
    return ErrorOf(syscall(SYS_ioctl, file.Number(), FIOCLEX | kHighBit, 0));
  });
  Grants("family", [&] { return make(AF_INET | kHighBit, SOCK_STREAM | SOCK_CLOEXEC); });
}

// ---- Processes

TEST_P(ModuleEscapesOfAll, NewNamespaces) {
  PublishOpen({"-p clone_flags 0x10000000 revoke"});
  Refuses("unshare", [] { return InChild([] { return ErrorOf(unshare(CLONE_NEWUSER)); }); });
  Refuses("clone", [] {
    const long child = syscall(SYS_clone, CLONE_NEWUSER | SIGCHLD, 0, 0, 0, 0);
    if (child == 0) _exit(0);
    return child < 0 ? errno : ResultOf(static_cast<pid_t>(child));
  });
  Refuses("clone3", [] { return Clone(CLONE_NEWUSER); });
}

TEST_P(ModuleEscapesOfAll, SignalsToOthers) {
  PublishOpen({"-p kill_signal 28 revoke"});
  const Worker victim(GetParam().become);
  ASSERT_EQ(victim.Do(), 0);
  const pid_t other = victim.Process();
  ASSERT_EQ(setpgid(other, other), 0);
  siginfo_t told = {};
  told.si_code = SI_QUEUE;
  const std::vector<std::pair<const char*, Act>> ways = {
      {"kill", [other] { return ErrorOf(kill(other, SIGWINCH)); }},
      {"group", [other] { return ErrorOf(kill(-other, SIGWINCH)); }},
      {"tkill", [other] { return ErrorOf(syscall(SYS_tkill, other, SIGWINCH)); }},
      {"tgkill", [other] { return ErrorOf(syscall(SYS_tgkill, other, other, SIGWINCH)); }},
      {"rt_sigqueueinfo",
       [&] { return ErrorOf(syscall(SYS_rt_sigqueueinfo, other, SIGWINCH, &told)); }},
      {"rt_tgsigqueueinfo",
       [&] { return ErrorOf(syscall(SYS_rt_tgsigqueueinfo, other, other, SIGWINCH, &told)); }},
      {"pidfd_send_signal", [other] {
         const FileDescriptor process(static_cast<int>(syscall(SYS_pidfd_open, other, 0)));
         return ErrorOf(syscall(SYS_pidfd_send_signal, process.Number(), SIGWINCH, nullptr, 0));
       }}};
  for (const auto& [name, act] : ways) Refuses(name, act);
  Grants("another", [other] { return ErrorOf(kill(other, SIGCONT)); });
}

TEST_P(ModuleEscapesOfAll, TheMemoryOfOthers) {
  if (GetParam().become == kInNamespace.become) GTEST_SKIP() << "nobody outside is traced from one";
  PublishOpen({});
  static char secret[] = "secret";
  const Worker victim(GetParam().become);
  ASSERT_EQ(victim.Do(), 0);
  const pid_t other = victim.Process();
  const std::string own = "/proc/" + std::to_string(other);
  RefusesInside("trace", [other] { return ErrorOf(ptrace(PTRACE_SEIZE, other, 0, 0)); });
  RefusesInside("read", [other] {
    char bytes[sizeof(secret)];
    const iovec here = {bytes, sizeof(bytes)};
    const iovec there = {secret, sizeof(secret)};
    return ErrorOf(process_vm_readv(other, &here, 1, &there, 1, 0));
  });
  RefusesInside("file", [&own] {
    const int error = Open(own + "/mem", O_RDWR);
    return error == EACCES ? EPERM : error;
  });
  RefusesInside("descriptor", [other] {
    const FileDescriptor process(static_cast<int>(syscall(SYS_pidfd_open, other, 0)));
    return Descriptor(syscall(SYS_pidfd_getfd, process.Number(), 0, 0));
  });
}

TEST_P(ModuleEscapesOfAll, Rings) {
  PublishOpen({});
  RefusesInside("ring", [] {
    io_uring_params parameters = {};
    return Descriptor(syscall(SYS_io_uring_setup, 4, &parameters));
  });
}

TEST_P(ModuleEscapesOfAll, CapabilitiesInANamespaceOfOnesOwn) {
  PublishOpen({}, {}, 0);
  Refuses("own root",
          [] { return InChild([] { return unshare(CLONE_NEWUSER) == 0 ? ChangeRoot() : 1000; }); });
}

TEST_P(ModuleEscapesOfAll, AChildOfAChild) {
  Publish({About("public", "r")}, {About("", "r")});
  Refuses("child", [] {
    return InChild([] { return InChild([] { return Open(At("secret/file"), O_RDONLY); }); });
  });
  Refuses("thread", [] {
    int error = -1;
    std::thread([&error] { error = Open(At("secret/file"), O_RDONLY); }).join();
    return error;
  });
}

// ---- What only root could do outside, or only somebody else

class ModuleEscapesOfRoot : public ModuleEscapes {};

TEST_F(ModuleEscapesOfRoot, EnteringANamespaceOfOthers) {
  PublishOpen({});
  const Worker victim([] { return ErrorOf(unshare(CLONE_NEWUTS)); });
  ASSERT_EQ(victim.Do(), 0);
  ExpectRefusedInside(kRoot, "by a process", [other = victim.Process()] {
    const FileDescriptor process(static_cast<int>(syscall(SYS_pidfd_open, other, 0)));
    return ErrorOf(setns(process.Number(), CLONE_NEWUTS));
  });
}

TEST_F(ModuleEscapesOfRoot, TypingIntoATerminal) {
  const auto type = [](unsigned long request) {
    const FileDescriptor master(open("/dev/ptmx", O_RDWR | O_NOCTTY | O_CLOEXEC));
    int unlocked = 0;
    if (ioctl(master.Number(), TIOCSPTLCK, &unlocked) != 0) return 1000;
    const FileDescriptor terminal(ioctl(master.Number(), TIOCGPTPEER, O_RDWR | O_NOCTTY));
    if (!terminal.IsOpen()) return 1001;
    char letter = 'x';
    return ErrorOf(syscall(SYS_ioctl, terminal.Number(), request, &letter));
  };
  // To have a terminal takes these.
  const std::vector<std::string> having = {"-p ioctl_request 0x5400 0x5500 grant",
                                           "-p ioctl_request 0x40045431 grant"};
  const std::vector<std::vector<std::string>> policies = {
      {}, {"-p ioctl_request 0x5412 revoke"}, having};
  for (const std::vector<std::string>& narrow : policies) {
    PublishOpen(narrow, {having[0], having[1], "-p ioctl_request 0x5412 grant"});
    ExpectRefusedTo(kRoot, "request", [&] { return type(TIOCSTI); });
    ExpectRefusedTo(kRoot, "high bits", [&] { return type(TIOCSTI | 1UL << 32); });
  }
}

// Raises a capability for all that it executes, as a program may that was started with it.
int RaiseCapability() {
  __user_cap_header_struct own = {_LINUX_CAPABILITY_VERSION_3, 0};
  __user_cap_data_struct sets[2] = {};
  if (syscall(SYS_capget, &own, sets) != 0) return 1000;
  sets[0].inheritable |= 1U << CAP_SYS_CHROOT;
  if (syscall(SYS_capset, &own, sets) != 0) return 1001;
  return prctl(PR_CAP_AMBIENT, PR_CAP_AMBIENT_RAISE, CAP_SYS_CHROOT, 0, 0) == 0 ? 0 : 1002;
}

TEST_F(ModuleEscapesOfRoot, CapabilitiesThatAreRaised) {
  PublishOpen({}, {}, 0);
  ExpectRefusedTo(kRoot, "ambient", [] {
    const int error = RaiseCapability();
    return error != 0 ? error : ChangeRoot();
  });
}

TEST_F(ModuleEscapesOfRoot, FilesOfOthersWithoutTheCapability) {
  const std::uint64_t past = std::uint64_t{1} << CAP_DAC_OVERRIDE | std::uint64_t{1}
                                                                        << CAP_DAC_READ_SEARCH;
  PublishOpen({}, {}, kAll & ~past);
  ASSERT_EQ(chown(At("secret/file").c_str(), kUser, kUser), 0);
  ASSERT_EQ(chmod(At("secret/file").c_str(), 0600), 0);
  const Act read = Reads(At("secret/file"));
  EXPECT_EQ(In(kDomain, read), EACCES);
  EXPECT_EQ(In(kOther, read), 0);
}

// Their names are no paths, so no rule is about them, and they are used as their modes say.
TEST_F(ModuleEscapesOfRoot, QueuesAreNoWayToFiles) {
  Publish({About("public", "r")}, {About("", "r")});
  const auto make = [] {
    mq_unlink("/secpolicy-escape");
    return Descriptor(mq_open("/secpolicy-escape", O_CREAT | O_RDWR, 0600, nullptr));
  };
  EXPECT_EQ(In(kDomain, make), 0);
}

// The set-user-ID bit makes somebody root, with no more capabilities than the domain has.
TEST_F(ModuleEscapesOfRoot, CapabilitiesByProgramsOfRoot) {
  PublishOpen({}, {}, 0);
  fs::copy_file("/usr/sbin/chroot", At("public/chroot"));
  ASSERT_EQ(chmod(At("public/chroot").c_str(), 04755), 0);
  const auto run = [] { return Execute({At("public/chroot"), "/", "/bin/true"}) == 0 ? 0 : EPERM; };
  ExpectRefusedTo(kOrdinary, "program of root", run);
}

}  // namespace
}  // namespace EnforceTest
