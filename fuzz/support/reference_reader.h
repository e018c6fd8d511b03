#pragma once

#include <map>
#include <optional>
#include <queue>
#include <string>
#include <string_view>
#include <vector>

// A second reader of the policy format, written for comparison: slow and obvious.
namespace SecPolicyFuzz {

using Words = std::vector<std::string>;
using Lines = std::map<unsigned int, Words>;  // by line number, only lines that have words

// The words of a line, up to its comment.
Words ReadLine(std::string_view line);

// The lines of a file.
Lines ReadFile(std::string_view file);

// The words of a queue as the library uses it.
Words ToWords(std::queue<std::string> words);

// What the letters of a file-path rule mean.
struct Permission {
  std::optional<unsigned int> mask;
  std::string refusal;  // where there is no mask
};
Permission ReadPermission(const std::string& letters);

// The text of the input that a fuzzer hands over.
std::string_view Text(const unsigned char* data, std::size_t size);

// The words, each in quotes, for messages and comparison.
std::string Show(const Words& words);

}  // namespace SecPolicyFuzz
