#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <string>
#include <vector>

namespace SecPolicyCli {

// Words that something can be a misspelling of.
class Vocabulary {
 public:
  explicit Vocabulary(const std::vector<std::string>& words);

  // The word that `word` is most likely a misspelling of, the first one of several; empty when none
  // is near, and after many different questions: by then it is no slip of the pen.
  std::string Nearest(const std::string& word);

  std::size_t Size() const { return entries.size(); }

 private:
  struct Entry {
    std::string word;
    std::string lowerCase;
    std::uint64_t letters;  // a bit for each letter that is in it
  };

  std::string FindNearest(const std::string& word) const;

  std::vector<Entry> entries;
  std::map<std::string, std::string> answers;
};

// The same for one question.
std::string NearestWord(const std::string& word, const std::vector<std::string>& candidates);

}  // namespace SecPolicyCli
