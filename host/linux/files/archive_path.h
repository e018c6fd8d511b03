#pragma once

#include <algorithm>
#include <string>
#include <string_view>
#include <vector>

namespace LinuxHost {

// The components of `path` that lead somewhere: neither empty ones nor ".".
inline std::vector<std::string_view> Components(std::string_view path) {
  std::vector<std::string_view> components;
  while (!path.empty()) {
    const std::string_view component = path.substr(0, path.find('/'));
    path.remove_prefix(std::min(component.size() + 1, path.size()));
    if (!component.empty() && component != ".") components.push_back(component);
  }
  return components;
}

// The path of an entry as it is found in the root: behind a link, "/" and "/." would lead on to
// what the link points to.
inline std::string PlainPath(std::string_view path) {
  std::string plain;
  for (const std::string_view component : Components(path)) {
    if (!plain.empty()) plain += '/';
    plain += component;
  }
  return plain;
}

}  // namespace LinuxHost
