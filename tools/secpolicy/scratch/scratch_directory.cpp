#include "scratch_directory.h"

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <system_error>
#include <vector>

#include "host/linux/common/host_error.h"

namespace SecPolicyCli {
namespace {

// A root that was never booted has none of the usual places, so that only the root itself is left.
std::string MakePrivateDirectory() {
  std::vector<std::string> places = {"/tmp", "/var/tmp", "/run", ""};
  const char* const wanted = secure_getenv("TMPDIR");
  if (wanted != nullptr && *wanted != '\0') places.emplace(places.begin(), wanted);
  for (const std::string& place : places) {
    std::string directory = place + "/secpolicy.XXXXXX";
    if (mkdtemp(directory.data()) != nullptr) return directory;
  }
  LinuxHost::ThrowErrno("cannot make a directory for the scratch state; TMPDIR can name a place");
}

}  // namespace

ScratchDirectory::ScratchDirectory() : path(MakePrivateDirectory()) {}

ScratchDirectory::~ScratchDirectory() {
  std::error_code ignored;
  std::filesystem::remove_all(path, ignored);
}

}  // namespace SecPolicyCli
