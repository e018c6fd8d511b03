// Tries operations, one after the other, and prints what becomes of each: "OPERATION ok" or
// "OPERATION EACCES". An operation is NAME or NAME=WORD[,WORD]. It is one static program: a domain
// that may execute it may need nothing else.

#include <fcntl.h>
#include <linux/capability.h>
#include <linux/fs.h>
#include <linux/io_uring.h>
#include <linux/openat2.h>
#include <linux/sched.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sched.h>
#include <signal.h>
#include <sys/capability.h>
#include <sys/fsuid.h>
#include <sys/inotify.h>
#include <sys/ioctl.h>
#include <sys/mman.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/uio.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

namespace {

struct Words {
  std::string first;
  std::string second;

  const char* First() const { return first.c_str(); }
  const char* Second() const { return second.c_str(); }
  int Number() const { return std::atoi(first.c_str()); }
  unsigned long FirstBits() const { return std::strtoul(first.c_str(), nullptr, 0); }
  unsigned long SecondBits() const { return std::strtoul(second.c_str(), nullptr, 0); }
};

// Every operation returns a negative number, with errno, when it fails.
using Operation = long (*)(const Words&);

int Close(int descriptor) {
  if (descriptor < 0) return -1;
  return close(descriptor);
}

long Read(const Words& words) {
  const int file = open(words.First(), O_RDONLY);
  char byte = 0;
  const ssize_t size = file < 0 ? -1 : read(file, &byte, 1);
  return size;
}

long Truncate(const Words& words) {
  const int file = open(words.First(), O_WRONLY);
  return file < 0 ? -1 : ftruncate(file, 0);
}

// A file without a name, then linked to one.
long LinkNameless(const Words& words) {
  const int file = open(words.First(), O_TMPFILE | O_WRONLY, 0600);
  if (file < 0) return -1;
  const std::string path = "/proc/self/fd/" + std::to_string(file);
  return linkat(AT_FDCWD, path.c_str(), AT_FDCWD, words.Second(), AT_SYMLINK_FOLLOW);
}

sockaddr_un AddressOf(const Words& words) {
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, words.First(), sizeof(address.sun_path) - 1);
  return address;
}

long BindUnix(const Words& words) {
  const sockaddr_un address = AddressOf(words);
  return bind(socket(AF_UNIX, SOCK_STREAM, 0), reinterpret_cast<const sockaddr*>(&address),
              sizeof(address));
}

template <typename Action>
long WithUnix(int type, const Words& words, Action act) {
  const int socketHere = socket(AF_UNIX, type, 0);
  if (socketHere < 0) return -1;
  const sockaddr_un address = AddressOf(words);
  return act(socketHere, reinterpret_cast<const sockaddr*>(&address), socklen_t{sizeof(address)});
}

long SendByte(int socketHere, const sockaddr* address, socklen_t size) {
  return sendto(socketHere, "x", 1, 0, address, size);
}

template <typename Action>
long WithPort(const Words& words, Action act) {
  sockaddr_in address = {};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<std::uint16_t>(words.Number()));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  return act(socket(AF_INET, SOCK_STREAM, 0), reinterpret_cast<const sockaddr*>(&address),
             socklen_t{sizeof(address)});
}

// To a socket with an abstract name.
long ConnectAbstract(const Words& words) {
  sockaddr_un address = AddressOf({"-" + words.first, ""});
  address.sun_path[0] = '\0';
  const auto size =
      static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + 1 + words.first.size());
  return connect(socket(AF_UNIX, SOCK_STREAM, 0), reinterpret_cast<const sockaddr*>(&address),
                 size);
}

// ---- The internet

long SendFast(const Words& words) {
  return WithPort(words, [](int socketHere, const sockaddr* address, socklen_t size) -> long {
    return sendto(socketHere, "x", 1, MSG_FASTOPEN, address, size);
  });
}

long SendMessageFast(const Words& words) {
  return WithPort(words, [](int socketHere, const sockaddr* address, socklen_t size) -> long {
    char byte = 'x';
    iovec part = {&byte, 1};
    msghdr message = {};
    message.msg_name = const_cast<sockaddr*>(address);
    message.msg_namelen = size;
    message.msg_iov = &part;
    message.msg_iovlen = 1;
    return sendmsg(socketHere, &message, MSG_FASTOPEN);
  });
}

