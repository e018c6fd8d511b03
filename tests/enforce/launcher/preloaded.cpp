// A library that tells that it was loaded.

#include <unistd.h>

namespace {

__attribute__((constructor)) void Tell() {
  [[maybe_unused]] const ssize_t written = write(STDERR_FILENO, "loaded\n", 7);
}

}  // namespace
