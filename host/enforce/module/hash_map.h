#pragma once

#include <bpf/bpf.h>

#include <cerrno>
#include <vector>

#include "host/enforce/module/module_maps.h"

namespace Enforce {

// Calls `visit` with each key and value of a hash map of the kernel. What changes meanwhile may be
// visited or not. Throws Braxo::Lib::BraxoException when it cannot be read.
template <class Key, class Value, class Visit>
void ForEach(const FileDescriptor& map, const Visit& visit) {
  constexpr __u32 kMostAtOnce = 4096;
  std::vector<Key> keys(kMostAtOnce);
  std::vector<Value> values(kMostAtOnce);
  __u32 place = 0;
  int result = 0;
  for (bool isFirst = true; result == 0; isFirst = false) {
    __u32 count = kMostAtOnce;
    result = bpf_map_lookup_batch(map.Number(), isFirst ? nullptr : &place, &place, keys.data(),
                                  values.data(), &count, nullptr);
    Require(result == 0 || errno == ENOENT, "cannot read rules");
    for (__u32 index = 0; index < count; ++index) visit(keys[index], values[index]);
  }
}

}  // namespace Enforce
