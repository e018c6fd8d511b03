#include "policy/call_set.h"

#include <algorithm>
#include <array>

namespace Policy {
namespace {

using std::string_view_literals::operator""sv;

constexpr std::array kAttributes = {
    "chmod"sv,     "chown"sv,        "fchmod"sv,    "fchmodat"sv,  "fchmodat2"sv, "fchown"sv,
    "fchownat"sv,  "fremovexattr"sv, "fsetxattr"sv, "futimesat"sv, "lchown"sv,    "lremovexattr"sv,
    "lsetxattr"sv, "removexattr"sv,  "setxattr"sv,  "utime"sv,     "utimensat"sv, "utimes"sv};
constexpr std::array kClock = {"alarm"sv,           "clock_getres"sv,    "clock_gettime"sv,
                               "clock_nanosleep"sv, "getitimer"sv,       "gettimeofday"sv,
                               "nanosleep"sv,       "setitimer"sv,       "time"sv,
                               "timer_create"sv,    "timer_delete"sv,    "timer_getoverrun"sv,
                               "timer_gettime"sv,   "timer_settime"sv,   "timerfd_create"sv,
                               "timerfd_gettime"sv, "timerfd_settime"sv, "times"sv};
// Without inotify_add_watch: who watches a directory is told the names of its entries, whether or
// not a rule lets it list them.
constexpr std::array kFile = {
    "access"sv,     "chdir"sv,     "close"sv,        "creat"sv,         "faccessat"sv,
    "faccessat2"sv, "fallocate"sv, "fchdir"sv,       "fgetxattr"sv,     "flistxattr"sv,
    "fstat"sv,      "fstatfs"sv,   "ftruncate"sv,    "getcwd"sv,        "getdents"sv,
    "getdents64"sv, "getxattr"sv,  "inotify_init"sv, "inotify_init1"sv, "inotify_rm_watch"sv,
    "lgetxattr"sv,  "link"sv,      "linkat"sv,       "listxattr"sv,     "llistxattr"sv,
    "lstat"sv,      "mkdir"sv,     "mkdirat"sv,      "mknod"sv,         "mknodat"sv,
    "newfstatat"sv, "open"sv,      "openat"sv,       "openat2"sv,       "readlink"sv,
    "readlinkat"sv, "rename"sv,    "renameat"sv,     "renameat2"sv,     "rmdir"sv,
    "stat"sv,       "statfs"sv,    "statx"sv,        "symlink"sv,       "symlinkat"sv,
    "truncate"sv,   "umask"sv,     "unlink"sv,       "unlinkat"sv};
constexpr std::array kIdentity = {"capset"sv,    "setfsgid"sv, "setfsuid"sv,  "setgid"sv,
                                  "setgroups"sv, "setregid"sv, "setresgid"sv, "setresuid"sv,
                                  "setreuid"sv,  "setuid"sv};
constexpr std::array kIo = {"close"sv,     "close_range"sv, "copy_file_range"sv, "dup"sv,
                            "dup2"sv,      "dup3"sv,        "epoll_create"sv,    "epoll_create1"sv,
                            "epoll_ctl"sv, "epoll_pwait"sv, "epoll_pwait2"sv,    "epoll_wait"sv,
                            "eventfd"sv,   "eventfd2"sv,    "fadvise64"sv,       "fcntl"sv,
                            "fdatasync"sv, "flock"sv,       "fsync"sv,           "ioctl"sv,
                            "lseek"sv,     "pipe"sv,        "pipe2"sv,           "poll"sv,
                            "ppoll"sv,     "pread64"sv,     "preadv"sv,          "preadv2"sv,
                            "pselect6"sv,  "pwrite64"sv,    "pwritev"sv,         "pwritev2"sv,
                            "read"sv,      "readahead"sv,   "readv"sv,           "select"sv,
                            "sendfile"sv,  "splice"sv,      "sync_file_range"sv, "tee"sv,
                            "vmsplice"sv,  "write"sv,       "writev"sv};
constexpr std::array kIpc = {"mq_getsetattr"sv, "mq_notify"sv,  "mq_open"sv, "mq_timedreceive"sv,
                             "mq_timedsend"sv,  "mq_unlink"sv,  "msgctl"sv,  "msgget"sv,
                             "msgrcv"sv,        "msgsnd"sv,     "semctl"sv,  "semget"sv,
                             "semop"sv,         "semtimedop"sv, "shmat"sv,   "shmctl"sv,
                             "shmdt"sv,         "shmget"sv};
constexpr std::array kMemory = {
    "brk"sv,        "madvise"sv, "membarrier"sv, "mincore"sv,   "mlock"sv,        "mlock2"sv,
    "mlockall"sv,   "mmap"sv,    "mprotect"sv,   "mremap"sv,    "msync"sv,        "munlock"sv,
    "munlockall"sv, "munmap"sv,  "pkey_alloc"sv, "pkey_free"sv, "pkey_mprotect"sv};
constexpr std::array kNetwork = {
    "accept"sv,     "accept4"sv, "bind"sv,       "connect"sv,  "getpeername"sv, "getsockname"sv,
    "getsockopt"sv, "listen"sv,  "recvfrom"sv,   "recvmmsg"sv, "recvmsg"sv,     "sendmmsg"sv,
    "sendmsg"sv,    "sendto"sv,  "setsockopt"sv, "shutdown"sv, "socket"sv,      "socketpair"sv};
constexpr std::array kPrivileged = {
    "acct"sv,          "adjtimex"sv,        "clock_adjtime"sv, "clock_settime"sv, "delete_module"sv,
    "fanotify_init"sv, "fanotify_mark"sv,   "finit_module"sv,  "init_module"sv,   "ioperm"sv,
    "iopl"sv,          "kexec_file_load"sv, "kexec_load"sv,    "quotactl"sv,      "quotactl_fd"sv,
    "reboot"sv,        "setdomainname"sv,   "sethostname"sv,   "settimeofday"sv,  "swapoff"sv,
    "swapon"sv,        "syslog"sv,          "vhangup"sv};
constexpr std::array kProcess = {"arch_prctl"sv,
                                 "capget"sv,
                                 "clone"sv,
                                 "clone3"sv,
                                 "execve"sv,
                                 "execveat"sv,
                                 "exit"sv,
                                 "exit_group"sv,
                                 "fork"sv,
                                 "futex"sv,
                                 "futex_waitv"sv,
                                 "get_robust_list"sv,
                                 "getegid"sv,
                                 "geteuid"sv,
                                 "getgid"sv,
                                 "getgroups"sv,
                                 "getpgid"sv,
                                 "getpgrp"sv,
                                 "getpid"sv,
                                 "getppid"sv,
                                 "getpriority"sv,
                                 "getresgid"sv,
                                 "getresuid"sv,
                                 "getrlimit"sv,
                                 "getrusage"sv,
                                 "getsid"sv,
                                 "gettid"sv,
                                 "getuid"sv,
                                 "pidfd_open"sv,
                                 "prctl"sv,
                                 "prlimit64"sv,
                                 "rseq"sv,
                                 "sched_get_priority_max"sv,
                                 "sched_get_priority_min"sv,
                                 "sched_getaffinity"sv,
                                 "sched_getattr"sv,
                                 "sched_getparam"sv,
                                 "sched_getscheduler"sv,
                                 "sched_rr_get_interval"sv,
                                 "sched_setaffinity"sv,
                                 "sched_setattr"sv,
                                 "sched_setparam"sv,
                                 "sched_setscheduler"sv,
                                 "sched_yield"sv,
                                 "set_robust_list"sv,
                                 "set_tid_address"sv,
                                 "setpgid"sv,
                                 "setpriority"sv,
                                 "setrlimit"sv,
                                 "setsid"sv,
                                 "sysinfo"sv,
                                 "uname"sv,
                                 "vfork"sv,
                                 "wait4"sv,
                                 "waitid"sv};
constexpr std::array kSignal = {
    "kill"sv,         "pause"sv,         "pidfd_send_signal"sv, "restart_syscall"sv,
    "rt_sigaction"sv, "rt_sigpending"sv, "rt_sigprocmask"sv,    "rt_sigqueueinfo"sv,
    "rt_sigreturn"sv, "rt_sigsuspend"sv, "rt_sigtimedwait"sv,   "rt_tgsigqueueinfo"sv,
    "sigaltstack"sv,  "signalfd"sv,      "signalfd4"sv,         "tgkill"sv,
    "tkill"sv};
constexpr std::array kStart = {"access"sv,        "arch_prctl"sv,      "brk"sv,
                               "clock_gettime"sv, "close"sv,           "exit"sv,
                               "exit_group"sv,    "faccessat2"sv,      "fstat"sv,
                               "futex"sv,         "getegid"sv,         "geteuid"sv,
                               "getgid"sv,        "getpid"sv,          "getppid"sv,
                               "getrandom"sv,     "gettid"sv,          "gettimeofday"sv,
                               "getuid"sv,        "lseek"sv,           "madvise"sv,
                               "mmap"sv,          "mprotect"sv,        "mremap"sv,
                               "munmap"sv,        "newfstatat"sv,      "openat"sv,
                               "pread64"sv,       "prlimit64"sv,       "read"sv,
                               "readlink"sv,      "restart_syscall"sv, "rseq"sv,
                               "rt_sigaction"sv,  "rt_sigprocmask"sv,  "rt_sigreturn"sv,
                               "sched_yield"sv,   "set_robust_list"sv, "set_tid_address"sv,
                               "sigaltstack"sv,   "uname"sv,           "write"sv};

constexpr std::array<CallSet, 12> kCallSets = {{
    {"@attributes", "owners, modes, times and extended attributes of files", kAttributes},
    {"@clock", "reading clocks, sleeping, timers", kClock},
    {"@file", "opening, examining, making, renaming and removing files", kFile},
    {"@identity", "changing user, groups and capabilities", kIdentity},
    {"@io", "reading, writing and waiting on what is open", kIo},
    {"@ipc", "message queues, semaphores and shared memory", kIpc},
    {"@memory", "mapping and locking memory", kMemory},
    {"@network", "sockets", kNetwork},
    {"@privileged", "what an administrator does to the machine", kPrivileged},
    {"@process", "starting, watching and waiting for processes and threads", kProcess},
    {"@signal", "sending and handling signals", kSignal},
    {"@start", "what a dynamically linked program needs from execve to exit", kStart},
}};

}  // namespace

bool CallSet::Has(std::string_view call) const { return std::ranges::binary_search(members, call); }

std::span<const CallSet> CallSets() { return kCallSets; }

const CallSet* FindCallSet(std::string_view name) {
  const auto* const set = std::ranges::find(kCallSets, name, &CallSet::name);
  return set == kCallSets.end() ? nullptr : set;
}

bool SpeaksOfCall(std::string_view word, std::string_view call) {
  if (word == call) return true;
  const CallSet* const set = FindCallSet(word);
  return set != nullptr && set->Has(call);
}

}  // namespace Policy
