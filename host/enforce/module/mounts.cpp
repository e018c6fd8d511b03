#include "host/enforce/module/mounts.h"

#include <algorithm>
#include <fstream>
#include <sstream>

#include "host/enforce/module/module_maps.h"

namespace Enforce {
namespace {

// Spaces and the like are written as octal numbers.
std::string Unescaped(const std::string& text) {
  std::string result;
  for (std::size_t at = 0; at < text.size(); ++at) {
    if (text[at] != '\\' || at + 3 >= text.size()) {
      result += text[at];
      continue;
    }
    result += static_cast<char>(std::stoi(text.substr(at + 1, 3), nullptr, 8));
    at += 3;
  }
  return result;
}

}  // namespace

__u32 DeviceNumber(unsigned int major, unsigned int minor) {
  constexpr unsigned int kMinorBits = 20;
  return major << kMinorBits | minor;
}

std::vector<Mount> ListMounts() {
  std::vector<Mount> mounts;
  std::ifstream file("/proc/self/mountinfo");
  for (std::string line; std::getline(file, line);) {
    std::istringstream words(line);
    std::string ignored;
    std::string root;
    std::string place;
    unsigned int major = 0;
    unsigned int minor = 0;
    char colon = 0;
    words >> ignored >> ignored >> major >> colon >> minor >> root >> place;
    for (std::string word; words >> word && word != "-";) {
    }
    Mount mount{DeviceNumber(major, minor), Unescaped(root), Unescaped(place), {}};
    words >> mount.type;
    const auto same = std::ranges::find(mounts, mount.device, &Mount::device);
    if (same == mounts.end()) {
      mounts.push_back(mount);
    } else if (same->root != "/" && mount.root == "/") {
      *same = mount;
    }
  }
  if (mounts.empty()) ThrowModuleError("cannot read /proc/self/mountinfo");
  return mounts;
}

}  // namespace Enforce
