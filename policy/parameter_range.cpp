#include "policy/parameter_range.h"

#include <charconv>
#include <string_view>

#include "braxo/lib/exception.h"
#include "braxo/misc/strcat.h"

using Braxo::Lib::BraxoException;
using Braxo::Misc::StrCat;

namespace Policy {
namespace {

std::uint64_t ParseNumber(const std::string& word) {
  const bool hexadecimal = word.starts_with("0x") || word.starts_with("0X");
  const std::string_view digits = std::string_view(word).substr(hexadecimal ? 2 : 0);
  std::uint64_t number = 0;
  const auto [end, error] =
      std::from_chars(digits.data(), digits.data() + digits.size(), number, hexadecimal ? 16 : 10);
  if (error == std::errc::result_out_of_range) {
    throw BraxoException(StrCat("parameter '", word, "' is too large"));
  }
  if (error != std::errc() || end != digits.data() + digits.size()) {
    throw BraxoException(StrCat("parameter '", word, "' is not an unsigned number"));
  }
  return number;
}

}  // namespace

ParameterRange ParseParameterRange(const std::string& firstWord, const std::string& lastWord) {
  ParameterRange range;
  range.first = ParseNumber(firstWord);
  range.last = lastWord.empty() ? range.first : ParseNumber(lastWord);
  if (range.first > range.last) {
    throw BraxoException(StrCat("parameter range ", firstWord, " to ", lastWord, " is empty"));
  }
  return range;
}

}  // namespace Policy
