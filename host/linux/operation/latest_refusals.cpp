#include "host/linux/operation/latest_refusals.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "braxo/misc/strcat.h"
#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/private_file.h"
#include "host/linux/common/used_paths.h"

namespace LinuxHost {
namespace {

constexpr char kPurpose[] = "latest refusals";

}  // namespace

std::string LatestRefusalsFile() {
  const std::string& state = StatePath();
  return Braxo::Misc::StrCat(state.substr(0, state.rfind('/')), "/refusals");
}

void WriteLatestRefusals(const std::string& text) {
  const std::string path = LatestRefusalsFile();
  PreparePrivateFile(path, kPurpose);
  ReplacePrivateFile(path, text);
}

std::optional<std::string> ReadLatestRefusals() {
  const std::string path = LatestRefusalsFile();
  struct stat status {};
  if (lstat(path.c_str(), &status) != 0 && errno == ENOENT) return std::nullopt;
  RequirePrivateFile(path, kPurpose);
  // Another one may have taken its place meanwhile, of another size.
  const Descriptor file(open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_CLOEXEC));
  if (!file.IsOpen() || fstat(file.Number(), &status) != 0) ThrowErrno("Unable to read ", path);
  std::string text(static_cast<std::size_t>(status.st_size), '\0');
  if (read(file.Number(), text.data(), text.size()) < 0) ThrowErrno("Unable to read ", path);
  return text;
}

}  // namespace LinuxHost
