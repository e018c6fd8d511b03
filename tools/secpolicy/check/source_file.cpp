#include "source_file.h"

#include <array>
#include <fstream>
#include <queue>
#include <utility>

#include "policy/limits.h"
#include "secpolicy/secpolicy.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

// Up to the first line that is too long, of which one character too many is kept: a file may hold
// anything, and the reader stops there too.
std::vector<std::string> ReadLines(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  std::array<char, Policy::kLongestLine + 2> buffer;
  std::vector<std::string> texts;
  while (file.good()) {
    file.getline(buffer.data(), buffer.size());
    const auto taken = static_cast<std::size_t>(file.gcount());
    const bool hasLineFeed = taken > 0 && file.good();
    texts.emplace_back(buffer.data(), taken - (hasLineFeed ? 1 : 0));
    if (texts.back().size() > Policy::kLongestLine) break;
  }
  return texts;
}

SourceFile::Words ToWords(std::queue<std::string>& queue) {
  SourceFile::Words words;
  for (; !queue.empty(); queue.pop()) words.push_back(std::move(queue.front()));
  return words;
}

}  // namespace

SourceFile::SourceFile(const std::string& filePath, const std::string& contentPath)
    : path(filePath) {
  std::map<unsigned int, std::queue<std::string>> parsed;
  SecPolicy::ParseFile(contentPath, parsed);
  for (auto& [number, words] : parsed) lines.emplace(number, ToWords(words));
  texts = ReadLines(contentPath);
}

Diagnostic SourceFile::About(const Code& code, std::string message, Hint hint) const {
  Diagnostic diagnostic;
  diagnostic.code = &code;
  diagnostic.file = path;
  diagnostic.message = std::move(message);
  diagnostic.hint = std::move(hint);
  return diagnostic;
}

Diagnostic SourceFile::AtBytes(const Code& code, unsigned int number, std::size_t offset,
                               std::size_t size, std::string message, Hint hint) const {
  const std::string_view text = Text(number);
  Diagnostic diagnostic = About(code, std::move(message), std::move(hint));
  diagnostic.line = number;
  diagnostic.column = CountCharacters(text.substr(0, offset)) + 1;
  diagnostic.length = CountCharacters(text.substr(offset, size));
  diagnostic.source = text;
  return diagnostic;
}

Diagnostic SourceFile::AtWords(const Code& code, unsigned int number, std::size_t first,
                               std::size_t last, std::string message, Hint hint) const {
  const std::string_view text = Text(number);
  const Words& words = lines.at(number);
  std::size_t begin = 0;
  std::size_t end = 0;
  for (std::size_t i = 0; i <= last && i < words.size(); ++i) {
    const std::size_t start = text.find(words[i], end);
    if (i == first) begin = start;
    end = start + words[i].size();
  }
  return AtBytes(code, number, begin, end - begin, std::move(message), std::move(hint));
}

void SourceFile::CheckBytes(DiagnosticList& diagnostics) const {
  constexpr std::string_view kByteOrderMark = "\xef\xbb\xbf";
  if (texts.front().starts_with(kByteOrderMark)) {
    diagnostics.Add(AtBytes(Codes::kByteOrderMark, 1, 0, kByteOrderMark.size(),
                            "a byte order mark is part of the first word",
                            "save the file as UTF-8 without it"));
  }
  unsigned int number = 0;
  for (const std::string_view text : texts) {
    ++number;
    const std::size_t nul = text.find('\0');
    if (nul < Policy::kLongestLine) {
      diagnostics.Add(AtBytes(Codes::kNulByte, number, nul, 1,
                              "a NUL byte ends this line; what follows it is not read"));
    }
    if (text.size() <= Policy::kLongestLine) continue;
    diagnostics.Add(AtBytes(Codes::kLongLine, number, Policy::kLongestLine, 1,
                            "this line has more than 1023 characters: the rest of it and all lines "
                            "below it are not read"));
    break;
  }
  for (const auto& [line, words] : lines) CheckWords(line, words, diagnostics);
}

void SourceFile::CheckWords(unsigned int number, const Words& words,
                            DiagnosticList& diagnostics) const {
  const std::string_view text = Text(number);
  // Nearly every line: nothing to look for word by word.
  if (text.find_first_of("\t\r") == std::string_view::npos) return;
  std::size_t end = 0;
  for (const std::string& word : words) {
    const std::size_t start = text.find(word, end);
    end = start + word.size();
    const std::size_t tab = word.find('\t');
    if (tab != std::string::npos) {
      diagnostics.Add(AtBytes(Codes::kTab, number, start + tab, 1,
                              "this tab is part of a word: only spaces separate words"));
    }
    const std::size_t carriageReturn = word.find('\r');
    if (carriageReturn != std::string::npos) {
      diagnostics.Add(AtBytes(Codes::kCarriageReturn, number, start + carriageReturn, 1,
                              "this carriage return is part of a word: lines end with a line feed "
                              "alone"));
    }
  }
}

}  // namespace SecPolicyCli
