#pragma once

#include <linux/types.h>

#include <string>
#include <vector>

namespace Enforce {

// The attribute of a file that has its label.
inline constexpr const char* kModuleLabelAttribute = "security.bpf.zorvan";

// A mounted file system.
struct Mount {
  __u32 device = 0;  // as the kernel has it
  std::string root;  // the part of the file system that is mounted
  std::string place;
  std::string type;
};

// The device as the kernel has it.
__u32 DeviceNumber(unsigned int major, unsigned int minor);

// Those of this mount namespace, one of each file system: as a whole, where it is mounted so.
// Throws Braxo::Lib::BraxoException when they cannot be read.
std::vector<Mount> ListMounts();

}  // namespace Enforce
