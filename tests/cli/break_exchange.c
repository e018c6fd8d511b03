// Loaded before a command: the BREAK_AT-th call of BREAK_CALL in it kills it, fails with the error
// BREAK_ERROR, if that is given, or brings it the signal TERM, if that is the error. Calls that a command
// makes anyway count from its first exchange of two directories on.
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

static int Breaks(const char* call) {
  if (strcmp(call, getenv("BREAK_CALL")) != 0 || ++calls != atoi(getenv("BREAK_AT"))) return 0;
  const char* error = getenv("BREAK_ERROR");
  if (error == NULL) raise(SIGKILL);
  if (strcmp(error, "TERM") == 0) return raise(SIGTERM);
  errno = atoi(error);
  return 1;
}

static int exchanged;

int renameat2(int from, const char* old, int to, const char* new, unsigned flags) {
  if (Breaks("renameat2")) return -1;
  exchanged = 1;
  return (int)syscall(SYS_renameat2, from, old, to, new, flags);
}

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
