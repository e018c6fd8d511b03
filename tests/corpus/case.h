#pragma once

#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <vector>

#include "words.h"

namespace CorpusTest {

Words ReadWords();

// One input with what has to come of it.
class Case {
 public:
  explicit Case(nlohmann::json read) : json(std::move(read)) {}

  std::string Name() const { return Text("case"); }
  bool Has(const char* key) const { return json.contains(key); }

  // The text at `key`, empty when there is none. A character of the corpus is one byte.
  std::string Text(const char* key) const;
  unsigned int Number(const char* key) const { return json.at(key).get<unsigned int>(); }

  // A list of lists at `key`, with every item as text; empty when there is none.
  std::vector<std::vector<std::string>> Rows(const char* key) const;
  // A list of texts.
  std::vector<std::string> Texts(const char* key) const;

  // The whole error at `key`, empty when there is none, for an input in `file`. Asks the host for
  // its own words.
  std::string Error(const char* key, const std::string& file) const;

 private:
  nlohmann::json json;
};

// The cases of the file `suite`.jsonl.
std::vector<Case> ReadCases(const std::string& suite);

// The file that the inputs are written to; there until the process ends.
const std::string& WriteInput(const Case& input);

}  // namespace CorpusTest
