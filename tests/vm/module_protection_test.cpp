// What no rule grants: hunts for a way by which a process that has every capability ends the
// module, changes the kernel, or acts as a process outside of its domain.

#include <fcntl.h>
#include <linux/io_uring.h>
#include <linux/perf_event.h>
#include <sched.h>
#include <sys/io.h>
#include <sys/mman.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/uio.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <bit>
#include <cstdint>
#include <cstring>
#include <string>
#include <thread>
#include <vector>

#include "host/enforce/supervise/file_descriptor.h"
#include "vm/module_fixture.h"

namespace EnforceTest {
namespace {

using Enforce::FileDescriptor;

// Newer than the headers of all machines that this is built on.
constexpr long kOpenTreeAttributes = 467;

// The call is let through, and then has nothing to do.
int AsDone(int error, int expected) { return error == expected ? 0 : error; }

int OpenFor(const std::string& path, int flags) {
  const FileDescriptor file(open(path.c_str(), flags | O_CLOEXEC));
  return file.IsOpen() ? 0 : errno;
}

int BindOver(const char* what, const char* where) {
  return ErrorOf(mount(what, where, nullptr, MS_BIND | MS_REC, nullptr));
}

// Of the process alone, so that nothing has to be undone.
int HaveOwnMounts() {
  if (unshare(CLONE_NEWNS) != 0) return errno;
  return ErrorOf(mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr));
}

class ModuleProtectionTest : public ModuleTest {
 protected:
  void SetUp() override {
    ModuleTest::SetUp();
    if (IsSkipped()) return;
    module->Publish(Granting(kAll), 2);
  }

