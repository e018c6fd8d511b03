#include "standard_descriptors.h"

#include <fcntl.h>
#include <unistd.h>

namespace SecPolicyCli {

// Not /dev/null, which a root may lack and which would let output vanish unseen.
void TakeClosedDescriptors() {
  int lowest = STDIN_FILENO;
  while (lowest >= 0 && lowest <= STDERR_FILENO) lowest = open("/", O_PATH | O_CLOEXEC);
  if (lowest >= 0) close(lowest);
}

}  // namespace SecPolicyCli
