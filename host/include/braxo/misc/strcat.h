#pragma once

#include <charconv>
#include <concepts>
#include <limits>
#include <string>
#include <string_view>
#include <type_traits>

/// Texts.
namespace Braxo::Misc {
namespace Detail {

template <class T, class... Others>
concept AnyOf = (std::same_as<T, Others> || ...);

/// A type that is an integer to the language but a letter or a truth value to the reader.
// clang-format off
template <class T>
concept Ambiguous =
    AnyOf<std::remove_cv_t<T>, bool, char, wchar_t, char8_t, char16_t, char32_t>;
// clang-format on

template <class T>
concept Number = std::integral<T> && !Ambiguous<T>;

template <class T>
concept Text = std::convertible_to<const T&, std::string_view>;

template <Text T>
void AppendPiece(std::string& text, const T& piece) {
  text += std::string_view(piece);
}

template <Number T>
void AppendPiece(std::string& text, T piece) {
  char digits[std::numeric_limits<T>::digits10 + 3];
  const auto end = std::to_chars(std::begin(digits), std::end(digits), piece).ptr;
  text.append(digits, end);
}

}  // namespace Detail

/// What can be joined: a `std::string`, a `std::string_view`, a C string (not null) or an integer.
/// `char` and `bool` are refused: whether a number or a letter was meant cannot be told.
template <class T>
concept Piece = Detail::Text<T> || Detail::Number<T>;

/// Returns the pieces joined in order. Integers are written in decimal, whatever the locale is.
template <Piece... Pieces>
std::string StrCat(const Pieces&... pieces) {
  std::string text;
  (Detail::AppendPiece(text, pieces), ...);
  return text;
}

}  // namespace Braxo::Misc