  void ExpectRefusedAfter(const Act& prepare, const Act& doIt, const std::string& what) {
    SCOPED_TRACE(what);
    EXPECT_EQ(InAfter(kDomain, prepare, doIt), EPERM);
    EXPECT_EQ(InChild([&] { return prepare() == 0 ? doIt() : 1000; }), 0);
  }
};

// ---- What is mounted

struct NamedAct {
  const char* name;
  int (*act)();
};

int Descriptor(long result) {
  const FileDescriptor made(static_cast<int>(result));
  return made.IsOpen() ? 0 : errno;
}

int CloneTree() { return Descriptor(syscall(SYS_open_tree, AT_FDCWD, "/etc", OPEN_TREE_CLONE)); }

// Of whoever was prepared for it.
int clonedTree = -1;

int MoveMount() {
  return ErrorOf(
      syscall(SYS_move_mount, clonedTree, "", AT_FDCWD, "/mnt/over", MOVE_MOUNT_F_EMPTY_PATH));
}

int ChangeMount() {
  struct {
    std::uint64_t set, clear, propagation, users;
  } attributes = {MOUNT_ATTR_NODEV, 0, 0, 0};
  return ErrorOf(
      syscall(SYS_mount_setattr, AT_FDCWD, "/mnt/over", 0, &attributes, sizeof(attributes)));
}

// By the numbers of a program for 32 bits: of texts, and a number behind three of them or one.
int CallOf32Bits(int number, const std::vector<std::string>& texts, unsigned long last) {
  // Below what these registers hold.
  static char* const low = static_cast<char*>(
      mmap(nullptr, 4096, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS | MAP_32BIT, -1, 0));
  std::array<unsigned long, 4> words = {};
  for (std::size_t index = 0; index < texts.size(); ++index) {
    char* const text = low + index * 1024;
    words.at(index) = reinterpret_cast<unsigned long>(strcpy(text, texts[index].c_str()));
  }
  words.at(texts.size()) = last;
  int result = number;
  asm volatile("int $0x80"
               : "+a"(result)
               : "b"(words[0]), "c"(words[1]), "d"(words[2]), "S"(words[3]), "D"(0)
               : "memory");
  return result < 0 ? -result : 0;
}

constexpr NamedAct kMounts[] = {
    {"bind", [] { return BindOver("/etc", "/mnt/over"); }},
    {"over the pins", [] { return BindOver("/etc", "/sys/fs/bpf"); }},
    {"remount",
     [] {
       return ErrorOf(
           mount(nullptr, "/mnt/over", nullptr, MS_REMOUNT | MS_BIND | MS_NODEV, nullptr));
     }},
    {"propagation",
     [] { return ErrorOf(mount(nullptr, "/mnt/over", nullptr, MS_SHARED, nullptr)); }},
    {"clone", CloneTree},
    {"move", MoveMount},
    {"attributes", ChangeMount},
    {"unmount", [] { return ErrorOf(umount2("/mnt/over", MNT_DETACH)); }},
    {"open", [] { return Descriptor(syscall(SYS_fsopen, "tmpfs", 0)); }},
    {"new root", [] { return ErrorOf(syscall(SYS_pivot_root, "/mnt/over", "/mnt/over")); }},
    {"bind by a program for 32 bits",
     [] {
       return CallOf32Bits(21, {"/etc", "/mnt/over", ""}, MS_BIND);
     }},
    {"unmount by a program for 32 bits",
     [] { return CallOf32Bits(52, {"/mnt/over"}, MNT_DETACH); }},
    {"unmount by its old call", [] { return CallOf32Bits(22, {"/mnt/over"}, 0); }},
    {"new root for a program for 32 bits",
     [] {
       return CallOf32Bits(217, {"/mnt/over", "/mnt/over"}, 0);
     }},
};

// Below /mnt/over, which is there.
int HaveMounts() {
  const int error = BindOver("/mnt/over", "/mnt/over");
  clonedTree =
      static_cast<int>(syscall(SYS_open_tree, AT_FDCWD, "/mnt", OPEN_TREE_CLONE | AT_RECURSIVE));
  return error != 0 ? error : ErrorOf(clonedTree);
}

void MakeMountPoint() {
  mkdir("/mnt", 0755);
  mkdir("/mnt/over", 0755);
}

TEST_F(ModuleProtectionTest, KeepsMountsFromRoot) {
  MakeMountPoint();
  const auto prepare = [] {
    const int error = HaveOwnMounts();
    return error != 0 ? error : HaveMounts();
  };
  for (const auto& [name, act] : kMounts) ExpectRefusedAfter(prepare, act, name);
}

TEST_F(ModuleProtectionTest, KeepsMountsFromUsersInTheirNamespace) {
  MakeMountPoint();
  const auto prepare = [] {
    const int error = BecomeRootOfNamespace();
    return error != 0 ? error : HaveMounts();
  };
  for (const auto& [name, act] : kMounts) ExpectRefusedAfter(prepare, act, name);
}

TEST_F(ModuleProtectionTest, KeepsNewKindsOfMounts) {
  const auto open = [](long number) {
    return Descriptor(syscall(number, AT_FDCWD, "/etc", OPEN_TREE_CLONE, nullptr, 0));
  };
  if (InChild([&] { return open(kOpenTreeAttributes); }) == ENOSYS)
    GTEST_SKIP() << "this kernel has no open_tree_attr";
  ExpectRefused([&] { return open(kOpenTreeAttributes); });
}

TEST_F(ModuleProtectionTest, KeepsModesOfPins) {
  const std::string pins = Enforce::kModulePins;
  ExpectRefused([&] { return ErrorOf(chmod(pins.c_str(), 0700)); });
  ExpectRefused([&] { return ErrorOf(chown((pins + "/tasks").c_str(), 0, 0)); });
  EXPECT_EQ(In(kDomain, [] { return ErrorOf(chmod("/tmp", 01777)); }), 0);
}

// ---- The kernel

TEST_F(ModuleProtectionTest, KeepsTheKernelFromCode) {
  static char nothing[64];
  ExpectRefused([] {
    return AsDone(ErrorOf(syscall(SYS_init_module, nothing, sizeof(nothing), "")), ENOEXEC);
  });
  ExpectRefused([] {
    const FileDescriptor file(open("/bin/busybox", O_RDONLY | O_CLOEXEC));
    return AsDone(ErrorOf(syscall(SYS_finit_module, file.Number(), "", 0)), ENOEXEC);
  });
  // To load nothing is to unload what there is not.
  ExpectRefused([] { return ErrorOf(syscall(SYS_kexec_load, 0, 0, nullptr, 0)); });
  ExpectRefused([] {
    const FileDescriptor file(open("/bin/busybox", O_RDONLY | O_CLOEXEC));
    return AsDone(ErrorOf(syscall(SYS_kexec_file_load, file.Number(), -1, 1, "",
                                  4 /* no file for the first processes */)),
                  ENOEXEC);
  });
}

TEST_F(ModuleProtectionTest, KeepsMemoryAndPortsOfTheMachine) {
  ExpectRefused([] { return OpenFor("/dev/mem", O_RDONLY); });
  ExpectRefused([] { return OpenFor("/proc/kcore", O_RDONLY); });
#if defined(__x86_64__)
  ExpectRefused([] { return ErrorOf(ioperm(0x80, 1, 1)); });
  ExpectRefused([] { return ErrorOf(iopl(3)); });
#endif
}

TEST_F(ModuleProtectionTest, KeepsTheKernelFromCounters) {
  ExpectRefused([] {
    perf_event_attr attributes = {};
    attributes.type = PERF_TYPE_SOFTWARE;
    attributes.size = sizeof(attributes);
    attributes.config = PERF_COUNT_SW_CPU_CLOCK;
    return Descriptor(syscall(SYS_perf_event_open, &attributes, 0, -1, -1, PERF_FLAG_FD_CLOEXEC));
  });
}

TEST_F(ModuleProtectionTest, KeepsWhatTheKernelExecutes) {
  for (const char* const name : {"core_pattern", "modprobe", "poweroff_cmd"}) {
    SCOPED_TRACE(name);
    const std::string path = std::string("/proc/sys/kernel/") + name;
    ExpectRefused([&] { return OpenFor(path, O_WRONLY); });
    ExpectRefused([&] { return OpenFor(path, O_RDWR); });
    EXPECT_EQ(In(kDomain, [&] { return OpenFor(path, O_RDONLY); }), 0);
  }
  EXPECT_EQ(In(kDomain, [] { return OpenFor("/proc/sys/kernel/hostname", O_WRONLY); }), 0);
}

TEST_F(ModuleProtectionTest, KeepsWhatControlGroupsExecute) {
  MakeMountPoint();
  const auto prepare = [] {
    const int error = HaveOwnMounts();
    if (error != 0) return error;
    return ErrorOf(mount("none", "/mnt/over", "cgroup", 0, "none,name=tested"));
  };
  ExpectRefusedAfter(
      prepare, [] { return OpenFor("/mnt/over/release_agent", O_WRONLY); }, "release_agent");
  EXPECT_EQ(InAfter(kDomain, prepare, [] { return OpenFor("/mnt/over/tasks", O_WRONLY); }), 0);
}

TEST_F(ModuleProtectionTest, HasNobodyMakeKeys) {
  const auto request = [](const char* told) {
    const long key = syscall(SYS_request_key, "user", "secpolicy-test", told, 0);
    return key < 0 && errno != EPERM ? 0 : ErrorOf(key);
  };
  ExpectRefused([&] { return request("for whoever makes it"); });
  EXPECT_EQ(In(kDomain, [&] { return request(nullptr); }), 0);
}

// ---- Other processes

constexpr const char* kFilesOfProcess[] = {"/environ", "/maps",     "/cwd/.", "/root/.",
                                           "/exe",     "/fdinfo/0", "/ns/mnt"};

// Some are opened by everybody, and not read.
int OpenAndRead(const std::string& path) {
  const FileDescriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  if (!file.IsOpen()) return errno;
  char byte = 0;
  const int error = ErrorOf(read(file.Number(), &byte, 1));
  return error == EISDIR || error == EINVAL ? 0 : error;
}

int ReadMemoryFile(const std::string& path, const char* from) {
  const FileDescriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  if (!file.IsOpen()) return errno;
  char byte = 0;
  return ErrorOf(
      pread(file.Number(), &byte, 1, static_cast<off_t>(std::bit_cast<std::uintptr_t>(from))));
}

// With either of two capabilities newer kernels ask nobody who reads /environ and /maps.
TEST_F(ModuleProtectionTest, KeepsOtherProcesses) {
  constexpr std::uint64_t kReading = std::uint64_t{1} << CAP_SYS_ADMIN | std::uint64_t{1}
                                                                             << CAP_PERFMON;
  module->Publish(Granting(kAll & ~kReading), 3);
  static char secret[] = "secret";
  const FileDescriptor opened(open("/dev/null", O_RDONLY | O_CLOEXEC));
  const Worker victim([] { return 0; });
  const pid_t other = victim.Process();
  const std::string own = "/proc/" + std::to_string(other);
  std::vector<std::pair<const char*, Act>> acts = {
      {"read memory",
       [other] {
         char bytes[sizeof(secret)];
         const iovec here = {bytes, sizeof(bytes)};
         const iovec there = {secret, sizeof(secret)};
         return ErrorOf(process_vm_readv(other, &here, 1, &there, 1, 0));
       }},
      {"write memory",
       [other] {
         char bytes[] = "public";
         const iovec here = {bytes, sizeof(bytes)};
         const iovec there = {secret, sizeof(secret)};
         return ErrorOf(process_vm_writev(other, &here, 1, &there, 1, 0));
       }},
      {"trace", [other] { return ErrorOf(ptrace(PTRACE_SEIZE, other, 0, 0)); }},
      {"descriptor",
       [other, &opened] {
         const FileDescriptor process(static_cast<int>(syscall(SYS_pidfd_open, other, 0)));
         return Descriptor(syscall(SYS_pidfd_getfd, process.Number(), opened.Number(), 0));
       }},
      {"limit",
       [other] {
         rlimit limit = {RLIM_INFINITY, RLIM_INFINITY};
         return ErrorOf(prlimit(other, RLIMIT_CPU, &limit, nullptr));
       }},
  };
  std::vector<std::pair<const char*, Act>> files = {
      {"/mem", [&own] { return ReadMemoryFile(own + "/mem", secret); }}};
  for (const char* const name : kFilesOfProcess)
    files.emplace_back(name, [&own, name] { return OpenAndRead(own + name); });
  const auto expectRefused = [&] {
    for (const auto& [name, act] : acts) EXPECT_EQ(In(kDomain, act), EPERM) << name;
    for (const auto& [name, act] : files) EXPECT_NE(In(kDomain, act), 0) << name;
  };
  expectRefused();
  module->Place(other, kOther);
  expectRefused();
  acts.insert(acts.end(), files.begin(), files.end());
  for (const auto& [name, act] : acts) EXPECT_EQ(InChild(act), 0) << name;
  module->Place(other, kDomain);
  for (const auto& [name, act] : acts) EXPECT_EQ(In(kDomain, act), 0) << name;
}

// A child that asks to be traced is in another domain than who would trace it.
TEST_F(ModuleProtectionTest, IsTracedByNobodyElse) {
  int told[2];
  int goes[2];
  ASSERT_EQ(pipe2(told, O_CLOEXEC), 0);
  ASSERT_EQ(pipe2(goes, O_CLOEXEC), 0);
  const auto trace = [&] {
    return InChild([&] {
      const pid_t own = getpid();
      char word = 0;
      if (write(told[1], &own, sizeof(own)) != sizeof(own) || read(goes[0], &word, 1) != 1)
        return 99;
      return ErrorOf(ptrace(PTRACE_TRACEME, 0, 0, 0));
    });
  };
  for (const auto& [place, expected] : {std::pair{kOther, EPERM}, {kDomain, 0}}) {
    const Worker tracer(trace);
    module->Place(tracer.Process(), kDomain);
    std::atomic<int> result = -1;
    std::thread waits([&] { result = tracer.Do(); });
    pid_t child = -1;
    EXPECT_EQ(read(told[0], &child, sizeof(child)), static_cast<ssize_t>(sizeof(child)));
    module->Place(child, place);
    EXPECT_EQ(write(goes[1], "", 1), 1);
    waits.join();
    EXPECT_EQ(result, expected) << place;
  }
}

// ---- Rings

// One request at a time.
class Ring {
 public:
  explicit Ring(unsigned int flags = 0) {
    parameters.flags = flags;
    parameters.sq_thread_idle = 10;
    ring = FileDescriptor(static_cast<int>(syscall(SYS_io_uring_setup, 4, &parameters)));
    submissions = Map<char>(parameters.sq_off.array + 64, IORING_OFF_SQ_RING);
    completions = Map<char>(parameters.cq_off.cqes + 1024, IORING_OFF_CQ_RING);
    requests = Map<io_uring_sqe>(4 * sizeof(io_uring_sqe), IORING_OFF_SQES);
  }

