#pragma once

#include <memory>

#include "words.h"

namespace CorpusTest {

// A host that knows the labels, domains and keywords of the corpus and, of the labels and domains,
// no others. One at a time.
class CorpusHost {
 public:
  explicit CorpusHost(const Words& words);
  CorpusHost(const CorpusHost&) = delete;
  CorpusHost& operator=(const CorpusHost&) = delete;
  ~CorpusHost();

 private:
  class Impl;
  std::unique_ptr<Impl> impl;
};

}  // namespace CorpusTest
