#include "shell_word.h"

#include <algorithm>
#include <cctype>
#include <cstring>

namespace SecPolicyCli {
namespace {

bool NeedsNoQuotes(const std::string& word) {
  return !word.empty() && std::ranges::all_of(word, [](unsigned char letter) {
    return std::isalnum(letter) != 0 || std::strchr("/._-+:@%,=", letter) != nullptr;
  });
}

}  // namespace

std::string ShellWord(const std::string& word) {
  if (NeedsNoQuotes(word)) return word;
  std::string quoted = "\"";
  for (const char letter : word) {
    if (letter != '\0' && std::strchr("\"\\$`", letter) != nullptr) quoted += '\\';
    quoted += letter;
  }
  return quoted + '"';
}

}  // namespace SecPolicyCli
