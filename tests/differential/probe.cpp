// Tries what it is told, one after the other, and prints for each the number of the error, 0 where
// it went well. It is linked statically and starts with next to no system calls, so that a domain
// needs few rules to run it.
//
//   probe ACTION WORD... [, ACTION WORD...]...

#include <fcntl.h>
#include <linux/capability.h>
#include <netinet/in.h>
#include <sched.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/sysmacros.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string_view>

namespace {

int ErrorOf(long result) { return result < 0 ? errno : 0; }

int ErrorOfOpen(const char* path, int flags) {
  const int file = open(path, flags | O_CLOEXEC);
  const int error = ErrorOf(file);
  if (file >= 0) close(file);
  return error;
}

// Runs `action` in a child, whose end tells what came of it.
template <class Action>
int InChild(Action action) {
  const pid_t child = fork();
  if (child < 0) return errno;
  if (child == 0) _exit(action());
  int status = 0;
  while (waitpid(child, &status, 0) < 0) {
    if (errno != EINTR) return errno;
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : 255;
}

// ---- Files

int Read(const char* path) { return ErrorOfOpen(path, O_RDONLY | O_NONBLOCK); }

int Write(const char* path) { return ErrorOfOpen(path, O_WRONLY); }

int List(const char* path) { return ErrorOfOpen(path, O_RDONLY | O_DIRECTORY); }

int Empty(const char* path) { return ErrorOfOpen(path, O_RDONLY | O_TRUNC); }

int Truncate(const char* path) { return ErrorOf(truncate(path, 0)); }

int Execute(const char* path) {
  constexpr int kWell = 7;  // of the program that lies there
  const int end = InChild([path] {
    char* const arguments[] = {const_cast<char*>(path), nullptr};
    char* const environment[] = {nullptr};
    execve(path, arguments, environment);
    return errno == kWell ? 255 : errno;
  });
  return end == kWell ? 0 : end;
}

int Remove(const char* path) {
  const int error = ErrorOf(unlinkat(AT_FDCWD, path, 0));
  return error == EISDIR ? ErrorOf(unlinkat(AT_FDCWD, path, AT_REMOVEDIR)) : error;
}

int Make(const char* path, std::string_view kind) {
  // Opening it would take the right to write to it as well.
  if (kind == "regular") return ErrorOf(mknodat(AT_FDCWD, path, S_IFREG | 0644, 0));
  if (kind == "directory") return ErrorOf(mkdirat(AT_FDCWD, path, 0755));
  if (kind == "symlink") return ErrorOf(symlinkat("target", AT_FDCWD, path));
  if (kind == "fifo") return ErrorOf(mknodat(AT_FDCWD, path, S_IFIFO | 0644, 0));
  const mode_t type = kind == "char_device" ? S_IFCHR : S_IFBLK;
  return ErrorOf(mknodat(AT_FDCWD, path, type | 0644, makedev(1, 3)));
}

int MakeSocket(const char* path, std::string_view kind) {
  const int type = kind == "stream" ? SOCK_STREAM : kind == "dgram" ? SOCK_DGRAM : SOCK_SEQPACKET;
  const int made = socket(AF_UNIX, type, 0);
  if (made < 0) return errno;
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, path, sizeof address.sun_path - 1);
  const int error =
      ErrorOf(bind(made, reinterpret_cast<const sockaddr*>(&address), sizeof address));
  close(made);
  return error;
}

// ---- The rest

struct NumberedCall {
  std::string_view name;
  long number;
};

constexpr NumberedCall kCalls[] = {{"accept4", SYS_accept4},
                                   {"capget", SYS_capget},
                                   {"close", SYS_close},
                                   {"dup", SYS_dup},
                                   {"dup2", SYS_dup2},
                                   {"epoll_ctl", SYS_epoll_ctl},
                                   {"fchdir", SYS_fchdir},
                                   {"fcntl", SYS_fcntl},
                                   {"fdatasync", SYS_fdatasync},
                                   {"flock", SYS_flock},
                                   {"fstat", SYS_fstat},
                                   {"fsync", SYS_fsync},
                                   {"ftruncate", SYS_ftruncate},
                                   {"getcwd", SYS_getcwd},
                                   {"getpeername", SYS_getpeername},
                                   {"getpgid", SYS_getpgid},
                                   {"getpriority", SYS_getpriority},
                                   {"getrusage", SYS_getrusage},
                                   {"getsockname", SYS_getsockname},
                                   {"listen", SYS_listen},
                                   {"lseek", SYS_lseek},
                                   {"munmap", SYS_munmap},
                                   {"newfstatat", SYS_newfstatat},
                                   {"pipe2", SYS_pipe2},
                                   {"read", SYS_read},
                                   {"readv", SYS_readv},
                                   {"sched_getaffinity", SYS_sched_getaffinity},
                                   {"shutdown", SYS_shutdown},
                                   {"statx", SYS_statx},
                                   {"sysinfo", SYS_sysinfo},
                                   {"timer_settime", SYS_timer_settime},
                                   {"times", SYS_times},
                                   {"uname", SYS_uname},
                                   {"wait4", SYS_wait4},
                                   {"write", SYS_write}};

long NumberOf(std::string_view name) {
  for (const NumberedCall& call : kCalls) {
    if (call.name == name) return call.number;
  }
  _exit(3);
}

// What no call can mean, so that one that is let through fails otherwise than one that is not.
int Call(std::string_view name) {
  return ErrorOf(syscall(NumberOf(name), -1L, -1L, -1L, -1L, -1L, -1L));
}

int Use(const char* capability) {
  __user_cap_header_struct header{_LINUX_CAPABILITY_VERSION_3, 0};
  __user_cap_data_struct data[2] = {};
  if (syscall(SYS_capget, &header, data) != 0) return errno;
  const int number = std::atoi(capability);
  return (data[number / 32].effective >> (number % 32) & 1) != 0 ? 0 : EPERM;
}

int UsePort(unsigned long port, bool binds) {
  const int made = socket(AF_INET, SOCK_STREAM, 0);
  if (made < 0) return errno;
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<std::uint16_t>(port));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  const auto* const where = reinterpret_cast<const sockaddr*>(&address);
  const int one = 1;
  setsockopt(made, SOL_SOCKET, SO_REUSEADDR, &one, sizeof one);
  const int error =
      ErrorOf(binds ? bind(made, where, sizeof address) : connect(made, where, sizeof address));
  close(made);
  return error;
}