  int Number() const { return ring.Number(); }

  // 0 or the error number.
  int Do(const io_uring_sqe& request) {
    auto* const tail = Counter(submissions, parameters.sq_off.tail);
    const unsigned int index = *tail & 3;
    requests[index] = request;
    *Counter(submissions, parameters.sq_off.array + 4 * index) = index;
    std::atomic_ref(*tail).store(*tail + 1);
    const bool isPolled = (parameters.flags & IORING_SETUP_SQPOLL) != 0;
    const unsigned int flags = IORING_ENTER_GETEVENTS | (isPolled ? IORING_ENTER_SQ_WAKEUP : 0U);
    if (syscall(SYS_io_uring_enter, ring.Number(), 1, 1, flags, nullptr, 0) < 0) return errno;
    auto* const head = Counter(completions, parameters.cq_off.head);
    const auto* const all = reinterpret_cast<io_uring_cqe*>(completions + parameters.cq_off.cqes);
    const int result = all[*head & 7].res;
    std::atomic_ref(*head).store(*head + 1);
    return result < 0 ? -result : 0;
  }

 private:
  template <class Type>
  Type* Map(std::size_t size, long long offset) {
    void* const memory = mmap(nullptr, size, PROT_READ | PROT_WRITE, MAP_SHARED | MAP_POPULATE,
                              ring.Number(), offset);
    return static_cast<Type*>(memory);
  }
  static unsigned int* Counter(char* memory, unsigned int offset) {
    return reinterpret_cast<unsigned int*>(memory + offset);
  }