// With the option that lets connect wait for the first data.
long ConnectFast(const Words& words) {
  return WithPort(words, [](int socketHere, const sockaddr* address, socklen_t size) -> long {
    const int one = 1;
    const bool isConnected =
        setsockopt(socketHere, IPPROTO_TCP, TCP_FASTOPEN_CONNECT, &one, sizeof(one)) == 0 &&
        connect(socketHere, address, size) == 0;
    return isConnected ? write(socketHere, "x", 1) : -1;
  });
}

// What the child ended with is its errno.
long Wait(pid_t child) {
  int status = 0;
  if (child < 0 || waitpid(child, &status, 0) < 0) return -1;
  errno = WIFEXITED(status) ? WEXITSTATUS(status) : EINTR;
  return errno == 0 ? 0 : -1;
}

// Lets a child process execute the program, which tries the operation of the second word.
template <typename Execution>
long InChild(const Words& words, Execution execute) {
  std::fflush(stdout);
  const pid_t child = fork();
  if (child != 0) return Wait(child);
  std::array<char*, 3> arguments = {
      const_cast<char*>(words.First()),
      words.second.empty() ? nullptr : const_cast<char*>(words.Second())};
  execute(arguments.data());
  _exit(errno);
}

long Run(const Words& words) {
  return InChild(words, [&](char** arguments) { execv(words.First(), arguments); });
}

long RunBySecret(const Words& words) {
  return InChild({words.first, ""}, [&](char** arguments) {
    syscall(SYS_execve, words.First(), arguments, environ, 0, 0,
            std::strtoull(words.Second(), nullptr, 0));
  });
}

long RunByDescriptor(const Words& words) {
  const int program = open(words.First(), O_PATH);
  return InChild(words, [&](char** arguments) {
    syscall(SYS_execveat, program, "", arguments, environ, AT_EMPTY_PATH);
  });
}

long RunFromMemory(const Words& words) {
  const int source = open(words.First(), O_RDONLY);
  const int memory = static_cast<int>(syscall(SYS_memfd_create, "program", 0));
  if (source < 0 || memory < 0) return -1;
  std::array<char, 1 << 16> block{};
  ssize_t size = 0;
  while ((size = read(source, block.data(), block.size())) > 0) {
    if (write(memory, block.data(), static_cast<std::size_t>(size)) != size) return -1;
  }
  return InChild({words.first, ""}, [&](char** arguments) {
    syscall(SYS_execveat, memory, "", arguments, environ, AT_EMPTY_PATH);
  });
}

long OpenByHandleFor(const Words& words, int flags) {
  alignas(file_handle) std::array<unsigned char, sizeof(file_handle) + 128> room{};
  auto* const handle = reinterpret_cast<file_handle*>(room.data());
  handle->handle_bytes = 128;
  int mount = 0;
  if (name_to_handle_at(AT_FDCWD, words.First(), handle, &mount, 0) != 0) return -1;
  return open_by_handle_at(open(words.Second(), O_RDONLY | O_DIRECTORY), handle, flags);
}

long OpenByHandle(const Words& words) { return OpenByHandleFor(words, O_RDONLY); }

// ---- Truncation

long TruncateByOpenat2(const Words& words) {
  open_how how = {};
  how.flags = O_RDONLY | O_TRUNC;
  return Close(static_cast<int>(syscall(SYS_openat2, AT_FDCWD, words.First(), &how, sizeof(how))));
}

// As a shell does for "> /dev/stdout".
long TruncatePipe(const Words& /*words*/) {
  std::array<int, 2> ends{};
  if (pipe(ends.data()) != 0) return -1;
  const std::string path = "/proc/self/fd/" + std::to_string(ends[1]);
  return Close(open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600));
}

// ---- Mounts

int CloneTree(const char* path) {
  return open_tree(AT_FDCWD, path, OPEN_TREE_CLONE | AT_RECURSIVE);
}

