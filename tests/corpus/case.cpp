#include "case.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>

#include "support/message_of.h"
#include "teskctl/security.h"

namespace CorpusTest {
namespace {

using nlohmann::json;
using SecPolicyTest::MessageOf;
using TeskCtl::Security::TeskAccess_KeywordType;

std::ifstream Open(const std::string& name) {
  std::ifstream file(std::string(CORPUS_DIRECTORY) + "/" + name);
  if (!file) ADD_FAILURE() << "cannot open " << name;
  return file;
}

// The corpus writes the bytes 128 to 255 as the characters of these numbers, in UTF-8.
std::string ToBytes(const std::string& utf8) {
  std::string bytes;
  for (std::size_t index = 0; index < utf8.size(); ++index) {
    auto byte = static_cast<unsigned char>(utf8[index]);
    if (byte >= 0x80) {
      const auto second = static_cast<unsigned char>(utf8.at(++index));
      byte = static_cast<unsigned char>((byte & 0x03) << 6 | (second & 0x3f));
    }
    bytes += static_cast<char>(byte);
  }
  return bytes;
}

std::string ToText(const json& item) {
  if (item.is_string()) return ToBytes(item.get<std::string>());
  return item.dump();
}

void Replace(std::string& text, const std::string& mark, const std::string& replacement) {
  const std::size_t place = text.find(mark);
  if (place != std::string::npos) text.replace(place, mark.size(), replacement);
}

std::string HostRefusal(const json& refused) {
  TeskCtl::Security::TeskAccessInterfaceImpl access;
  const auto kind = static_cast<TeskAccess_KeywordType>(refused.at(0).get<int>());
  const std::string refusal =
      MessageOf([&] { access.ValidateKeyword(kind, ToText(refused.at(1))); });
  EXPECT_FALSE(refusal.empty()) << "the host accepts " << refused;
  return refusal;
}

class TemporaryFile {
 public:
  TemporaryFile() : path(testing::TempDir() + "/corpus-XXXXXX") {
    const int descriptor = mkstemp(path.data());
    if (descriptor < 0) ADD_FAILURE() << "no temporary file";
    close(descriptor);
  }
  TemporaryFile(const TemporaryFile&) = delete;
  TemporaryFile& operator=(const TemporaryFile&) = delete;
  ~TemporaryFile() { unlink(path.c_str()); }

  std::string path;
};

}  // namespace

Words ReadWords() {
  const json read = json::parse(Open("words.json"));
  Words words{.domain = read.at("domain"),
              .labels = read.at("labels"),
              .domains = read.at("domains"),
              .launchDomains = read.at("launchDomains"),
              .tardisk = read.at("tardisk"),
              .keywords = {}};
  for (const auto& [kind, table] : read.at("keywords").items()) {
    words.keywords[static_cast<TeskAccess_KeywordType>(std::stoi(kind))] = table;
  }
  return words;
}

std::string Case::Text(const char* key) const { return Has(key) ? ToText(json.at(key)) : ""; }

std::vector<std::string> Case::Texts(const char* key) const {
  std::vector<std::string> texts;
  if (!Has(key)) return texts;
  for (const auto& item : json.at(key)) texts.push_back(ToText(item));
  return texts;
}

std::vector<std::vector<std::string>> Case::Rows(const char* key) const {
  std::vector<std::vector<std::string>> rows;
  if (!Has(key)) return rows;
  for (const auto& row : json.at(key)) {
    rows.emplace_back();
    for (const auto& item : row) rows.back().push_back(ToText(item));
  }
  return rows;
}

std::string Case::Error(const char* key, const std::string& file) const {
  std::string error = Text(key);
  if (Has("refused")) Replace(error, "{refusal}", HostRefusal(json.at("refused")));
  Replace(error, "{file}", file);
  return error;
}

std::vector<Case> ReadCases(const std::string& suite) {
  std::ifstream file = Open(suite + ".jsonl");
  std::vector<Case> cases;
  std::string line;
  while (std::getline(file, line)) cases.emplace_back(json::parse(line));
  EXPECT_FALSE(cases.empty()) << "no cases of " << suite;
  return cases;
}

const std::string& WriteInput(const Case& input) {
  static const TemporaryFile file;
  // A file system writes one that is overwritten to its disk at once.
  unlink(file.path.c_str());
  std::ofstream(file.path, std::ios::binary) << input.Text("file");
  return file.path;
}

}  // namespace CorpusTest
