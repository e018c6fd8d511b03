#include "teskctl/sysinfo.h"

#include <cerrno>
#include <cstdint>
#include <cstring>
#include <optional>

#include "braxo/misc/strcat.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/inode_origin.h"
#include "host/linux/state/host_state.h"

namespace TeskCtl::Util {
namespace {

using Braxo::Misc::StrCat;
using LinuxHost::HostError;
using LinuxHost::InodeOrigin;

// The record of an inode: statistics, which are 0 for an inode that came from no tardisk, and the
// bare name of the tardisk.
struct InodeRecord {
  std::uint64_t inode;
  std::uint64_t size;
  std::uint64_t blocks;
  std::uint32_t mode;
  std::uint32_t links;
  std::uint32_t owner;
  char tardisk[512];
} __attribute__((packed));
static_assert(sizeof(InodeRecord) == 548);

// The record stands only as long as the inode is still the file that was unpacked: once that is
// gone, the number may be any other file's.
bool StillStands(const InodeOrigin& origin, const struct statx& status) {
  return LinuxHost::DeviceOf(status) == origin.device && status.stx_ino == origin.inode &&
         LinuxHost::BirthOf(status) == origin.birth;
}

InodeRecord ReadRecord(std::uint64_t inode) {
  InodeRecord record{};
  record.inode = inode;
  struct statx status;
  if (!LinuxHost::Examine("/", &status)) LinuxHost::ThrowErrno("Unable to examine the root");
  const std::optional<InodeOrigin> origin =
      LinuxHost::HostState::Current().FindOrigin(LinuxHost::DeviceOf(status), inode);
  if (!origin || !LinuxHost::Examine(origin->path.c_str(), &status)) return record;
  if (!StillStands(*origin, status)) return record;

  record.size = status.stx_size;
  record.blocks = status.stx_blocks;
  record.mode = status.stx_mode;
  record.links = status.stx_nlink;
  record.owner = status.stx_uid;
  origin->tardisk.copy(record.tardisk, sizeof record.tardisk - 1);
  return record;
}

}  // namespace

class Sysinfo::Impl {
 public:
  std::optional<unsigned long> instance;
};

Sysinfo::Sysinfo(SysinfoNode node) : impl(std::make_unique<Impl>()) {
  if (node != KSI_NODE_system_kelpfs_inodes_stats) {
    throw HostError(ENOENT, StrCat("Unknown sysinfo node ", static_cast<unsigned int>(node)));
  }
}

Sysinfo::~Sysinfo() = default;

void Sysinfo::AddInstancePath(unsigned long instance) { impl->instance = instance; }

void Sysinfo::Get(void* buffer, unsigned int size) {
  if (!impl->instance) throw HostError(EINVAL, "No instance of the sysinfo node was selected");
  if (size != sizeof(InodeRecord)) {
    throw HostError(
        EINVAL, StrCat("The record of an inode has ", sizeof(InodeRecord), " bytes, not ", size));
  }
  const InodeRecord record = ReadRecord(*impl->instance);
  std::memcpy(buffer, &record, sizeof record);
}

}  // namespace TeskCtl::Util
