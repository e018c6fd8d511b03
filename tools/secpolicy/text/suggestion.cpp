#include "suggestion.h"

#include <algorithm>
#include <bit>
#include <cctype>
#include <cstdlib>
#include <numeric>

namespace SecPolicyCli {
namespace {

// Different questions that are answered.
constexpr std::size_t kMostAnswers = 5000;

// However long the word.
constexpr std::size_t kFarthest = 4;

std::string LowerCase(std::string text) {
  std::transform(text.begin(), text.end(), text.begin(),
                 [](unsigned char letter) { return static_cast<char>(std::tolower(letter)); });
  return text;
}

std::uint64_t LettersOf(const std::string& text) {
  std::uint64_t letters = 0;
  for (const char letter : text) letters |= std::uint64_t{1} << (letter & 0x3f);
  return letters;
}

// How many letters have to be added, dropped, replaced or swapped with their neighbour to make
// `other` of `one`; `bound` when it takes so many or more. Only what lies near the diagonal can be
// below the bound, so nothing else is looked at.
std::size_t EditDistance(const std::string& one, const std::string& other, std::size_t bound) {
  std::vector<std::size_t> beforeLast(other.size() + 1, bound);
  std::vector<std::size_t> last(other.size() + 1, bound);
  std::vector<std::size_t> current(other.size() + 1, bound);
  std::iota(last.begin(), last.end(), 0U);
  for (std::size_t i = 1; i <= one.size(); ++i) {
    const std::size_t begin = i > bound ? i - bound : 1;
    const std::size_t end = std::min(i + bound, other.size() + 1);
    current[begin - 1] = begin == 1 ? i : bound;
    std::size_t nearest = current[begin - 1];
    for (std::size_t j = begin; j < end; ++j) {
      const std::size_t replaced = last[j - 1] + (one[i - 1] == other[j - 1] ? 0 : 1);
      current[j] = std::min({last[j] + 1, current[j - 1] + 1, replaced});
      const bool swapped =
          i > 1 && j > 1 && one[i - 1] == other[j - 2] && one[i - 2] == other[j - 1];
      if (swapped) current[j] = std::min(current[j], beforeLast[j - 2] + 1);
      nearest = std::min(nearest, current[j]);
    }
    if (end <= other.size()) current[end] = bound;
    if (nearest >= bound) return bound;
    beforeLast.swap(last);
    last.swap(current);
  }
  return std::min(last.back(), bound);
}

// A short word with one letter changed may be anything.
std::size_t FarthestSuggestion(const std::string& word) {
  return word.size() < 3 ? 0 : std::clamp<std::size_t>(word.size() / 3, 1, kFarthest);
}

}  // namespace

Vocabulary::Vocabulary(const std::vector<std::string>& words) {
  for (const std::string& word : words) {
    const std::string lowerCase = LowerCase(word);
    entries.push_back({word, lowerCase, LettersOf(lowerCase)});
  }
}

std::string Vocabulary::Nearest(const std::string& word) {
  const auto answer = answers.find(word);
  if (answer != answers.end()) return answer->second;
  if (answers.size() == kMostAnswers) return "";
  return answers[word] = FindNearest(word);
}

std::string Vocabulary::FindNearest(const std::string& word) const {
  const std::string wanted = LowerCase(word);
  const std::uint64_t letters = LettersOf(wanted);
  std::size_t nearest = FarthestSuggestion(word) + 1;
  std::string suggestion;
  for (const Entry& entry : entries) {
    // One change takes at most one letter away and brings one.
    if (static_cast<std::size_t>(std::popcount(letters ^ entry.letters)) > 2 * (nearest - 1)) {
      continue;
    }
    const std::size_t longer = std::max(entry.lowerCase.size(), wanted.size());
    if (longer - std::min(entry.lowerCase.size(), wanted.size()) >= nearest) continue;
    const std::size_t distance = EditDistance(wanted, entry.lowerCase, nearest);
    if (distance >= nearest) continue;
    nearest = distance;
    suggestion = entry.word;
    if (nearest == 0) break;
  }
  return suggestion;
}

std::string NearestWord(const std::string& word, const std::vector<std::string>& candidates) {
  return Vocabulary(candidates).Nearest(word);
}

}  // namespace SecPolicyCli
