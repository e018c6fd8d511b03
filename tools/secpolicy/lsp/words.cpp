#include "words.h"

#include <array>
#include <queue>
#include <span>

#include "policy/limits.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyCli {
namespace {

using Policy::WordKind;

constexpr std::array kObjectWords = {WordKind::kLabel};
constexpr std::array kLabelWords = {WordKind::kPath, WordKind::kLabel};
constexpr std::array kTardiskWords = {WordKind::kLabel, WordKind::kDomain};

// Files of these have lines of one form, which need no keyword.
bool HasKeywords(FileRole role) {
  return role == FileRole::kDomainFile || role == FileRole::kTardiskFile;
}

std::span<const WordKind> KindsOf(FileRole role, std::string_view keyword) {
  if (role == FileRole::kObjectFile) return kObjectWords;
  if (role == FileRole::kLabelFile) return kLabelWords;
  if (role == FileRole::kTardiskFile) return kTardiskWords;
  const Policy::RuleForm* const form = Policy::FindRuleForm(keyword);
  return form == nullptr ? std::span<const WordKind>() : form->Words();
}

// A second number may be missing.
bool IsVerdict(FileRole role, const std::vector<PlacedWord>& words, std::size_t index) {
  return role == FileRole::kDomainFile && index + 1 == words.size() &&
         IsGrantWord(words[index].text);
}

}  // namespace

bool IsGrantWord(const std::string& word) { return word == "grant" || word == "revoke"; }

std::string_view ReadPart(std::string_view line) {
  line = line.substr(0, Policy::kLongestLine);
  line = line.substr(0, line.find('\0'));
  return line.substr(0, line.find('#'));
}

std::vector<PlacedWord> PlaceWords(FileRole role, std::string_view line) {
  const std::string_view text = ReadPart(line);
  std::vector<PlacedWord> words;
  std::size_t end = 0;
  for (auto queue = SecPolicy::ParsePolicyLine(std::string(text)); !queue.empty(); queue.pop()) {
    const std::size_t begin = text.find(queue.front(), end);
    end = begin + queue.front().size();
    words.push_back({queue.front(), {begin, end}});
  }
  if (words.empty()) return words;
  const std::size_t first = HasKeywords(role) ? 1 : 0;
  const auto kinds = KindsOf(role, words.front().text);
  for (std::size_t i = 0; i < kinds.size() && first + i < words.size(); ++i) {
    if (!IsVerdict(role, words, first + i)) words[first + i].kind = kinds[i];
  }
  return words;
}

Expected ExpectedAfter(FileRole role, const std::vector<PlacedWord>& before) {
  if (before.empty() && HasKeywords(role)) return {.keyword = true};
  const auto kinds = KindsOf(role, before.empty() ? "" : before.front().text);
  const std::size_t index = before.size() - (HasKeywords(role) ? 1 : 0);
  Expected expected;
  if (index < kinds.size()) expected.kind = kinds[index];
  if (role != FileRole::kDomainFile || index > kinds.size()) return expected;
  const Policy::RuleForm* const form = Policy::FindRuleForm(before.front().text);
  if (form == nullptr || index < form->MinWords()) return expected;
  expected.verdict = form->endsInGrant && !IsGrantWord(before.back().text);
  expected.permissions = !form->endsInGrant;
  return expected;
}

}  // namespace SecPolicyCli
