#include <sys/stat.h>

#include "kitlibs/file.h"

bool File_Exists(const char* path) {
  struct stat status;
  return stat(path, &status) == 0;
}

bool File_IsDirectory(const char* path) {
  struct stat status;
  return stat(path, &status) == 0 && S_ISDIR(status.st_mode);
}