long MoveMount(const Words& words) {
  const int tree = CloneTree(words.First());
  if (tree < 0) return -1;
  return move_mount(tree, "", AT_FDCWD, words.Second(), MOVE_MOUNT_F_EMPTY_PATH);
}

long SetMountAttributes(const Words& words) {
  mount_attr changes = {};
  changes.attr_clr = MOUNT_ATTR_RDONLY;
  return mount_setattr(AT_FDCWD, words.First(), 0, &changes, sizeof(changes));
}

// In a tree of mounts that is nowhere.
long ReadInClonedTree(const Words& words) {
  const int tree = CloneTree(words.First());
  return tree < 0 ? -1 : openat(tree, words.Second(), O_RDONLY);
}

// Without the mounts that lie in it.
long ReadInClonedMount(const Words& words) {
  const int mount = open_tree(AT_FDCWD, words.First(), OPEN_TREE_CLONE);
  return mount < 0 ? -1 : openat(mount, words.Second(), O_RDONLY);
}

long EnterMountsOf(const Words& words) {
  const std::string path = "/proc/" + words.first + "/ns/mnt";
  const int mounts = open(path.c_str(), O_RDONLY);
  return mounts < 0 ? -1 : setns(mounts, CLONE_NEWNS);
}

long EnterOwnMounts(const Words&) {
  return setns(open("/proc/self/ns/mnt", O_RDONLY), CLONE_NEWNS);
}

long SendBySigqueue(const Words& words) {
  siginfo_t info = {};
  info.si_code = SI_QUEUE;
  return syscall(SYS_rt_sigqueueinfo, words.Number(), 0, &info);
}

long SendByPidfd(const Words& words) {
  const int process = static_cast<int>(syscall(SYS_pidfd_open, words.Number(), 0));
  return process < 0 ? -1 : syscall(SYS_pidfd_send_signal, process, 0, nullptr, 0);
}

// Makes another process the one that is told of input, by a signal of one's choice, and gives it
// some. Whether the signal came is for the other process to say.
long SendByInput(const Words& words) {
  std::array<int, 2> sockets{};
  if (socketpair(AF_UNIX, SOCK_STREAM, 0, sockets.data()) != 0) return -1;
  if (fcntl(sockets[0], F_SETOWN, words.Number()) != 0) return -1;
  if (fcntl(sockets[0], F_SETSIG, SIGUSR1) != 0) return -1;
  if (fcntl(sockets[0], F_SETFL, O_ASYNC) != 0) return -1;
  return write(sockets[1], "x", 1);
}

// Puts the capability back into all sets.
long RaiseCapability(const Words& words) {
  __user_cap_header_struct header = {_LINUX_CAPABILITY_VERSION_3, 0};
  std::array<__user_cap_data_struct, 2> halves{};
  if (capget(&header, halves.data()) != 0) return -1;
  const auto bit = std::uint32_t{1} << words.Number() % 32;
  __user_cap_data_struct& half = halves.at(static_cast<std::size_t>(words.Number() / 32));
  half.permitted |= bit;
  half.effective |= bit;
  half.inheritable |= bit;
  return capset(&header, halves.data());
}

long HasCapability(const Words& words) {
  __user_cap_header_struct header = {_LINUX_CAPABILITY_VERSION_3, 0};
  std::array<__user_cap_data_struct, 2> halves{};
  if (capget(&header, halves.data()) != 0) return -1;
  const __user_cap_data_struct& half = halves.at(static_cast<std::size_t>(words.Number() / 32));
  errno = EPERM;
  return (half.effective >> words.Number() % 32 & 1) != 0 ? 0 : -1;
}

// 0 for the superuser's rights to files, which do not show in what getuid says.
long IsSuperuser(const Words&) {
  errno = EPERM;
  return geteuid() == 0 ? 0 : -1;
}

// Whether the bit is among the bounding capabilities.
long IsBounding(const Words& words) {
  errno = EPERM;
  return prctl(PR_CAPBSET_READ, words.Number(), 0, 0, 0) == 1 ? 0 : -1;
}

