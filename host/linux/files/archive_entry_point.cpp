// All that libsecpolicyhost-archive.so shows. Found by its name, which C++ would decorate.
#include "host/linux/files/archive_entry_point.h"

#include "host/linux/files/tardisk_archive.h"

extern "C" __attribute__((visibility("default")))
const LinuxHost::ArchiveFunctions SecPolicyHostArchive = {LinuxHost::CheckArchives,
                                                          LinuxHost::UnpackArchive};
