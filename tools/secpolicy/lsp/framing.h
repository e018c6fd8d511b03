#pragma once

#include <cstddef>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>

namespace SecPolicyCli {

// What is read is no sequence of messages; where the next one begins cannot be told.
class FramingError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// Takes the contents of messages out of bytes as they come: each has a header of lines, of which
// Content-Length is needed, and an empty line before it.
class MessageBuffer {
 public:
  void Append(std::string_view bytes) { buffer += bytes; }

  // The content of the next message; nothing while it is not complete. Throws FramingError for a
  // header that is none, and for a message that is longer than any editor sends.
  std::optional<std::string> Take();

  // True when bytes of a message are there.
  bool HasBegun() const { return !buffer.empty(); }

 private:
  std::string buffer;
  std::optional<std::size_t> length;  // of the content, once its header was taken
};

// A message with its header.
std::string Frame(std::string_view content);

}  // namespace SecPolicyCli
