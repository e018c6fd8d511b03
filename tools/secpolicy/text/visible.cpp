#include "visible.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstdio>

namespace SecPolicyCli {
namespace {

struct Range {
  std::uint32_t first;
  std::uint32_t last;
};

// The second set of control characters, line and paragraph ends, and the marks that turn the
// direction of text around.
constexpr Range kUnsafe[] = {{0x80, 0x9f},     {0x61c, 0x61c},   {0x200e, 0x200f},
                             {0x2028, 0x202e}, {0x2066, 0x2069}, {0xfeff, 0xfeff}};

struct Decoded {
  std::size_t size = 0;  // 0: no UTF-8
  std::uint32_t point = 0;
};

// What a first byte says: how many bytes, and the smallest character that may be written so.
struct Lead {
  unsigned char mask;
  unsigned char bits;
  std::size_t size;
  std::uint32_t smallest;
};

constexpr std::array<Lead, 4> kLeads = {
    {{0x80, 0x00, 1, 0}, {0xe0, 0xc0, 2, 0x80}, {0xf0, 0xe0, 3, 0x800}, {0xf8, 0xf0, 4, 0x10000}}};

bool IsCharacter(std::uint32_t point, std::uint32_t smallest) {
  return point >= smallest && point <= 0x10ffff && (point < 0xd800 || point > 0xdfff);
}

Decoded Decode(std::string_view text) {
  const auto first = static_cast<unsigned char>(text.front());
  const auto* const lead = std::find_if(kLeads.begin(), kLeads.end(), [&](const Lead& kind) {
    return (first & kind.mask) == kind.bits;
  });
  if (lead == kLeads.end() || text.size() < lead->size) return {};
  std::uint32_t point = first & static_cast<unsigned char>(~lead->mask);
  for (const char letter : text.substr(1, lead->size - 1)) {
    const auto byte = static_cast<unsigned char>(letter);
    if ((byte & 0xc0) != 0x80) return {};
    point = point << 6 | (byte & 0x3f);
  }
  return IsCharacter(point, lead->smallest) ? Decoded{lead->size, point} : Decoded{};
}

bool IsPlain(char byte) { return byte >= ' ' && byte < 0x7f; }

bool IsControl(std::uint32_t point) { return point < 0x20 || point == 0x7f; }

bool IsUnsafe(std::uint32_t point) {
  return IsControl(point) ||
         std::any_of(std::begin(kUnsafe), std::end(kUnsafe), [&](const Range& range) {
           return point >= range.first && point <= range.last;
         });
}

std::string InBrackets(const char* format, unsigned int number) {
  std::array<char, 16> text{};
  static_cast<void>(std::snprintf(text.data(), text.size(), format, number));
  return text.data();
}

// How an unsafe character is shown; empty for one that is safe.
std::string Replacement(std::string_view character) {
  if (Decode(character).size == 0) {
    return InBrackets("<%02X>", static_cast<unsigned char>(character.front()));
  }
  const std::optional<std::uint32_t> unsafe = UnsafeNumber(character);
  if (!unsafe) return "";
  if (IsControl(*unsafe)) return {'^', static_cast<char>(*unsafe ^ 0x40)};
  return InBrackets("<U+%04X>", *unsafe);
}

}  // namespace

std::string_view TakeCharacter(std::string_view& text) {
  const std::string_view character = text.substr(0, std::max<std::size_t>(Decode(text).size, 1));
  text.remove_prefix(character.size());
  return character;
}

std::size_t AppendVisible(std::string& text, std::string_view character) {
  const std::string replacement = IsPlain(character.front()) ? "" : Replacement(character);
  text += replacement.empty() ? character : replacement;
  return std::max<std::size_t>(replacement.size(), 1);
}

std::size_t CountCharacters(std::string_view text) {
  std::size_t count = 0;
  for (; !text.empty(); ++count) TakeCharacter(text);
  return count;
}

std::string Visible(std::string_view text) {
  if (std::all_of(text.begin(), text.end(), IsPlain)) return std::string(text);
  std::string visible;
  while (!text.empty()) AppendVisible(visible, TakeCharacter(text));
  return visible;
}

std::string VisibleLines(std::string_view text) {
  std::string visible;
  while (true) {
    const std::size_t end = text.find('\n');
    visible += Visible(text.substr(0, end));
    if (end == std::string_view::npos) return visible;
    visible += '\n';
    text.remove_prefix(end + 1);
  }
}

std::optional<std::uint32_t> UnsafeNumber(std::string_view character) {
  const Decoded decoded = Decode(character);
  if (decoded.size == 0 || !IsUnsafe(decoded.point)) return std::nullopt;
  return decoded.point;
}

}  // namespace SecPolicyCli
