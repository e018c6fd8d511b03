#include "framing.h"

#include <algorithm>
#include <cctype>
#include <charconv>

namespace SecPolicyCli {
namespace {

constexpr std::string_view kLineEnd = "\r\n";
constexpr std::string_view kHeaderEnd = "\r\n\r\n";
constexpr std::string_view kLengthName = "content-length";
constexpr std::size_t kLongestHeader = 4096;
constexpr std::size_t kLongestContent = std::size_t{64} << 20;

// Names of headers may be written in any case.
bool IsLengthName(std::string_view name) {
  return std::ranges::equal(name, kLengthName, {}, [](unsigned char letter) {
    return static_cast<char>(std::tolower(letter));
  });
}

std::string_view WithoutBlanks(std::string_view text) {
  const std::size_t begin = text.find_first_not_of(" \t");
  if (begin == std::string_view::npos) return {};
  return text.substr(begin, text.find_last_not_of(" \t") - begin + 1);
}

std::size_t ReadLength(std::string_view text) {
  std::size_t length = 0;
  const char* const end = text.data() + text.size();
  const auto read = std::from_chars(text.data(), end, length);
  if (read.ec != std::errc() || read.ptr != end) {
    throw FramingError("the length of a message is no number: " + std::string(text));
  }
  if (length > kLongestContent) {
    throw FramingError("a message is too long: " + std::to_string(length) + " bytes");
  }
  return length;
}

std::size_t LengthOf(std::string_view header) {
  std::optional<std::size_t> length;
  while (!header.empty()) {
    const std::size_t end = std::min(header.find(kLineEnd), header.size());
    const std::string_view line = header.substr(0, end);
    header.remove_prefix(std::min(end + kLineEnd.size(), header.size()));
    const std::size_t colon = line.find(':');
    if (colon == std::string_view::npos) {
      throw FramingError("a line of a message's header has no colon: " + std::string(line));
    }
    if (IsLengthName(line.substr(0, colon))) {
      length = ReadLength(WithoutBlanks(line.substr(colon + 1)));
    }
  }
  if (!length) throw FramingError("the header of a message has no Content-Length");
  return *length;
}

}  // namespace

std::optional<std::string> MessageBuffer::Take() {
  if (!length) {
    const std::size_t end = buffer.find(kHeaderEnd);
    if (std::min(end, buffer.size()) > kLongestHeader) {
      throw FramingError("the header of a message does not end");
    }
    if (end == std::string::npos) return std::nullopt;
    length = LengthOf(std::string_view(buffer).substr(0, end));
    buffer.erase(0, end + kHeaderEnd.size());
  }
  if (buffer.size() < *length) return std::nullopt;
  std::string content = buffer.substr(0, *length);
  buffer.erase(0, *length);
  length.reset();
  return content;
}

std::string Frame(std::string_view content) {
  return ("Content-Length: " + std::to_string(content.size())).append(kHeaderEnd).append(content);
}

}  // namespace SecPolicyCli
