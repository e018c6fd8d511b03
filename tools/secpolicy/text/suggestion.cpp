#include "suggestion.h"

#include <algorithm>
#include <cctype>
#include <numeric>

namespace SecPolicyCli {
namespace {

std::string LowerCase(std::string text) {
  std::transform(text.begin(), text.end(), text.begin(),
                 [](unsigned char letter) { return static_cast<char>(std::tolower(letter)); });
  return text;
}

// How many letters have to be added, dropped, replaced or swapped with their neighbour to make
// `other` of `one`.
std::size_t EditDistance(const std::string& one, const std::string& other) {
  std::vector<std::size_t> beforeLast(other.size() + 1);
  std::vector<std::size_t> last(other.size() + 1);
  std::vector<std::size_t> current(other.size() + 1);
  std::iota(last.begin(), last.end(), 0U);
  for (std::size_t i = 1; i <= one.size(); ++i) {
    current[0] = i;
    for (std::size_t j = 1; j <= other.size(); ++j) {
      const std::size_t replaced = last[j - 1] + (one[i - 1] == other[j - 1] ? 0 : 1);
      current[j] = std::min({last[j] + 1, current[j - 1] + 1, replaced});
      const bool swapped =
          i > 1 && j > 1 && one[i - 1] == other[j - 2] && one[i - 2] == other[j - 1];
      if (swapped) current[j] = std::min(current[j], beforeLast[j - 2] + 1);
    }
    beforeLast.swap(last);
    last.swap(current);
  }
  return last.back();
}

// A short word with one letter changed may be anything.
std::size_t FarthestSuggestion(const std::string& word) {
  return word.size() < 3 ? 0 : std::max<std::size_t>(1, word.size() / 3);
}

}  // namespace

std::string NearestWord(const std::string& word, const std::vector<std::string>& candidates) {
  const std::string wanted = LowerCase(word);
  std::size_t nearest = FarthestSuggestion(word) + 1;
  std::string suggestion;
  for (const std::string& candidate : candidates) {
    const std::size_t longer = std::max(candidate.size(), wanted.size());
    if (longer - std::min(candidate.size(), wanted.size()) >= nearest) continue;
    const std::size_t distance = EditDistance(wanted, LowerCase(candidate));
    if (distance >= nearest) continue;
    nearest = distance;
    suggestion = candidate;
  }
  return suggestion;
}

}  // namespace SecPolicyCli
