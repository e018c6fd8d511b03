#include "host/linux/files/security_attribute.h"

#include <fcntl.h>
#include <linux/limits.h>
#include <sys/stat.h>
#include <sys/xattr.h>

#include <cerrno>
#include <cstdint>
#include <cstring>

#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/files/inherited_label.h"
#include "host/linux/state/host_state.h"
#include "host/linux/state/label_table.h"
#include "zorvan/kernel.h"

namespace LinuxHost {
namespace {

constexpr char kContractName[] = "zorvan.security";
constexpr char kPrivilegedName[] = "security.bpf.zorvan";
constexpr char kOrdinaryName[] = "user.zorvan.security";

// What older versions called the privileged one, which programs of the kernel cannot read.
constexpr char kFormerName[] = "security.zorvan";

// The contract's calls take no parameter for it.
AttributeStandIn* standIn = nullptr;

// Tries it out on a file without a name, which vanishes with its descriptor.
bool MayWritePrivileged(const char* directory) {
  const Descriptor file(open(directory, O_TMPFILE | O_RDWR | O_CLOEXEC, 0600));
  const std::uint32_t value = 0;
  return file.IsOpen() && fsetxattr(file.Number(), kPrivilegedName, &value, sizeof value, 0) == 0;
}

const std::string& RecordedOrChosen(HostState& state) {
  const std::string& recorded = state.LabelAttribute();
  if (!recorded.empty()) return recorded;
  return state.ChooseLabelAttribute(UsableLabelAttribute(state.Directory()));
}

// Sets errno for any other as for a name that no file system knows.
bool IsContractName(const char* name) {
  if (name != nullptr && std::strcmp(name, kContractName) == 0) return true;
  errno = name == nullptr ? EFAULT : EOPNOTSUPP;
  return false;
}

// The real name for `name`, or nothing with errno set.
std::optional<std::string> RealName(const char* name) {
  if (!IsContractName(name)) return std::nullopt;
  try {
    return LabelAttribute();
  } catch (const HostError& error) {
    errno = error.Code();
    return std::nullopt;
  }
}

}  // namespace

const char* BeginLabelChange() {
  try {
    HostState& state = HostState::Known();
    const std::string& attribute = RecordedOrChosen(state);
    state.TellLabelsChange();
    return attribute.c_str();
  } catch (const HostError& error) {
    errno = error.Code();
    return nullptr;
  }
}

bool EndLabelChange() {
  try {
    HostState::Known().TellLabelsChange();
    return true;
  } catch (const HostError& error) {
    errno = error.Code();
    return false;
  }
}

std::string LabelAttribute() { return RecordedOrChosen(HostState::Known()); }

// Labels are put on the root file system; any other tells at least what the process may do.
std::string UsableLabelAttribute(const std::string& otherDirectory) {
  const bool privileged = MayWritePrivileged("/") || MayWritePrivileged(otherDirectory.c_str());
  return privileged ? kPrivilegedName : kOrdinaryName;
}

bool CanCarryLabel(mode_t mode, const std::string& attribute) {
  if (S_ISLNK(mode)) return false;
  return S_ISREG(mode) || S_ISDIR(mode) || attribute == kPrivilegedName;
}

int GiveFirstLabel(const char* path, const std::string& attribute) {
  const std::uint32_t id = kUnlabeledId;
  if (lsetxattr(path, attribute.c_str(), &id, sizeof id, 0) != 0) return -1;
  // Asked for first: on some file systems even removing nothing is written to the disk.
  const bool isLeftOver =
      attribute == kPrivilegedName && lgetxattr(path, kFormerName, nullptr, 0) >= 0;
  return isLeftOver ? lremovexattr(path, kFormerName) : 0;
}

std::optional<std::string> ReadCarried(const char* path, const std::string& attribute) {
  std::string value(sizeof(std::uint32_t), '\0');
  ssize_t size = lgetxattr(path, attribute.c_str(), value.data(), value.size());
  if (size < 0 && errno == ERANGE) {
    value.resize(XATTR_SIZE_MAX);
    size = lgetxattr(path, attribute.c_str(), value.data(), value.size());
  }
  if (size < 0) return std::nullopt;
  value.resize(static_cast<std::size_t>(size));
  return value;
}

AttributeStandIn::AttributeStandIn() { standIn = this; }

AttributeStandIn::~AttributeStandIn() { standIn = nullptr; }

}  // namespace LinuxHost

namespace Zorvan::Kernel {

int SetXattr(const char* path, const char* name, const void* value, std::size_t size, int flags) {
  if (auto* standIn = LinuxHost::standIn) {
    const std::optional<std::string> found = LinuxHost::RealName(name);
    return found ? standIn->Set(path, found->c_str(), value, size, flags) : -1;
  }
  if (!LinuxHost::IsContractName(name)) return -1;
  return LinuxHost::ChangeLabel([&](const char* realName) {
    const int result = setxattr(path, realName, value, size, flags);
    if (result == 0 || errno != ENODATA) return result;
    return LinuxHost::ReplaceInherited(path, LinuxHost::LastLink::kFollowed, realName, value, size);
  });
}

ssize_t GetXattr(const char* path, const char* name, void* value, std::size_t size) {
  const std::optional<std::string> found = LinuxHost::RealName(name);
  if (!found) return -1;
  const char* const realName = found->c_str();
  if (auto* standIn = LinuxHost::standIn) {
    return standIn->Get(path, realName, value, size);
  }
  const ssize_t result = getxattr(path, realName, value, size);
  if (result >= 0 || errno != ENODATA) return result;
  return LinuxHost::ReadInherited(path, LinuxHost::LastLink::kFollowed, realName, value, size);
}

}  // namespace Zorvan::Kernel
