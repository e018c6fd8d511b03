#pragma once

#include <memory>

/// What the kernel tells of itself.
namespace TeskCtl::Util {

/// The kernel's sysinfo nodes.
enum SysinfoNode : unsigned int {
  /// One record for each inode of the in-memory root file system; the instance is the inode number.
  /// The record has 548 bytes: 36 of statistics, then the name of the tardisk that the inode came
  /// from, NUL-terminated in 512 bytes, empty when it came from none.
  KSI_NODE_system_kelpfs_inodes_stats = 1
};

/// Reads one record of a sysinfo node.
class __attribute__((visibility("default"))) Sysinfo {
 public:
  /// Opens `node`. May throw Braxo::Lib::BraxoException.
  explicit Sysinfo(SysinfoNode node);
  Sysinfo(const Sysinfo&) = delete;
  Sysinfo& operator=(const Sysinfo&) = delete;
  ~Sysinfo();

  /// Selects the instance to read. May throw Braxo::Lib::BraxoException.
  void AddInstancePath(unsigned long instance);

  /// Fills `buffer`, which the caller owns, with the record of `size` bytes.
  /// May throw Braxo::Lib::BraxoException, also when `size` is not the record's size.
  void Get(void* buffer, unsigned int size);

 private:
  class Impl;
  std::unique_ptr<Impl> impl;
};

}  // namespace TeskCtl::Util
