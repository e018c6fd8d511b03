// Rules about files on the kernel of a whole machine: hunts for a file that somebody reaches whom
// the decision refuses it, and for one that is refused to whom it is granted.

#include <fcntl.h>
#include <gtest/gtest.h>
#include <linux/capability.h>
#include <linux/fs.h>
#include <sys/mman.h>
#include <sys/mount.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/un.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <filesystem>
#include <fstream>
#include <random>
#include <string>
#include <vector>

#include "policy/decision.h"
#include "vm/module_fixture.h"

namespace EnforceTest {
namespace {

namespace fs = std::filesystem;
using Policy::FileAccess;
using Policy::InstalledDomain;

constexpr const char* kAttribute = "security.bpf.zorvan";
const Enforce::LabelNumbers kLabels = {{"red", 100}, {"blue", 101}, {"green", 102}};
const std::string kTree = "/tmp/files";

std::string At(const std::string& name) { return kTree + "/" + name; }

std::string LabelNamed(std::uint32_t number) {
  for (const auto& [name, itsNumber] : kLabels) {
    if (itsNumber == number) return name;
  }
  return {};
}

void Label(const std::string& path, const std::string& label) {
  const std::uint32_t number = kLabels.at(label);
  ASSERT_EQ(lsetxattr(path.c_str(), kAttribute, &number, sizeof(number), 0), 0) << path;
}

// As the command looks for it: the file's own, else that of the nearest directory above it.
std::string LabelOf(const std::string& path) {
  for (fs::path at = path;; at = at.parent_path()) {
    std::uint32_t number = 0;
    if (lgetxattr(at.c_str(), kAttribute, &number, sizeof(number)) == sizeof(number))
      return LabelNamed(number);
    if (at == at.root_path()) return {};
  }
}

void Write(const std::string& path, const std::string& text = "text") {
  std::ofstream(path) << text;
}

int Open(const std::string& path, int flags, mode_t mode = 0600) {
  const int descriptor = open(path.c_str(), flags | O_CLOEXEC, mode);
  const int error = ErrorOf(descriptor);
  close(descriptor);
  return error;
}

Act Reads(const std::string& path) {
  return [path] { return Open(path, O_RDONLY); };
}

Act Writes(const std::string& path) {
  return [path] { return Open(path, O_WRONLY); };
}

int MapToExecute(const std::string& path) {
  const int file = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (file < 0) return errno;
  void* const memory = mmap(nullptr, 4096, PROT_READ | PROT_EXEC, MAP_PRIVATE, file, 0);
  const int error = memory == MAP_FAILED ? errno : 0;
  close(file);
  return error;
}

class ModuleFilesTest : public ModuleTest {
 protected:
  void SetUp() override {
    ModuleTest::SetUp();
    if (IsSkipped()) return;
    module->Publish({}, 1);
    fs::remove_all(kTree);
    for (const char* directory : {"red/sub", "red/green", "plain/sub", "blue"})
      fs::create_directories(kTree + "/" + directory);
    for (const char* file : {"red/a", "red/b", "red/sub/c", "red/green/d", "plain/e", "plain/f",
                             "plain/sub/g", "blue/h", "blue/i"})
      Write(kTree + "/" + file);
    Label(kTree + "/red", "red");
    Label(kTree + "/red/b", "blue");
    Label(kTree + "/red/green", "green");
    Label(kTree + "/plain/f", "green");
    Label(kTree + "/blue", "blue");
    module->LearnLabels();
  }

  // The rules of kDomain, beside which it may all that is not about files.
  void GrantTo(const InstalledDomain& domain) {
    ModulePlan plan = PlanModule({domain}, CAP_LAST_CAP, kLabels);
    plan[0].rules.capabilities = kAll;
    module->Publish(plan, 2);
  }
  void Grant(const std::vector<std::string>& rules) { GrantTo(NumberedStrictly(rules)); }

