// Hunts messages that come in pieces, places in texts that editors count otherwise, and formatting
// that changes what the library reads.

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <map>
#include <queue>
#include <random>
#include <string>
#include <variant>
#include <vector>

#include "json_reader.h"
#include "lsp/format.h"
#include "lsp/framing.h"
#include "lsp/text_document.h"
#include "secpolicy/secpolicy.h"
#include "support/temporary_directory.h"
#include "text/uri.h"

namespace {

using SecPolicyCli::FileRole;
using SecPolicyCli::FormatLines;
using SecPolicyCli::Frame;
using SecPolicyCli::FramingError;
using SecPolicyCli::Json;
using SecPolicyCli::MessageBuffer;
using SecPolicyCli::PathOfUri;
using SecPolicyCli::Position;
using SecPolicyCli::ReadJson;
using SecPolicyCli::TextDocument;
using SecPolicyCli::ToUri;

using Parsed = std::map<unsigned int, std::queue<std::string>>;

constexpr char kSmile[] = "\xf0\x9f\x98\x80";

TEST(MessageBuffer, TakesMessagesThatComeByteByByte) {
  MessageBuffer buffer;
  std::vector<std::string> taken;
  for (const char byte : Frame("{}") + Frame("") + "content-length:  2 \r\nX: y\r\n\r\n[]") {
    buffer.Append({&byte, 1});
    while (const auto message = buffer.Take()) taken.push_back(*message);
  }
  EXPECT_EQ(taken, (std::vector<std::string>{"{}", "", "[]"}));
  EXPECT_FALSE(buffer.HasBegun());
}

TEST(MessageBuffer, RefusesWhatIsNoHeader) {
  const std::map<std::string, std::string> refused = {
      {"Content-Type: x\r\n\r\n", "the header of a message has no Content-Length"},
      {"Content-Length: 12x\r\n\r\n", "the length of a message is no number: 12x"},
      {"Content-Length: -1\r\n\r\n", "the length of a message is no number: -1"},
      {"Content-Length: 67108865\r\n\r\n", "a message is too long: 67108865 bytes"},
      {"hello\r\n\r\n", "a line of a message's header has no colon: hello"},
      {std::string(5000, 'x'), "the header of a message does not end"}};
  for (const auto& [bytes, why] : refused) {
    MessageBuffer buffer;
    buffer.Append(bytes);
    try {
      buffer.Take();
      ADD_FAILURE() << "taken: " << bytes;
    } catch (const FramingError& refusal) {
      EXPECT_EQ(refusal.what(), why);
    }
  }
}

TEST(ReadJson, ReadsWhatJsonWrites) {
  Json list = Json::Array();
  list.Append(true);
  list.Append(-7);
  list.Append("a\"\\\n\t\x01 \u00e9\U0001f600");
  list.Append(Json());
  const Json document = {{"list", list}, {"object", {{"", Json::Object()}}}};
  EXPECT_EQ(std::get<Json>(ReadJson(document.Line())), document);
  EXPECT_EQ(std::get<Json>(ReadJson(document.Text())), document);
}

TEST(ReadJson, TellsWhatIsWrong) {
  EXPECT_TRUE(std::holds_alternative<std::string>(ReadJson("{\"a\": }")));
  EXPECT_TRUE(std::holds_alternative<std::string>(ReadJson("")));
  const std::string deep(100000, '[');
  EXPECT_EQ(std::get<std::string>(ReadJson(deep)), "it is nested too deeply");
  EXPECT_TRUE(std::get<Json>(ReadJson("1.5")).IsNull());
  EXPECT_TRUE(std::get<Json>(ReadJson("18446744073709551615")).IsNull());
}

TEST(Uri, GivesBackEveryPath) {
  for (const std::string path : {"/", "/a b/%41#?", "/\xc3\xa9\x1b\xff"}) {
    EXPECT_EQ(PathOfUri(ToUri(path)), path);
  }
  EXPECT_EQ(PathOfUri("file://localhost/a%2fb%zz%"), "/a/b%zz%");
  EXPECT_EQ(PathOfUri("file://elsewhere/a"), std::nullopt);
  EXPECT_EQ(PathOfUri("untitled:a"), std::nullopt);
}

TEST(TextDocument, CountsAsEditorsDo) {
  // Two units, a pair that ends a line, a carriage return that does, and a byte that is no UTF-8.
  const TextDocument text(std::string(kSmile) + "a\r\nb\rc\xff" + "d\n");
  EXPECT_EQ(text.OffsetAt({0, 2}), 4U);
  EXPECT_EQ(text.OffsetAt({0, 1}), 0U);
  EXPECT_EQ(text.OffsetAt({0, 99}), 5U);
  EXPECT_EQ(text.OffsetAt({2, 2}), text.Text().find('d'));
  EXPECT_EQ(text.OffsetAt({9, 9}), text.Text().size());
  EXPECT_EQ(text.PositionAt(text.Text().find('d')), (Position{2, 2}));
  // Between a carriage return and its line feed is no place.
  EXPECT_EQ(text.PositionAt(6), (Position{0, 3}));
  EXPECT_EQ(text.LineCount(), 3U);
  EXPECT_EQ(text.Line(2),
            "b\rc\xff"
            "d");
  EXPECT_EQ(text.LineAt(text.Text().find('d')), 2U);
  EXPECT_EQ(text.Line(4), "");
}

TEST(TextDocument, ReplacesRanges) {
  TextDocument text("one\ntwo");
  text.Replace({{0, 2}, {1, 1}}, "\r\n");
  EXPECT_EQ(text.Text(), "on\r\nwo");
  text.Replace({{1, 1}, {0, 0}}, "X");
  EXPECT_EQ(text.Text(), "on\r\nwXo");
  text.Replace({{7, 7}, {9, 9}}, "\n");
  EXPECT_EQ(text.Text(), "on\r\nwXo\n");
}

std::string Join(const std::vector<std::string>& lines) {
  std::string text;
  for (const std::string& line : lines) text += (&line == lines.data() ? "" : "\n") + line;
  return text;
}

class Formatting : public testing::Test {
 protected:
  Parsed Read(const std::string& text) {
    std::ofstream(file, std::ios::binary) << text;
    Parsed parsed;
    SecPolicy::ParseFile(file, parsed);
    return parsed;
  }

