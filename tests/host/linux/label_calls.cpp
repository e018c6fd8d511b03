#include "label_calls.h"

#include <cerrno>
#include <cstring>

#include "host/linux/files/security_attribute.h"
#include "zorvan/kernel.h"

namespace LinuxHostTest {
namespace {

std::string LabelOrError(std::uint32_t id, ssize_t size) {
  return size == sizeof id ? std::to_string(id) : Told(size);
}

}  // namespace

std::string Told(ssize_t result) {
  return result < 0 ? strerrorname_np(errno) : std::to_string(result);
}

std::string Words(std::initializer_list<std::string> words) {
  std::string text;
  for (const std::string& word : words) text += (text.empty() ? "" : " ") + word;
  return text;
}

std::string Give(const std::string& path, std::uint32_t id, int flags) {
  return Told(Zorvan::Kernel::SetXattr(path.c_str(), kLabelName, &id, sizeof id, flags));
}

std::string Label(const std::string& path) {
  std::uint32_t id = 0;
  const ssize_t size = Zorvan::Kernel::GetXattr(path.c_str(), kLabelName, &id, sizeof id);
  return LabelOrError(id, size);
}

std::string Carried(const std::string& path) {
  std::uint32_t id = 0;
  const ssize_t size = lgetxattr(path.c_str(), LinuxHost::LabelAttribute().c_str(), &id, sizeof id);
  return LabelOrError(id, size);
}

}  // namespace LinuxHostTest