// ---- Other processes, and copies of this one

long Clone(const Words& words) {
  const long child = syscall(SYS_clone, words.FirstBits() | SIGCHLD, 0, 0, 0, 0);
  if (child == 0) _exit(0);
  return child;
}

long CloneByStruct(const Words& words) {
  clone_args how = {};
  how.flags = words.FirstBits();
  how.exit_signal = SIGCHLD;
  const long child = syscall(SYS_clone3, &how, sizeof(how));
  if (child == 0) _exit(0);
  return child;
}

long Trace(const Words& words) { return ptrace(PTRACE_SEIZE, words.Number(), nullptr, nullptr); }

// Memory that is not there may be asked for.
long ReadMemory(const Words& words) {
  char byte = 0;
  const iovec here = {&byte, 1};
  const iovec there = {reinterpret_cast<void*>(1), 1};
  const ssize_t size = process_vm_readv(words.Number(), &here, 1, &there, 1, 0);
  return size < 0 && errno == EFAULT ? 0 : size;
}

long WatchDirectory(const Words& words) {
  return inotify_add_watch(inotify_init1(IN_CLOEXEC), words.First(), IN_ALL_EVENTS);
}

// Of a file that is open for reading alone.
long SetFlags(const Words& words) {
  int flags = 0;
  const int file = open(words.First(), O_RDONLY);
  if (file < 0 || ioctl(file, FS_IOC_GETFLAGS, &flags) != 0) return -1;
  flags |= FS_NODUMP_FL;
  return ioctl(file, FS_IOC_SETFLAGS, &flags);
}

long SetUserForFiles(const Words& words) {
  setfsuid(static_cast<uid_t>(words.Number()));
  errno = EPERM;
  return setfsuid(static_cast<uid_t>(-1)) == words.Number() ? 0 : -1;
}

long MapExecutable(const Words& words) {
  const int file = open(words.First(), O_RDONLY);
  if (file < 0) return -1;
  return mmap(nullptr, 1, PROT_READ | PROT_EXEC, MAP_PRIVATE, file, 0) == MAP_FAILED ? -1 : 0;
}

// By the loader, which is told where the library of C lies.
long RunByLoader(const Words& words) {
  std::fflush(stdout);
  const pid_t child = fork();
  if (child != 0) return Wait(child);
  execl(words.First(), words.First(), "--library-path", "/t/public", words.Second(), nullptr);
  _exit(errno);
}

long SetUpRing(const Words&) {
  io_uring_params parameters = {};
  return syscall(SYS_io_uring_setup, 1, &parameters);
}