  void ExpectGranted(const Act& act) { EXPECT_EQ(In(kDomain, act), 0); }
};

// ---- Labels

TEST_F(ModuleFilesTest, GoByTheFilesOwnLabelAndThatOfTheDirectoriesAbove) {
  Grant({"-a red read grant"});
  ExpectGranted(Reads(At("red/a")));
  ExpectGranted(Reads(At("red/sub/c")));
  for (const char* file : {"red/b", "red/green/d", "plain/e", "plain/f", "blue/h"})
    ExpectRefused(Reads(At(file)));
  ExpectRefused(Writes(At("red/a")));
}

TEST_F(ModuleFilesTest, FollowALabelAtOnce) {
  Grant({"-a green read grant"});
  const Worker worker(Reads(At("red/sub/c")));
  module->Place(worker.Process(), kDomain);
  for (int turn = 0; turn < 3; ++turn) {
    EXPECT_EQ(worker.Do(), EPERM);
    Label(At("red/sub"), "green");
    EXPECT_EQ(worker.Do(), 0);
    Label(At("red/sub/c"), "blue");
    EXPECT_EQ(worker.Do(), EPERM);
    ASSERT_EQ(removexattr(At("red/sub/c").c_str(), kAttribute), 0);
    EXPECT_EQ(worker.Do(), 0);
    ASSERT_EQ(removexattr(At("red/sub").c_str(), kAttribute), 0);
  }
}

TEST_F(ModuleFilesTest, FollowADirectoryThatIsMoved) {
  Grant({"-a red read grant"});
  const Worker worker(Reads(At("place/sub/g")));
  module->Place(worker.Process(), kDomain);
  fs::rename(At("plain"), At("place"));
  EXPECT_EQ(worker.Do(), EPERM);
  fs::rename(At("place"), At("red/place"));
  const Worker other(Reads(At("red/place/sub/g")));
  module->Place(other.Process(), kDomain);
  EXPECT_EQ(other.Do(), 0);
  fs::rename(At("red/place"), At("place"));
  EXPECT_EQ(worker.Do(), EPERM);
}

TEST_F(ModuleFilesTest, AreOfNoLabelWhereItWasNotLearned) {
  Grant({"-a red read grant"});
  ASSERT_EQ(mount("files", At("blue").c_str(), "tmpfs", 0, nullptr), 0);
  Write(At("blue/new"));
  Label(At("blue"), "red");
  ExpectRefused(Reads(At("blue/new")));
  module->LearnLabels();
  ExpectGranted(Reads(At("blue/new")));
  ASSERT_EQ(umount2(At("blue").c_str(), MNT_DETACH), 0);
}

TEST_F(ModuleFilesTest, AreNotOfTheLabelOfOneBefore) {
  Grant({"-a red read grant"});
  for (int turn = 0; turn < 50; ++turn) {
    const std::string path = At("plain/next");
    Write(path);
    ExpectRefused(Reads(path));
    Label(path, "red");
    EXPECT_EQ(In(kDomain, Reads(path)), 0);
    fs::remove(path);
  }
}

TEST_F(ModuleFilesTest, KeepTheirLabelsFromOthers) {
  Grant({kAllFiles});
  const std::uint32_t number = kLabels.at("red");
  const auto label = [&] {
    return ErrorOf(setxattr(At("plain/f").c_str(), kAttribute, &number, sizeof(number), 0));
  };
  EXPECT_EQ(In(kDomain, label), EPERM);
  EXPECT_EQ(In(kDomain, [] { return ErrorOf(removexattr(At("plain/f").c_str(), kAttribute)); }),
            EPERM);
  ExpectGranted([&] {
    return ErrorOf(setxattr(At("plain/f").c_str(), "user.other", &number, sizeof(number), 0));
  });
  EXPECT_EQ(InChild([&] {
              if (setresuid(65534, 65534, 65534) != 0) return 99;
              return label();
            }),
            EPERM);
  EXPECT_EQ(LabelOf(At("plain/f")), "green");
  EXPECT_EQ(InChild(label), 0);
}

// ---- Paths

TEST_F(ModuleFilesTest, GoByTheLongestPath) {
  Grant({"-r /tmp/files r", "-r /tmp/files/red", "-r /tmp/files/red/sub rw",
         "-r /tmp/files/plain/e", "-r /tmp/files/red/b w"});
  ExpectGranted(Reads(At("blue/h")));
  ExpectGranted(Reads(At("plain/sub/g")));
  ExpectGranted(Reads(At("red/sub/c")));
  ExpectGranted(Writes(At("red/sub/c")));
  ExpectGranted(Writes(At("red/b")));
  ExpectRefused(Reads(At("red/b")));
  ExpectRefused(Reads(At("red/a")));
  ExpectRefused(Reads(At("plain/e")));
  ExpectRefused(Writes(At("blue/h")));
  ExpectRefused(Reads("/etc/passwd"));
}

TEST_F(ModuleFilesTest, GoByTheRealPath) {
  Grant({"-r /tmp/files/blue r", "-r /proc r"});
  fs::create_symlink(At("plain/e"), At("blue/link"));
  fs::create_symlink(At("blue/h"), At("plain/link"));
  ExpectRefused(Reads(At("blue/link")));
  ExpectRefused(Reads(At("blue/../plain/e")));
  ExpectRefused(Reads("/proc/self/root" + At("plain/e")));
  ExpectGranted(Reads(At("plain/link")));
  ExpectGranted(Reads("/proc/self/root" + At("blue/h")));
  ExpectRefused([] {
    return InChild([] {
      return chroot(kTree.c_str()) == 0 && chdir("/") == 0 ? Open("/plain/e", O_RDONLY) : 99;
    });
  });
  ExpectGranted([] {
    return InChild([] {
      return chroot(kTree.c_str()) == 0 && chdir("/") == 0 ? Open("/blue/h", O_RDONLY) : 99;
    });
  });
}

TEST_F(ModuleFilesTest, GoByWhereItIsMounted) {
  Grant({"-r /tmp/files/blue r"});
  const Worker worker(Reads(At("blue/e")));
  module->Place(worker.Process(), kDomain);
  ExpectRefused(Reads(At("plain/e")));
  ASSERT_EQ(mount(At("plain").c_str(), At("blue").c_str(), nullptr, MS_BIND, nullptr), 0);
  EXPECT_EQ(worker.Do(), 0);
  ExpectRefused(Reads(At("plain/e")));
  ASSERT_EQ(mount(At("blue").c_str(), At("red").c_str(), nullptr, MS_MOVE, nullptr), 0);
  ExpectRefused(Reads(At("red/e")));
  ASSERT_EQ(umount2(At("red").c_str(), MNT_DETACH), 0);
  EXPECT_EQ(worker.Do(), ENOENT);
}

TEST_F(ModuleFilesTest, KeepTheNamesOfAll) {
  Grant({"-r /tmp/files rwx"});
  ExpectRefused([] {
    return InChild([] {
      if (unshare(CLONE_NEWNS) != 0) return 99;
      return ErrorOf(mount("/etc", At("plain").c_str(), nullptr, MS_BIND, nullptr));
    });
  });
  // A tree that is mounted nowhere would have no names.
  ExpectRefused([] {
    const auto tree = static_cast<int>(
        syscall(SYS_open_tree, AT_FDCWD, At("plain").c_str(), 1 /* OPEN_TREE_CLONE */));
    const int error = ErrorOf(tree);
    close(tree);
    return error;
  });
}

// ---- Ways around

TEST_F(ModuleFilesTest, RefuseToWriteInAnyWay) {
  Grant({"-a red read grant", "-a red list grant"});
  ExpectRefused(Writes(At("red/a")));
  ExpectRefused([] { return Open(At("red/a"), O_RDWR); });
  ExpectRefused([] { return Open(At("red/a"), O_RDONLY | O_TRUNC); });
  ExpectRefused([] { return ErrorOf(truncate(At("red/a").c_str(), 0)); });
  Grant({"-a red read grant", "-a red write grant"});
  ExpectGranted(Writes(At("red/a")));
  ExpectRefused([] { return Open(At("red/a"), O_WRONLY | O_TRUNC); });
  ExpectRefused([] { return ErrorOf(truncate(At("red/a").c_str(), 0)); });
  ExpectRefused([] {
    const int file = open(At("red/a").c_str(), O_WRONLY);
    const int error = file < 0 ? 99 : ErrorOf(ftruncate(file, 0));
    close(file);
    return error;
  });
  Grant({"-a red write grant", "-a red truncate grant"});
  ExpectGranted([] { return Open(At("red/a"), O_WRONLY | O_TRUNC); });
  ExpectGranted([] { return ErrorOf(truncate(At("red/a").c_str(), 1)); });
}

TEST_F(ModuleFilesTest, RefuseToList) {
  Grant({"-a red read grant"});
  ExpectRefused(Reads(At("red/sub")));
  Grant({"-a red list grant"});
  ExpectGranted(Reads(At("red/sub")));
  ExpectRefused(Reads(At("red/a")));
}

TEST_F(ModuleFilesTest, RefuseToMakeAnyKind) {
  struct Kind {
    const char* word;
    std::function<int(const std::string&)> make;
  };
  const std::vector<Kind> kinds = {
      {"directory", [](const std::string& path) { return ErrorOf(mkdir(path.c_str(), 0700)); }},
      {"symlink", [](const std::string& path) { return ErrorOf(symlink("x", path.c_str())); }},
      {"fifo", [](const std::string& path) { return ErrorOf(mkfifo(path.c_str(), 0600)); }},
      {"char_device",
       [](const std::string& path) { return ErrorOf(mknod(path.c_str(), S_IFCHR | 0600, 0x103)); }},
      {"block_device",
       [](const std::string& path) { return ErrorOf(mknod(path.c_str(), S_IFBLK | 0600, 0x700)); }},
      {"regular",
       [](const std::string& path) { return ErrorOf(mknod(path.c_str(), S_IFREG | 0600, 0)); }}};
  const std::string path = At("red/new");
  for (const Kind& kind : kinds) {
    const auto make = [&] {
      const int error = kind.make(path);
      if (error == 0) ErrorOf(remove(path.c_str()));
      return error;
    };
    Grant({"-a red remove grant"});
    EXPECT_EQ(In(kDomain, make), EPERM) << kind.word;
    EXPECT_EQ(InChild(make), 0) << kind.word;
    fs::remove(path);
    Grant({std::string("-f red red ") + kind.word + " grant", "-a red remove grant"});
    EXPECT_EQ(In(kDomain, make), 0) << kind.word;
    fs::remove(path);
    const bool isDevice = std::string(kind.word).ends_with("device");
    Grant({"-r /tmp/files/red w"});
    EXPECT_EQ(In(kDomain, make), isDevice ? EPERM : 0) << kind.word;
    fs::remove(path);
    Grant({std::string("-f red red ") + kind.word + " grant", "-r /tmp/files/red r"});
    EXPECT_EQ(In(kDomain, make), EPERM) << kind.word;
    fs::remove(path);
  }
}

TEST_F(ModuleFilesTest, RefuseNamelessFilesAndTheirNames) {
  const auto make = [] {
    const int file = open(At("red").c_str(), O_TMPFILE | O_WRONLY, 0600);
    if (file < 0) return errno;
    const std::string link = "/proc/self/fd/" + std::to_string(file);
    const int error =
        ErrorOf(linkat(AT_FDCWD, link.c_str(), AT_FDCWD, At("red/new").c_str(), AT_SYMLINK_FOLLOW));
    close(file);
    return error;
  };
  Grant({"-a red write grant"});
  ExpectRefused(make);
  fs::remove(At("red/new"));
  Grant({"-a red write grant", "-f red red regular grant"});
  ExpectGranted(make);
}

TEST_F(ModuleFilesTest, RefuseToRemove) {
  Grant({"-a red write grant"});
  EXPECT_EQ(In(kDomain, [] { return ErrorOf(unlink(At("red/a").c_str())); }), EPERM);
  EXPECT_EQ(In(kDomain, [] { return ErrorOf(rmdir(At("red/sub").c_str())); }), EPERM);
  fs::remove(At("red/sub/c"));
  Grant({"-a red remove grant"});
  ExpectGranted([] { return ErrorOf(unlink(At("red/a").c_str())); });
  ExpectGranted([] { return ErrorOf(rmdir(At("red/sub").c_str())); });
  EXPECT_EQ(In(kDomain, [] { return ErrorOf(unlink(At("red/b").c_str())); }), EPERM);
}

int Rename(const std::string& from, const std::string& to, unsigned int flags = 0) {
  return ErrorOf(syscall(SYS_renameat2, AT_FDCWD, from.c_str(), AT_FDCWD, to.c_str(), flags));
}

TEST_F(ModuleFilesTest, RefuseToMoveAFileToWhereMoreIsAllowed) {
  const std::vector<std::string> rules = {
      "-a red remove grant",         "-a red read grant",          "-a blue remove grant",
      "-f red red regular grant",    "-f red red directory grant", "-f blue blue regular grant",
      "-f blue blue directory grant"};
  Grant(rules);
  EXPECT_EQ(In(kDomain, Reads(At("blue/h"))), EPERM);
  EXPECT_EQ(In(kDomain, [] { return Rename(At("blue/h"), At("red/h")); }), EPERM);
  EXPECT_EQ(In(kDomain, [] { return Rename(At("blue/h"), At("red/a"), RENAME_EXCHANGE); }), EPERM);
  EXPECT_EQ(In(kDomain, [] { return Rename(At("red/a"), At("blue/h"), RENAME_EXCHANGE); }), EPERM);
  EXPECT_EQ(In(kDomain, [] { return ErrorOf(link(At("blue/h").c_str(), At("red/h").c_str())); }),
            EPERM);
  // The file that is blue itself stays so.
  ExpectGranted([] { return Rename(At("red/b"), At("red/b2")); });
  EXPECT_EQ(In(kDomain, Reads(At("red/b2"))), EPERM);
  ExpectGranted([] { return Rename(At("red/a"), At("blue/a")); });
  ExpectGranted([] { return ErrorOf(link(At("blue/i").c_str(), At("blue/j").c_str())); });
}

TEST_F(ModuleFilesTest, RefuseToMoveDirectoriesOnTheWayToARule) {
  Grant({"-r /tmp/files rw", "-r /tmp/files/red/sub/c"});
  EXPECT_EQ(In(kDomain, [] { return Rename(At("red"), At("other")); }), EPERM);
  EXPECT_EQ(In(kDomain, [] { return Rename(At("red/sub"), At("other")); }), EPERM);
  EXPECT_EQ(In(kDomain, [] { return Rename(At("red/sub/c"), At("other")); }), EPERM);
  EXPECT_EQ(In(kDomain, [] { return ErrorOf(link(At("red/sub/c").c_str(), At("other").c_str())); }),
            EPERM);
  ExpectGranted([] { return Rename(At("plain"), At("other")); });
}

TEST_F(ModuleFilesTest, RefuseToExecute) {
  fs::copy_file("/bin/busybox", At("red/true"));
  const auto run = [] {
    return InChild([] {
      execl(At("red/true").c_str(), "true", nullptr);
      return errno;
    });
  };
  const std::vector<std::string> libraries = {"-r /usr rx", "-r /etc r", "-r /dev rw"};
  const auto with = [&](const std::string& rule) {
    std::vector<std::string> rules = libraries;
    rules.emplace_back("-a red read grant");
    rules.push_back(rule);
    return rules;
  };
  Grant(with("-a red write grant"));
  ExpectRefused(run);
  ExpectRefused([] { return MapToExecute(At("red/a")); });
  ExpectRefused([] {
    const int file = open(At("red/a").c_str(), O_RDONLY);
    void* const memory = mmap(nullptr, 4096, PROT_READ, MAP_PRIVATE, file, 0);
    close(file);
    return memory == MAP_FAILED ? 99 : ErrorOf(mprotect(memory, 4096, PROT_READ | PROT_EXEC));
  });
  // Memory of its own has no file.
  ExpectGranted([] {
    void* const memory =
        mmap(nullptr, 4096, PROT_READ | PROT_EXEC, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    return memory == MAP_FAILED ? errno : ErrorOf(mprotect(memory, 4096, PROT_READ));
  });
  Grant(with("-a red execute grant"));
  ExpectGranted(run);
  ExpectGranted([] { return MapToExecute(At("red/a")); });
}

TEST_F(ModuleFilesTest, RefuseHandlesAndWhatIsHandedOver) {
  Grant({"-a red read grant"});
  const auto byHandle = [](const std::string& path) {
    alignas(file_handle) std::array<char, sizeof(file_handle) + MAX_HANDLE_SZ> place = {};
    auto* const handle = reinterpret_cast<file_handle*>(place.data());
    handle->handle_bytes = MAX_HANDLE_SZ;
    int mount = 0;
    if (name_to_handle_at(AT_FDCWD, path.c_str(), handle, &mount, 0) != 0) return 99;
    const int root = open("/tmp/files", O_PATH);
    const int near = open(At("red/a").c_str(), O_RDONLY);
    const int error = ErrorOf(open_by_handle_at(near < 0 ? root : near, handle, O_RDONLY));
    return error;
  };
  ExpectRefused([&] { return byHandle(At("blue/h")); });
  ExpectGranted([&] { return byHandle(At("red/a")); });
  const auto receive = [](const std::string& path) {
    int ends[2];
    if (socketpair(AF_UNIX, SOCK_STREAM, 0, ends) != 0) return 99;
    char data = 0;
    iovec part = {&data, 1};
    alignas(cmsghdr) std::array<char, CMSG_SPACE(sizeof(int))> control = {};
    msghdr message = {};
    message.msg_iov = &part;
    message.msg_iovlen = 1;
    message.msg_control = control.data();
    message.msg_controllen = control.size();
    const pid_t child = fork();
    if (child == 0) {
      if (recvmsg(ends[1], &message, 0) != 1) _exit(98);
      const cmsghdr* const header = CMSG_FIRSTHDR(&message);
      _exit(header != nullptr && header->cmsg_len == CMSG_LEN(sizeof(int)) ? 0 : EPERM);
    }
    Enforce::Module::FindRunning()->Place(child, kDomain);
    const int file = open(path.c_str(), O_RDONLY);
    cmsghdr* const header = CMSG_FIRSTHDR(&message);
    header->cmsg_level = SOL_SOCKET;
    header->cmsg_type = SCM_RIGHTS;
    header->cmsg_len = CMSG_LEN(sizeof(int));
    std::copy_n(reinterpret_cast<const char*>(&file), sizeof(file),
                reinterpret_cast<char*>(CMSG_DATA(header)));
    if (sendmsg(ends[0], &message, 0) != 1) return 97;
    close(file);
    return ResultOf(child);
  };
  EXPECT_EQ(receive(At("blue/h")), EPERM);
  EXPECT_EQ(receive(At("red/a")), 0);
}

TEST_F(ModuleFilesTest, RefuseToWriteBelowFileSystems) {
  Grant({kAllFiles});
  ExpectRefused(Writes("/dev/nvme0n1"));
  ExpectGranted(Reads("/dev/nvme0n1"));
  ExpectGranted(Writes("/dev/null"));
}

// ---- New files

TEST_F(ModuleFilesTest, GiveNewFilesTheLabelOfTheRule) {
  Grant({"-f red blue regular grant", "-f red green directory grant", "-a red write grant",
         "-a blue write grant", "-a blue read grant"});
  ExpectGranted([] { return Open(At("red/new"), O_WRONLY | O_CREAT | O_EXCL); });
  ExpectGranted(Reads(At("red/new")));
  ExpectRefused(Reads(At("red/a")));
  ExpectGranted([] { return ErrorOf(mkdir(At("red/newer").c_str(), 0700)); });
  Write(At("red/newer/file"));
  ExpectRefused(Reads(At("red/newer/file")));
  Grant({"-a green read grant"});
  ExpectGranted(Reads(At("red/newer/file")));
  ExpectRefused(Reads(At("red/new")));
}

TEST_F(ModuleFilesTest, GiveNamelessFilesTheLabelOfTheRule) {
  Grant({"-f red blue regular grant", "-a blue write grant", "-a blue read grant"});
  ExpectGranted([] {
    const int file = open(At("red").c_str(), O_TMPFILE | O_RDWR, 0600);
    if (file < 0) return errno;
    const std::string link = "/proc/self/fd/" + std::to_string(file);
    const int error = Open(link, O_RDONLY);
    close(file);
    return error;
  });
}

TEST_F(ModuleFilesTest, GiveNewFilesTheLabelForGood) {
  Grant({"-f red blue regular grant", "-f red green directory grant", "-f red green fifo grant"});
  ExpectGranted([] { return ErrorOf(mknod(At("red/new").c_str(), S_IFREG | 0600, 0)); });
  ExpectGranted([] { return ErrorOf(mkdir(At("red/newer").c_str(), 0700)); });
  ExpectGranted([] { return ErrorOf(mkfifo(At("red/fifo").c_str(), 0700)); });
  ExpectGranted([] { return ErrorOf(mknod(At("red/gone").c_str(), S_IFREG | 0600, 0)); });
  fs::remove(At("red/gone"));
  EXPECT_EQ(LabelOf(At("red/new")), "red");
  EXPECT_EQ(module->WriteLabels(), 0U);
  EXPECT_EQ(LabelOf(At("red/new")), "blue");
  EXPECT_EQ(LabelOf(At("red/newer")), "green");
  EXPECT_EQ(LabelOf(At("red/fifo")), "green");
  EXPECT_EQ(module->WriteLabels(), 0U);
}

// ---- What the decision says, held against the kernel

bool May(const InstalledDomain& domain, FileAccess access, const std::string& path,
         const std::string& label) {
  return Policy::Decide(Policy::FileQuestion{access, path, label, false}, domain).IsAllowed();
}

bool May(const InstalledDomain& domain, FileAccess access, const std::string& path) {
  return May(domain, access, path, LabelOf(path));
}

bool MayMake(const InstalledDomain& domain, const std::string& kind, const std::string& path) {
  return Policy::Decide(Policy::CreationQuestion{Policy::RuleKind::kFileCreation, kind, path,
                                                 LabelOf(fs::path(path).parent_path()), false},
                        domain)
      .IsAllowed();
}

struct FileTry {
  std::string what;
  std::function<bool()> isGranted;  // by what is labelled then
  Act act;
};

std::string SomeFileRule(std::mt19937& chance) {
  const auto one = [&chance](const std::vector<std::string>& words) {
    return words[chance() % words.size()];
  };
  const std::string label = one({"red", "blue", "green"});
  const std::string end = one({" grant", " grant", " grant", " revoke"});
  switch (chance() % 4) {
    case 0:
    case 1:
      return "-a " + label + " " +
             one({"read", "write", "list", "remove", "truncate", "execute", "read", "write"}) + end;
    case 2:
      return "-f " + label + " " + one({"red", "blue", "green"}) + " " +
             one({"regular", "directory", "symlink", "fifo", "regular"}) + end;
    default:
      return "-r /tmp/files" +
             one({"", "/red", "/red/sub", "/red/sub/c", "/red/b", "/plain", "/plain/e",
                  "/plain/sub", "/blue", "/blue/h", "/red/new", "/plain/new", "/bound",
                  "/bound/sub"}) +
             " " + one({"r", "w", "rw", "rwx", "rx", "x", "r"});
  }
}

// Of a path that has more than one rule the first one stays.
std::vector<std::string> SomeFileRules(std::mt19937& chance) {
  std::vector<std::string> rules;
  for (auto count = chance() % 14; count > 0; --count) {
    const std::string rule = SomeFileRule(chance);
    const std::string subject = rule.substr(0, rule.rfind(' '));
    if (std::ranges::none_of(rules, [&](const std::string& other) {
          return other.substr(0, other.rfind(' ')) == subject;
        }))
      rules.push_back(rule);
  }
  return rules;
}

std::vector<FileTry> FileTries(const InstalledDomain& domain) {
  std::vector<FileTry> tries;
  for (const char* name : {"red/a", "red/b", "red/sub/c", "red/green/d", "plain/e", "plain/f",
                           "plain/sub/g", "blue/h", "bound/sub/g", "bound/e"}) {
    const std::string path = At(name);
    if (!fs::exists(path)) continue;
    tries.push_back({"read " + path,
                     [&domain, path] { return May(domain, FileAccess::kRead, path); },
                     Reads(path)});
    tries.push_back({"write " + path,
                     [&domain, path] { return May(domain, FileAccess::kWrite, path); },
                     Writes(path)});
    tries.push_back({"truncate " + path,
                     [&domain, path] { return May(domain, FileAccess::kTruncate, path); },
                     [path] { return ErrorOf(truncate(path.c_str(), 3)); }});
    tries.push_back({"map " + path,
                     [&domain, path] {
                       return May(domain, FileAccess::kRead, path) &&
                              May(domain, FileAccess::kExecute, path);
                     },
                     [path] { return MapToExecute(path); }});
    tries.push_back({"remove " + path,
                     [&domain, path] { return May(domain, FileAccess::kRemove, path); },
                     [path] { return ErrorOf(unlink(path.c_str())); }});
  }
  for (const char* name :
       {"red", "red/sub", "red/green", "plain", "plain/sub", "blue", "bound/sub"}) {
    const std::string path = At(name);
    if (!fs::exists(path)) continue;
    const std::string made = path + "/new";
    tries.push_back({"list " + path,
                     [&domain, path] { return May(domain, FileAccess::kList, path); },
                     Reads(path)});
    tries.push_back({"mkdir " + made,
                     [&domain, made] { return MayMake(domain, "directory", made); },
                     [made] { return ErrorOf(mkdir(made.c_str(), 0700)); }});
    tries.push_back({"mkfifo " + made, [&domain, made] { return MayMake(domain, "fifo", made); },
                     [made] { return ErrorOf(mkfifo(made.c_str(), 0700)); }});
    tries.push_back({"symlink " + made,
                     [&domain, made] { return MayMake(domain, "symlink", made); },
                     [made] { return ErrorOf(symlink("x", made.c_str())); }});
    tries.push_back({"mknod " + made, [&domain, made] { return MayMake(domain, "regular", made); },
                     [made] { return ErrorOf(mknod(made.c_str(), S_IFREG | 0600, 0)); }});
    tries.push_back({"mknod of a device " + made,
                     [&domain, made] { return MayMake(domain, "char_device", made); },
                     [made] { return ErrorOf(mknod(made.c_str(), S_IFCHR | 0600, 0x103)); }});
  }
  return tries;
}

// What somebody who is in no domain does meanwhile.
void ChangeSomething(std::mt19937& chance) {
  std::error_code ignored;
  const std::array labels = {"red", "blue", "green"};
  switch (chance() % 6) {
    case 0:
      fs::rename(At("plain/sub"), At("red/moved"), ignored);
      fs::rename(At("red/sub"), At("plain/sub"), ignored);
      fs::rename(At("red/moved"), At("red/sub"), ignored);
      break;
    case 1:
      Label(At("red/sub"), labels[chance() % labels.size()]);
      break;
    case 2:
      removexattr(At("red/b").c_str(), kAttribute);
      break;
    case 3:
      fs::create_hard_link(At("blue/i"), At("red/sub/c"), ignored);
      break;
    case 4:
      Label(At("plain/e"), labels[chance() % labels.size()]);
      break;
    default:
      Rename(At("red/green"), At("blue"), RENAME_EXCHANGE);
  }
}

void Restore() {
  for (const char* directory : {"red/sub", "red/green", "plain/sub", "blue"}) {
    const std::string made = At(directory) + "/new";
    std::error_code ignored;
    fs::remove(made, ignored);
    fs::remove(At(directory) + "/../new", ignored);
  }
  for (const char* file : {"red/a", "red/b", "red/sub/c", "red/green/d", "plain/e", "plain/f",
                           "plain/sub/g", "blue/h"}) {
    if (!fs::exists(At(file))) Write(At(file));
  }
}

TEST_F(ModuleFilesTest, AreRefusedToWhomTheDecisionRefusesThem) {
  std::mt19937 chance(7);  // NOLINT(cert-msc32-c, cert-msc51-cpp): the same domains each time
  fs::create_directory(At("bound"));
  int granted = 0;
  int refused = 0;
  for (int round = 0; round < 12; ++round) {
    ASSERT_EQ(mount(At("plain").c_str(), At("bound").c_str(), nullptr, MS_BIND, nullptr), 0);
    const std::vector<std::string> rules = SomeFileRules(chance);
    const InstalledDomain domain = NumberedStrictly(rules);
    GrantTo(domain);
    for (const FileTry& some : FileTries(domain)) {
      const bool isGranted = some.isGranted();
      EXPECT_EQ(In(kDomain, some.act), isGranted ? 0 : EPERM)
          << some.what << " in round " << round << " with\n"
          << testing::PrintToString(rules);
      Restore();
      (isGranted ? granted : refused)++;
    }
    ASSERT_EQ(umount2(At("bound").c_str(), MNT_DETACH), 0);
    ChangeSomething(chance);
    Restore();
  }
  EXPECT_GT(granted, 80);
  EXPECT_GT(refused, 300);
}

}  // namespace
}  // namespace EnforceTest
