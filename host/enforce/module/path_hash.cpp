#include "host/enforce/module/path_hash.h"

#include <algorithm>
#include <cstring>
#include <string_view>

namespace Enforce {
namespace {

__u64 Mix(__u64 hash, __u64 word, __u64 multiplier) {
  hash = (hash ^ word) * multiplier;
  return hash ^ hash >> 29;
}

__u64 HashOfName(std::string_view name, const ModuleHashing& how) {
  __u64 hash = how.basis;
  for (; !name.empty(); name.remove_prefix(std::min(name.size(), sizeof(__u64)))) {
    __u64 word = 0;
    std::memcpy(&word, name.data(), std::min(name.size(), sizeof(word)));
    hash = Mix(hash, word, how.multiplier);
  }
  return hash;
}

}  // namespace

__u64 HashOf(const std::string& path, const ModuleHashing& how) {
  __u64 hash = how.basis;
  std::string_view rest = path;
  while (rest.size() > 1) {
    rest.remove_prefix(1);
    const std::string_view name = rest.substr(0, rest.find('/'));
    hash = hash * how.multiplier + HashOfName(name, how);
    rest.remove_prefix(name.size());
  }
  return hash;
}

}  // namespace Enforce
