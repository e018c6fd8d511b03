// All that libsecpolicyhost-archive.so shows. Found by its name, which C++ would decorate.
#include "tardisk_archive.h"

extern "C" __attribute__((visibility("default"))) void SecPolicyHostUnpackArchive(
    const std::string& image, const LinuxHost::Arrival& arrived) {
  LinuxHost::UnpackArchive(image, arrived);
}
