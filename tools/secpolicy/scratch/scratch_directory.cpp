#include "scratch_directory.h"

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <system_error>

namespace SecPolicyCli {
namespace {

// A root that was never booted has none of the usual places.
std::string MakePrivateDirectory() {
  const char* const wanted = secure_getenv("TMPDIR");
  for (const std::string place :
       {wanted == nullptr ? "" : wanted, "/tmp", "/var/tmp", "/run", ""}) {
    std::string directory = place + "/secpolicy.XXXXXX";
    if (mkdtemp(directory.data()) != nullptr) return directory;
  }
  throw std::system_error(errno, std::generic_category(),
                          "cannot make a directory for the scratch state; TMPDIR can name a place");
}

}  // namespace

ScratchDirectory::ScratchDirectory() : path(MakePrivateDirectory()) {}

ScratchDirectory::~ScratchDirectory() {
  std::error_code ignored;
  std::filesystem::remove_all(path, ignored);
}

}  // namespace SecPolicyCli
