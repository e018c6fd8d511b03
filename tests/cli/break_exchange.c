// Loaded before a command: the BREAK_AT-th call of BREAK_CALL in it kills it, fails with the error
// BREAK_ERROR, if that is given, or brings it the signal TERM or STOP, if that is the error. Calls that a
// command makes anyway count from its first exchange of two directories on, and none in its children. When
// two were exchanged, the shell takes AFTER_EXCHANGE.
#define _GNU_SOURCE
#include <errno.h>
#include <fcntl.h>
#include <signal.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

static int calls;
static pid_t self;

__attribute__((constructor)) static void Begin(void) { self = getpid(); }

static int Breaks(const char* call) {
  if (getpid() != self || strcmp(call, getenv("BREAK_CALL")) != 0 || ++calls != atoi(getenv("BREAK_AT"))) return 0;
  const char* error = getenv("BREAK_ERROR");
  if (error == NULL) raise(SIGKILL);
  if (strcmp(error, "TERM") == 0) return raise(SIGTERM);
  if (strcmp(error, "STOP") == 0) return raise(SIGSTOP);
  errno = atoi(error);
  return 1;
}

static int exchanged;

int renameat2(int from, const char* old, int to, const char* new, unsigned flags) {
  if (Breaks("renameat2")) return -1;
  const int result = (int)syscall(SYS_renameat2, from, old, to, new, flags);
  const char* command = getenv("AFTER_EXCHANGE");
  if (++exchanged != 2 || command == NULL) return result;
  unsetenv("LD_PRELOAD");
  return system(command) == 0 ? result : -1;
}

int flock(int file, int operation) { return Breaks("flock") ? -1 : (int)syscall(SYS_flock, file, operation); }

int syncfs(int file) { return Breaks("syncfs") ? -1 : (int)syscall(SYS_syncfs, file); }

// Databases sync files, and have one call more for that.
int fsync(int file) {
  struct stat status;
  if (exchanged && fstat(file, &status) == 0 && S_ISDIR(status.st_mode) && Breaks("fsync")) return -1;
  return (int)syscall(SYS_fsync, file);
}

int unlinkat(int directory, const char* name, int flags) {
  if (exchanged && Breaks("unlinkat")) return -1;
  return (int)syscall(SYS_unlinkat, directory, name, flags);
}
