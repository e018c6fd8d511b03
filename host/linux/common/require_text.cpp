#include "host/linux/common/require_text.h"

#include <cerrno>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"

namespace LinuxHost {

using Braxo::Misc::StrCat;

void RequireText(const std::string& text, const TextLimit& limit) {
  if (text.empty()) throw HostError(EINVAL, limit.whenEmpty);
  if (text.find('\0') != std::string::npos) {
    throw HostError(EINVAL, StrCat(limit.noun, " '", text.c_str(), "' goes on after a NUL byte"));
  }
  if (text.size() > limit.maxSize) {
    throw HostError(ENAMETOOLONG, StrCat(limit.noun, " '", text, "' is too long: ", text.size(),
                                         " bytes, at most ", limit.maxSize));
  }
}

}  // namespace LinuxHost