  io_uring_params parameters = {};
  FileDescriptor ring;
  char* submissions = nullptr;
  char* completions = nullptr;
  io_uring_sqe* requests = nullptr;
};

// By a thread of the kernel where the ring or the request asks for one.
int SocketByRing(unsigned int ringFlags, std::uint8_t flags, int family) {
  Ring ring(ringFlags);
  io_uring_sqe request = {};
  request.opcode = IORING_OP_SOCKET;
  request.flags = flags;
  request.fd = family;
  request.off = SOCK_STREAM;
  return ring.Do(request);
}

// Rules refuse rings as a whole. What is here would keep them if they did not.
ModulePlan WithRings(const std::vector<std::string>& rules) {
  ModulePlan plan = PlanModule({Numbered(rules)}, CAP_LAST_CAP);
  for (const int call : {SYS_io_uring_setup, SYS_io_uring_enter, SYS_io_uring_register}) {
    plan[0].rules.calls[Enforce::kCallsOfMachine][call / Enforce::kCallsInWord] |=
        std::uint64_t{1} << call % Enforce::kCallsInWord;
  }
  return plan;
}

TEST_F(ModuleProtectionTest, IsInTheDomainByRingsAsWell) {
  module->Publish(WithRings({"-p socket_family 2 grant"}), 3);
  for (const unsigned int ring : {0U, 0U | IORING_SETUP_SQPOLL}) {
    for (const std::uint8_t flags : {std::uint8_t{0}, std::uint8_t{IOSQE_ASYNC}}) {
      SCOPED_TRACE(std::to_string(ring) + " " + std::to_string(flags));
      EXPECT_EQ(In(kDomain, [&] { return SocketByRing(ring, flags, AF_INET); }), 0);
      ExpectRefused([&] { return SocketByRing(ring, flags, AF_UNIX); });
    }
  }
}

TEST_F(ModuleProtectionTest, ActsByRingsAsNobodyElse) {
  module->Publish(WithRings({"-p set_uid 1001 grant", "-c cap_setuid grant"}), 3);
  ExpectRefused([] {
    Ring ring;
    const long root =
        syscall(SYS_io_uring_register, ring.Number(), IORING_REGISTER_PERSONALITY, nullptr, 0);
    if (root <= 0 || setresuid(1001, 1001, 1001) != 0) return 99;
    io_uring_sqe request = {};
    request.opcode = IORING_OP_NOP;
    if (ring.Do(request) != 0) return 98;
    request.personality = static_cast<std::uint16_t>(root);
    return ring.Do(request);
  });
}

TEST_F(ModuleProtectionTest, ChecksCommandsByRingsAsRequests) {
  constexpr unsigned int kReadByRing = 0xc0484e80;
  const auto command = [](unsigned int number) {
    Ring ring;
    const FileDescriptor device(open("/dev/ng0n1", O_RDONLY | O_CLOEXEC));
    io_uring_sqe request = {};
    request.opcode = IORING_OP_URING_CMD;
    request.fd = device.Number();
    request.cmd_op = number;
    return AsDone(ring.Do(request), EOPNOTSUPP);
  };
  module->Publish(WithRings({"-p ioctl_request 7 grant"}), 3);
  EXPECT_EQ(In(kDomain, [&] { return command(7); }), 0);
  ExpectRefused([&] { return command(kReadByRing); });
}

}  // namespace
}  // namespace EnforceTest
