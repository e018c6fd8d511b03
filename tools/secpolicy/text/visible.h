#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

// What comes from files and command lines may hold anything. Before people see it, it is made safe:
// control characters are shown as ^I, other characters that command a terminal or turn the
// direction of the text as <U+202E>, and bytes that are no UTF-8 as <9B>.
namespace SecPolicyCli {

// Takes the first character off `text`, which is not empty; of what is no UTF-8, one byte.
std::string_view TakeCharacter(std::string_view& text);

// Appends `character`, which TakeCharacter took, as it can be shown, and returns in how many
// columns.
std::size_t AppendVisible(std::string& text, std::string_view character);

// The number of characters in `text`; a byte that belongs to none counts as one.
std::size_t CountCharacters(std::string_view text);

// The whole text as it can be shown, on one line.
std::string Visible(std::string_view text);

// The same for a text of several lines, whose ends stay.
std::string VisibleLines(std::string_view text);

// The number of a character that commands a terminal or turns the direction of the text; nothing
// for any other.
std::optional<std::uint32_t> UnsafeNumber(std::string_view character);

}  // namespace SecPolicyCli
