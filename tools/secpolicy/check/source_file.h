#pragma once

#include <deque>
#include <map>
#include <queue>
#include <string>
#include <string_view>
#include <vector>

#include "diagnostic.h"

namespace SecPolicyCli {

// A policy file: its words as the library reads them, and its bytes to point into, as far as the
// library reads them.
class SourceFile {
 public:
  using Words = std::vector<std::string>;

  // Reads the file, whose content may lie in another one. Throws BraxoException, in the library's
  // words, when that cannot be opened.
  explicit SourceFile(const std::string& filePath) : SourceFile(filePath, filePath) {}
  SourceFile(const std::string& filePath, const std::string& contentPath);

  const std::string& Path() const { return path; }

  // The lines that have words, by number from 1, as far as the library reads the file.
  const std::map<unsigned int, Words>& Lines() const { return lines; }

  // The bytes of the line `number`, without its line feed; of one that is too long, its beginning.
  std::string_view Text(unsigned int number) const { return texts.at(number - 1); }

  // The words of the line `number`, for the library.
  std::queue<std::string> TokensOf(unsigned int number) const {
    const Words& words = lines.at(number);
    return std::queue<std::string>(std::deque<std::string>(words.begin(), words.end()));
  }

  // A problem of the whole file.
  Diagnostic About(const Code& code, std::string message, Hint hint = {}) const;

  // A problem of the words `first` to `last` of the line `number`, counted from 0.
  Diagnostic AtWords(const Code& code, unsigned int number, std::size_t first, std::size_t last,
                     std::string message, Hint hint = {}) const;
  Diagnostic AtWord(const Code& code, unsigned int number, std::size_t word, std::string message,
                    Hint hint = {}) const {
    return AtWords(code, number, word, word, std::move(message), std::move(hint));
  }

  // A problem of `size` bytes of the line `number` from the byte `offset` on.
  Diagnostic AtBytes(const Code& code, unsigned int number, std::size_t offset, std::size_t size,
                     std::string message, Hint hint = {}) const;

  // Adds what the library reads otherwise than it looks.
  void CheckBytes(DiagnosticList& diagnostics) const;

 private:
  void CheckWords(unsigned int number, const Words& words, DiagnosticList& diagnostics) const;

  std::string path;
  std::vector<std::string> texts;
  std::map<unsigned int, Words> lines;
};

}  // namespace SecPolicyCli