// Ten seconds at most.
long WaitFor(const Words& words) {
  for (int tries = 0; tries < 1000; ++tries) {
    if (access(words.First(), F_OK) == 0) return 0;
    usleep(10'000);
  }
  return -1;
}

long CallOldTable(const Words&) {
#ifdef __x86_64__
  long result = 20;  // getpid
  asm volatile("int $0x80" : "+a"(result) : : "memory", "r8", "r9", "r10", "r11");
  if (result >= 0) return 0;
  errno = static_cast<int>(-result);
  return -1;
#else
  return 0;
#endif
}

struct NamedOperation {
  const char* name;
  Operation act;
};

// clang-format off
const NamedOperation kOperations[] = {
    {"read", Read},
    {"write", [](const Words& w) -> long { return Close(open(w.First(), O_WRONLY)); }},
    {"open-truncate", [](const Words& w) -> long { return Close(open(w.First(), O_WRONLY | O_TRUNC)); }},
    {"read-truncate", [](const Words& w) -> long { return Close(open(w.First(), O_RDONLY | O_TRUNC)); }},
    {"ioctl-truncate", [](const Words& w) -> long { return Close(open(w.First(), O_ACCMODE | O_TRUNC)); }},
    {"openat2-truncate", TruncateByOpenat2},
    {"handle-truncate", [](const Words& w) -> long { return OpenByHandleFor(w, O_RDONLY | O_TRUNC); }},
    {"pipe-truncate", TruncatePipe},
    {"truncate", [](const Words& w) -> long { return truncate(w.First(), 0); }},
    {"ftruncate", Truncate},
    {"create", [](const Words& w) -> long { return Close(open(w.First(), O_CREAT | O_EXCL | O_WRONLY, 0600)); }},
    {"link-nameless", LinkNameless},
    {"mkdir", [](const Words& w) -> long { return mkdir(w.First(), 0700); }},
    {"symlink", [](const Words& w) -> long { return symlink("target", w.First()); }},
    {"mkfifo", [](const Words& w) -> long { return mkfifo(w.First(), 0600); }},
    {"mknod-file", [](const Words& w) -> long { return mknod(w.First(), S_IFREG | 0600, 0); }},
    {"mknod-socket", [](const Words& w) -> long { return mknod(w.First(), S_IFSOCK | 0600, 0); }},
    {"mknod-character", [](const Words& w) -> long { return mknod(w.First(), S_IFCHR | 0600, 0x103); }},
    {"mknod-block", [](const Words& w) -> long { return mknod(w.First(), S_IFBLK | 0600, 0x700); }},
    {"bind-unix", BindUnix},
    {"bind-unix-datagram", [](const Words& w) -> long { return WithUnix(SOCK_DGRAM, w, bind); }},
    {"connect-abstract", ConnectAbstract},
    {"connect-unix", [](const Words& w) -> long { return WithUnix(SOCK_STREAM, w, connect); }},
    {"send-unix", [](const Words& w) -> long { return WithUnix(SOCK_DGRAM, w, SendByte); }},
    {"socket", [](const Words& w) -> long { return syscall(SYS_socket, w.FirstBits(), w.SecondBits(), 0); }},
    {"socket-mptcp", [](const Words&) -> long { return socket(AF_INET, SOCK_STREAM, IPPROTO_MPTCP); }},
    {"connect-fast", ConnectFast},
    {"send-fast", SendFast},
    {"send-message-fast", SendMessageFast},
    {"listen-unbound", [](const Words&) -> long { return listen(socket(AF_INET, SOCK_STREAM, 0), 1); }},
    {"bind-tcp", [](const Words& w) -> long { return WithPort(w, bind); }},
    {"connect-tcp", [](const Words& w) -> long { return WithPort(w, connect); }},
    {"unlink", [](const Words& w) -> long { return unlink(w.First()); }},
    {"rmdir", [](const Words& w) -> long { return rmdir(w.First()); }},
    {"rename", [](const Words& w) -> long { return rename(w.First(), w.Second()); }},
    {"exchange", [](const Words& w) -> long { return renameat2(AT_FDCWD, w.First(), AT_FDCWD, w.Second(), RENAME_EXCHANGE); }},
    {"link", [](const Words& w) -> long { return link(w.First(), w.Second()); }},
    {"watch", WatchDirectory},
    {"set-flags", SetFlags},
    {"list", [](const Words& w) -> long { return Close(open(w.First(), O_RDONLY | O_DIRECTORY)); }},
    {"chmod", [](const Words& w) -> long { return chmod(w.First(), 0755); }},
    {"chown", [](const Words& w) -> long { return chown(w.First(), geteuid(), getegid()); }},
    {"utime", [](const Words& w) -> long { return utimensat(AT_FDCWD, w.First(), nullptr, 0); }},
    {"setxattr", [](const Words& w) -> long { return setxattr(w.First(), w.Second(), "x", 1, 0); }},
    {"run", Run},
    {"run-by-secret", RunBySecret},
    {"run-by-descriptor", RunByDescriptor},
    {"run-from-memory", RunFromMemory},
    {"open-by-handle", OpenByHandle},
    {"setns", EnterOwnMounts},
    {"unshare-user", [](const Words&) -> long { return unshare(CLONE_NEWUSER | CLONE_NEWNS); }},
    {"unmount", [](const Words& w) -> long { return umount2(w.First(), MNT_DETACH); }},
    {"remount", [](const Words& w) -> long { return mount(nullptr, w.First(), nullptr, MS_REMOUNT | MS_BIND, nullptr); }},
    {"bind-mount", [](const Words& w) -> long { return mount(w.First(), w.Second(), nullptr, MS_BIND, nullptr); }},
    {"move-mount", MoveMount},
    {"set-mount", SetMountAttributes},
    {"read-in-clone", ReadInClonedTree},
    {"read-in-one-mount", ReadInClonedMount},
    {"setns-of", EnterMountsOf},
    {"clone", Clone},
    {"clone3", CloneByStruct},
    {"unshare", [](const Words& w) -> long { return unshare(static_cast<int>(w.FirstBits())); }},
    {"map-executable", MapExecutable},
    {"run-by-loader", RunByLoader},
    {"set-up-ring", SetUpRing},
    {"trace", Trace},
    {"read-memory", ReadMemory},
    {"wait-for", WaitFor},
    {"ioctl", [](const Words& w) -> long { return syscall(SYS_ioctl, STDIN_FILENO, w.FirstBits(), "x"); }},
    {"prctl", [](const Words& w) -> long { return syscall(SYS_prctl, w.FirstBits(), w.SecondBits(), 0, 0, 0); }},
    {"getppid", [](const Words&) -> long { return syscall(SYS_getppid); }},
    {"getpgid", [](const Words&) -> long { return getpgid(0); }},
    {"setfsuid", SetUserForFiles},
    {"setgroups", [](const Words&) -> long { return syscall(SYS_setgroups, 0, nullptr); }},
    {"is-open", [](const Words& w) -> long { return fcntl(w.Number(), F_GETFD); }},
    {"kill", [](const Words& w) -> long { return kill(w.Number(), 0); }},
    {"tgkill", [](const Words& w) -> long { return tgkill(w.Number(), w.Number(), 0); }},
    {"sigqueue", SendBySigqueue},
    {"pidfd", SendByPidfd},
    {"input-signal", SendByInput},
    {"setuid", [](const Words& w) -> long { return setresuid(static_cast<uid_t>(w.Number()), static_cast<uid_t>(w.Number()), static_cast<uid_t>(w.Number())); }},
    {"raise-capability", RaiseCapability},
    {"raise-ambient", [](const Words& w) -> long { return prctl(PR_CAP_AMBIENT, PR_CAP_AMBIENT_RAISE, w.Number(), 0, 0); }},
    {"has-capability", HasCapability},
    {"has-bounding", IsBounding},
    {"is-superuser", IsSuperuser},
    {"flip-securebit", [](const Words& w) -> long { return prctl(PR_SET_SECUREBITS, prctl(PR_GET_SECUREBITS) ^ 1 << w.Number(), 0, 0, 0); }},
    {"keep-capabilities", [](const Words&) -> long { return prctl(PR_SET_KEEPCAPS, 1, 0, 0, 0); }},
    {"variable", [](const Words& w) -> long { errno = ENOENT; return std::getenv(w.First()) == nullptr ? -1 : 0; }},
    {"call", [](const Words& w) -> long { return syscall(w.Number(), 0, 0, 0, 0, 0, 0); }},
    {"call-x32", [](const Words&) -> long { return syscall(0x4000'0000 | SYS_getpid); }},
    {"call-int80", CallOldTable},
};
// clang-format on

Words Split(const std::string& operation) {
  const std::size_t equals = operation.find('=');
  if (equals == std::string::npos) return {};
  const std::string rest = operation.substr(equals + 1);
  const std::size_t comma = rest.find(',');
  if (comma == std::string::npos) return {rest, ""};
  return {rest.substr(0, comma), rest.substr(comma + 1)};
}

void Try(const std::string& operation) {
  const std::string name = operation.substr(0, operation.find('='));
  for (const NamedOperation& known : kOperations) {
    if (name != known.name) continue;
    errno = 0;
    const bool isDone = known.act(Split(operation)) >= 0;
    std::printf("%s %s\n", operation.c_str(), isDone ? "ok" : strerrorname_np(errno));
    std::fflush(stdout);
    return;
  }
  std::printf("%s is no operation\n", operation.c_str());
}

}  // namespace

int main(int argc, char** argv) {
  for (int index = 1; index < argc; ++index) Try(argv[index]);
  return 0;
}
