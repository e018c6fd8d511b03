#pragma once

#include <map>
#include <string>
#include <vector>

#include "teskctl/security.h"

namespace CorpusTest {

// The words that the corpus is made of.
struct Words {
  std::string domain;  // the one whose policy is read
  std::vector<std::string> labels;
  std::vector<std::string> domains;
  std::vector<std::string> launchDomains;
  std::string tardisk;
  std::map<TeskCtl::Security::TeskAccess_KeywordType, std::vector<std::string>> keywords;
};

}  // namespace CorpusTest
