// One line of a policy file: its words are those of the reference reader.

#include <algorithm>
#include <cstdint>

#include "secpolicy/secpolicy.h"
#include "support/message_of.h"
#include "support/reference_reader.h"
#include "support/require.h"

namespace SecPolicyFuzz {
namespace {

using SecPolicyTest::MessageOf;

void CheckGrantWord(std::string word) {
  const std::string before = word;
  bool grant = false;
  const std::string failure = MessageOf([&] { grant = SecPolicy::IsGrant(word); });
  const bool known = before == "grant" || before == "revoke";
  // A message ends at its first NUL.
  const std::string refusal = "invalid keyword " + before.substr(0, before.find('\0'));
  RequireEqual(failure, known ? "" : refusal, "refusal of a grant word");
  Require(grant == (before == "grant"), "only \"grant\" grants");
  RequireEqual(word, before, "the word is left alone");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string line(Text(data, size));
  const Words expected = ReadLine(line);
  const Words words = ToWords(SecPolicy::ParsePolicyLine(line));
  RequireEqual(Show(words), Show(expected), "the words of a line");

  // Without a comment there is no difference between a line and a text.
  const std::string text = line.substr(0, line.find('#'));
  RequireEqual(Show(ToWords(SecPolicy::StringToQueue(text))), Show(expected), "words of a text");

  // In a text a "#" is a character like any other.
  std::string marked = line;
  std::replace(marked.begin(), marked.end(), '#', '+');
  Words whole = ToWords(SecPolicy::StringToQueue(line));
  for (std::string& word : whole) std::replace(word.begin(), word.end(), '#', '+');
  RequireEqual(Show(whole), Show(ReadLine(marked)), "the words of a text with \"#\"");

  for (const std::string& word : words) CheckGrantWord(word);
  return 0;
}

}  // namespace SecPolicyFuzz
