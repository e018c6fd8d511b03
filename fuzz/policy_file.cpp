// A policy file: the library reads what the reference reader reads, and keeps what was there.

#include <cstdint>
#include <map>
#include <queue>

#include "secpolicy/secpolicy.h"
#include "support/memory_file.h"
#include "support/reference_reader.h"
#include "support/require.h"

namespace SecPolicyFuzz {
namespace {
using Parsed = std::map<unsigned int, std::queue<std::string>>;

constexpr unsigned int kBeyondEveryFile = 4'000'000'000;

std::string ShowLines(const Lines& lines) {
  std::string text;
  for (const auto& [number, words] : lines)
    text += std::to_string(number) + ": " + Show(words) + "\n";
  return text;
}

std::string ShowParsed(const Parsed& parsed) {
  Lines lines;
  for (const auto& [number, words] : parsed) lines[number] = ToWords(words);
  return ShowLines(lines);
}

void CheckReading(const std::string& path, const Lines& expected) {
  Parsed parsed;
  SecPolicy::ParseFile(path, parsed);
  RequireEqual(ShowParsed(parsed), ShowLines(expected), "the lines of a file");
}

// Lines that the file has too are replaced, the others are kept.
void CheckReadingOver(const std::string& path, const Lines& expected) {
  const Lines before = {{1, {"old", "words"}}, {2, {"older"}}, {kBeyondEveryFile, {"kept"}}};
  Parsed parsed;
  for (const auto& [number, words] : before) {
    for (const std::string& word : words) parsed[number].push(word);
  }
  SecPolicy::ParseFile(path, parsed);
  Lines both = expected;
  both.insert(before.begin(), before.end());
  RequireEqual(ShowParsed(parsed), ShowLines(both), "the lines of a file over earlier lines");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const MemoryFile file;
  file.Write(Text(data, size));
  const Lines expected = ReadFile(Text(data, size));
  CheckReading(file.Path(), expected);
  CheckReadingOver(file.Path(), expected);
  return 0;
}

}  // namespace SecPolicyFuzz