  void ExpectSameMeaning(FileRole role, const std::string& text) {
    const std::string formatted = Join(FormatLines(role, TextDocument(text)));
    ASSERT_EQ(Read(formatted), Read(text)) << text << "\n--- became\n" << formatted;
    ASSERT_EQ(Join(FormatLines(role, TextDocument(formatted))), formatted) << "of " << text;
    ASSERT_EQ(Read(formatted + "\n"), Read(text)) << text;
  }

 private:
  SecPolicyTest::TemporaryDirectory directory;
  const std::string file = directory / "file";
};

TEST_F(Formatting, AlignsColumnsAndKeepsComments) {
  EXPECT_EQ(Join(FormatLines(FileRole::kDomainFile, TextDocument("# all\n"
                                                                 "  -a   tool read grant# why\n"
                                                                 "-a longerLabel list  revoke  \n"
                                                                 "-s read grant\n"
                                                                 "\n"
                                                                 "-p bind_port 80 grant # http\n"
                                                                 "-p bind_port 8000 8099 grant\n"
                                                                 "-r /f\u00fcr r\n"
                                                                 "-r /long rw\r\n"))),
            "# all\n"
            "-a tool        read grant    # why\n"
            "-a longerLabel list revoke\n"
            "-s read grant\n"
            "\n"
            "-p bind_port 80        grant   # http\n"
            "-p bind_port 8000 8099 grant\n"
            "-r /f\u00fcr  r\n"
            "-r /long rw\r\n");
}

TEST_F(Formatting, ChangesNothingThatIsRead) {
  constexpr FileRole kRoles[] = {FileRole::kDomainFile, FileRole::kObjectFile, FileRole::kLabelFile,
                                 FileRole::kTardiskFile};
  const std::vector<std::string> pieces = {"-a",
                                           "-p",
                                           "tool",
                                           "grant",
                                           " ",
                                           " ",
                                           "   ",
                                           "\n",
                                           "\n",
                                           "#",
                                           "\t",
                                           "\r\n",
                                           "\r",
                                           kSmile,
                                           "\xff",
                                           "/srv/*",
                                           "# x ",
                                           "\n\n",
                                           std::string(1, '\0'),
                                           std::string(340, 'x'),
                                           std::string(340, ' ')};
  for (unsigned int seed = 0; seed < 1500; ++seed) {
    std::mt19937 chance(seed);
    std::string text;
    for (auto count = chance() % 40; count > 0; --count) text += pieces[chance() % pieces.size()];
    ExpectSameMeaning(kRoles[chance() % 4], text);
    if (HasFatalFailure()) return;
  }
}

TEST_F(Formatting, ChangesNothingThatIsReadOfTheExamples) {
  int count = 0;
  for (const auto& entry : std::filesystem::recursive_directory_iterator(
           SECPOLICY_EXAMPLES, std::filesystem::directory_options::none)) {
    if (!entry.is_regular_file()) continue;
    std::ifstream input(entry.path(), std::ios::binary);
    ExpectSameMeaning(FileRole::kDomainFile,
                      std::string(std::istreambuf_iterator<char>(input), {}));
    ++count;
  }
  EXPECT_GT(count, 20);
}

}  // namespace
