// All that libsecpolicyhost-archive.so shows. Found by its name, which C++ would decorate.
#include "archive_entry_point.h"

#include "tardisk_archive.h"

extern "C" __attribute__((visibility("default")))
const LinuxHost::ArchiveFunctions SecPolicyHostArchive = {LinuxHost::CheckArchives,
                                                          LinuxHost::UnpackArchive};
