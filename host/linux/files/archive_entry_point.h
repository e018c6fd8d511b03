#pragma once

#include "host/linux/files/tardisk_archive.h"

namespace LinuxHost {

// What libsecpolicyhost-archive.so offers, as its symbol SecPolicyHostArchive.
struct ArchiveFunctions {
  decltype(&CheckArchives) check;
  decltype(&UnpackArchive) unpack;
};

}  // namespace LinuxHost