int Clone(unsigned long flags) {
  const long child = syscall(SYS_clone, flags | SIGCHLD, 0, 0, 0, 0);
  if (child < 0) return errno;
  if (child == 0) syscall(SYS_exit, 0);
  return 0;
}

int Pass(std::string_view check, const char* word) {
  const unsigned long number = std::strtoul(word, nullptr, 0);
  if (check == "socket_family") return ErrorOf(socket(static_cast<int>(number), SOCK_DGRAM, 0));
  if (check == "socket_type") return ErrorOf(socket(AF_UNIX, static_cast<int>(number), 0));
  if (check == "bind_port") return UsePort(number, true);
  if (check == "connect_port") return UsePort(number, false);
  if (check == "ioctl_request") return ErrorOf(syscall(SYS_ioctl, -1, number, 0));
  if (check == "prctl_option") return ErrorOf(syscall(SYS_prctl, number, -1L, -1L, -1L, -1L));
  if (check == "clone_flags") return Clone(number);
  if (check == "kill_signal") return ErrorOf(kill(getpid(), static_cast<int>(number)));
  if (check == "set_uid") return InChild([=] { return ErrorOf(syscall(SYS_setuid, number)); });
  return InChild([=] { return ErrorOf(syscall(SYS_setgid, number)); });
}

int Try(char** words) {
  const std::string_view action = words[0];
  if (action == "read") return Read(words[1]);
  if (action == "write") return Write(words[1]);
  if (action == "list") return List(words[1]);
  if (action == "empty") return Empty(words[1]);
  if (action == "truncate") return Truncate(words[1]);
  if (action == "exec") return Execute(words[1]);
  if (action == "remove") return Remove(words[1]);
  if (action == "make") return Make(words[1], words[2]);
  if (action == "make-socket") return MakeSocket(words[1], words[2]);
  if (action == "call") return Call(words[1]);
  if (action == "use") return Use(words[1]);
  if (action == "pass") return Pass(words[1], words[2]);
  return 254;
}

}  // namespace

int main(int, char** arguments) {
  char** word = arguments + 1;
  while (*word != nullptr) {
    char text[8];
    const int size = std::snprintf(text, sizeof text, "%d\n", Try(word));
    if (write(STDOUT_FILENO, text, static_cast<std::size_t>(size)) != size) return 1;
    while (*word != nullptr && std::strcmp(*word, ",") != 0) ++word;
    if (*word != nullptr) ++word;
  }
  return 0;
}
