#include "visible.h"

namespace SecPolicyCli {

bool IsControl(char byte) { return static_cast<unsigned char>(byte) < 0x20 || byte == 0x7f; }

void AppendVisible(std::string& text, std::string_view character) {
  if (!IsControl(character.front())) {
    text += character;
    return;
  }
  text += '^';
  text += static_cast<char>(character.front() ^ 0x40);
}

std::string_view TakeCharacter(std::string_view& text) {
  std::size_t size = 1;
  while (size < text.size() && (static_cast<unsigned char>(text[size]) & 0xc0) == 0x80) ++size;
  const std::string_view character = text.substr(0, size);
  text.remove_prefix(size);
  return character;
}

std::string Visible(std::string_view text) {
  std::string visible;
  while (!text.empty()) AppendVisible(visible, TakeCharacter(text));
  return visible;
}

}  // namespace SecPolicyCli
