// JSON that another writer would have written otherwise: bytes that are no UTF-8, control
// characters, nesting, the order of members.

#include "json.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>
#include <string_view>

namespace {

using SecPolicyCli::Json;
using Judge = nlohmann::ordered_json;

std::string JudgeText(const Judge& value) {
  return value.dump(2, ' ', false, Judge::error_handler_t::replace) + "\n";
}

// Both sides of every border that UTF-8 and JSON draw.
constexpr std::string_view kBytes(
    "\x00\x08\x09\x0a\x0d\x1f\x20\"/A\\\x7f\x80\x8f\x90\x9f\xa0\xbf\xc0\xc1\xc2\xdf\xe0\xe1\xec\xed"
    "\xee\xef\xf0\xf1\xf3\xf4\xf5\xff",
    34);

// Which characters are written as numbers is not looked at.
void ExpectAsJudged(const std::string& text) {
  const std::string written = Json(text).Text();
  ASSERT_EQ(Judge::parse(written), Judge::parse(JudgeText(text))) << written;
}

TEST(JsonText, ReplacesWhatIsNoUtf8AsAnotherWriterDoes) {
  for (const char first : kBytes) {
    for (const char second : kBytes) {
      for (const char third : kBytes) ExpectAsJudged({first, second, third});
    }
  }
}

TEST(JsonText, WritesCharactersOfFourBytes) {
  for (const char first : {'\xf0', '\xf1', '\xf4', '\xf5'}) {
    for (const char second : kBytes) {
      for (const char third : {'\x7f', '\x80', '\xbf', '\xc0'}) {
        for (const char fourth : kBytes) ExpectAsJudged({first, second, third, fourth, 'x'});
      }
    }
  }
}

TEST(JsonText, NestsAsAnotherWriterDoes) {
  Json list = Json::Array();
  list.Append(true);
  list.Append({{"empty", Json::Array()}, {"none", Json()}});
  Json document = {{"b", list}, {"a", -1}, {"nothing", Json::Object()}};
  document["words"] = std::vector<std::string>{"x", ""};
  document["a"] = 18;
  const Judge judged = {{"b", {true, {{"empty", Judge::array()}, {"none", nullptr}}}},
                        {"a", 18},
                        {"nothing", Judge::object()},
                        {"words", {"x", ""}}};
  EXPECT_EQ(document.Text(), JudgeText(judged));
}

TEST(JsonText, AddsTheMembersOfAnotherObjectInOrder) {
  Json document = {{"z", 1}};
  document.Add({{"y", 2}, {"x", false}});
  EXPECT_EQ(document.Text(), "{\n  \"z\": 1,\n  \"y\": 2,\n  \"x\": false\n}\n");
}

}  // namespace
