#include "support/reference_reader.h"

namespace SecPolicyFuzz {
namespace {

constexpr std::size_t kLongestLine = 1023;

}  // namespace

Words ReadLine(std::string_view line) {
  Words words;
  std::string word;
  for (const char character : line) {
    if (character == '#') break;
    if (character != ' ') {
      word += character;
      continue;
    }
    if (!word.empty()) words.push_back(word);
    word.clear();
  }
  if (!word.empty()) words.push_back(word);
  return words;
}

Lines ReadFile(std::string_view file) {
  Lines lines;
  for (unsigned int number = 1;; ++number) {
    const std::size_t end = file.find('\n');
    const std::string_view whole = file.substr(0, end);
    const std::string_view read = whole.substr(0, kLongestLine);
    const Words words = ReadLine(read.substr(0, read.find('\0')));
    if (!words.empty()) lines[number] = words;
    if (end == std::string_view::npos || whole.size() > kLongestLine) return lines;
    file.remove_prefix(end + 1);
  }
}

Words ToWords(std::queue<std::string> words) {
  Words result;
  for (; !words.empty(); words.pop()) result.push_back(words.front());
  return result;
}

Permission ReadPermission(const std::string& letters) {
  if (letters.size() > 3) return {{}, "Please enter the permissions from [rwx]."};
  unsigned int mask = 0;
  for (std::size_t index = 0; index < letters.size(); ++index) {
    const bool repeated = letters.find(letters[index]) < index;
    switch (letters[index]) {
      case 'r':
        if (repeated) return {{}, "Read access already specified."};
        mask += 1;
        break;
      case 'w':
        if (repeated) return {{}, "Write access already specified."};
        mask += 2;
        break;
      case 'x':
        if (repeated) return {{}, "Exec access already specified."};
        mask += 16;
        break;
      default:
        return {{}, "Unknown access privilege specified."};
    }
  }
  return {mask, {}};
}

std::string_view Text(const unsigned char* data, std::size_t size) {
  return {reinterpret_cast<const char*>(data), size};
}

std::string Show(const Words& words) {
  std::string text;
  for (const std::string& word : words) text += "\"" + word + "\" ";
  return text;
}

}  // namespace SecPolicyFuzz
