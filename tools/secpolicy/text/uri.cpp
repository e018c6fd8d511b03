#include "uri.h"

#include <charconv>

#include "host/linux/common/percent_encoding.h"

namespace SecPolicyCli {
namespace {

constexpr std::string_view kFileScheme = "file://";

// The byte that "%xx" at the beginning of the text stands for; nothing when there is none.
std::optional<char> DecodeByte(std::string_view text) {
  constexpr std::size_t kSize = 3;
  if (text.size() < kSize || text.front() != '%') return std::nullopt;
  unsigned int byte = 0;
  const auto read = std::from_chars(text.data() + 1, text.data() + kSize, byte, 16);
  if (read.ec != std::errc() || read.ptr != text.data() + kSize) return std::nullopt;
  return static_cast<char>(byte);
}

}  // namespace

std::string ToUri(std::string_view path) {
  const std::string scheme(path.starts_with('/') ? kFileScheme : "");
  return scheme + LinuxHost::PercentEncoded(path, "-._~/");
}

std::optional<std::string> PathOfUri(std::string_view uri) {
  if (!uri.starts_with(kFileScheme)) return std::nullopt;
  uri.remove_prefix(kFileScheme.size());
  constexpr std::string_view kThisHost = "localhost";
  if (uri.starts_with(kThisHost)) uri.remove_prefix(kThisHost.size());
  if (!uri.starts_with('/')) return std::nullopt;
  std::string path;
  while (!uri.empty()) {
    const auto byte = DecodeByte(uri);
    path += byte.value_or(uri.front());
    uri.remove_prefix(byte ? 3 : 1);
  }
  return path;
}

}  // namespace SecPolicyCli
