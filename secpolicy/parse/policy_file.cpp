#include <array>
#include <fstream>
#include <string_view>

#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {
namespace {

constexpr std::size_t kLineBufferSize = 1024;

std::string_view WithoutComment(std::string_view line) { return line.substr(0, line.find('#')); }

bool HasTokens(std::string_view text) {
  return text.find_first_not_of(' ') != std::string_view::npos;
}

void PushTokens(std::string_view text, std::queue<std::string>& tokens) {
  std::size_t start = text.find_first_not_of(' ');
  while (start != std::string_view::npos) {
    const std::size_t end = text.find(' ', start);
    tokens.emplace(text.substr(start, end - start));
    start = text.find_first_not_of(' ', end);
  }
}

}  // namespace

std::queue<std::string> StringToQueue(const std::string& text) {
  std::queue<std::string> tokens;
  PushTokens(text, tokens);
  return tokens;
}

std::queue<std::string> ParsePolicyLine(const std::string& line) {
  std::queue<std::string> tokens;
  PushTokens(WithoutComment(line), tokens);
  return tokens;
}

void ParseFile(const std::string& path, std::map<unsigned int, std::queue<std::string>>& parsed) {
  std::ifstream file(path);
  if (!file) RaiseError("Unable to open policy file " + path);

  std::array<char, kLineBufferSize> buffer;
  // The line is used before the stream is asked: the last one may lack its line feed. A line that
  // does not fit the buffer puts the stream into its fail state, which ends the file there.
  for (unsigned int number = 1; file.good(); ++number) {
    file.getline(buffer.data(), buffer.size());
    const std::string_view line = WithoutComment(buffer.data());
    if (!HasTokens(line)) continue;

    const auto [entry, isNew] = parsed.try_emplace(number);
    if (!isNew) entry->second = {};
    PushTokens(line, entry->second);
  }
}

bool IsGrant(std::string& word) {
  if (word == "grant") return true;
  if (word == "revoke") return false;
  RaiseError("invalid keyword " + word);
}

}  // namespace SecPolicy
