// Hunts text that commands a terminal, turns the direction of what stands behind it, or counts
// wrong.

#include <gtest/gtest.h>

#include <sstream>
#include <string>
#include <vector>

#include "text/format.h"
#include "text/shell_word.h"
#include "text/visible.h"
#include "text/wrap.h"

namespace {

using SecPolicyCli::CountCharacters;
using SecPolicyCli::CountOf;
using SecPolicyCli::IsoTime;
using SecPolicyCli::ShellWord;
using SecPolicyCli::UtcTime;
using SecPolicyCli::Visible;
using SecPolicyCli::VisibleLines;
using SecPolicyCli::Wrap;
using SecPolicyCli::WriteSection;

struct Shown {
  std::string text;
  std::string visible;
  std::size_t characters;
};

void PrintTo(const Shown& shown, std::ostream* stream) { *stream << shown.visible; }

class VisibleText : public testing::TestWithParam<Shown> {};

TEST_P(VisibleText, CommandsNothing) {
  EXPECT_EQ(Visible(GetParam().text), GetParam().visible);
  EXPECT_EQ(CountCharacters(GetParam().text), GetParam().characters);
}

INSTANTIATE_TEST_SUITE_P(
    Texts, VisibleText,
    testing::Values(Shown{"", "", 0}, Shown{"/etc/ssh key", "/etc/ssh key", 12},
                    Shown{"a\tb\nc", "a^Ib^Jc", 5}, Shown{"\x1b[31m", "^[[31m", 5},
                    Shown{"\x7f", "^?", 1}, Shown{std::string(1, '\0'), "^@", 1},
                    // The second set of control characters, as one character and as a byte.
                    Shown{"\xc2\x9b", "<U+009B>", 1}, Shown{"\x9b", "<9B>", 1},
                    Shown{"\xe2\x80\xae", "<U+202E>", 1}, Shown{"\xef\xbb\xbf", "<U+FEFF>", 1},
                    // Letters of two, three and four bytes.
                    Shown{"\xc3\xa9\xe2\x82\xac\xf0\x9f\x94\x92",
                          "\xc3\xa9\xe2\x82\xac\xf0\x9f\x94\x92", 3},
                    // Cut off, too long for what it says, a surrogate, beyond the last character.
                    Shown{"\xe2\x82", "<E2><82>", 2}, Shown{"\xc0\xaf", "<C0><AF>", 2},
                    Shown{"\xed\xa0\x80", "<ED><A0><80>", 3},
                    Shown{"\xf4\x90\x80\x80", "<F4><90><80><80>", 4}));

TEST(VisibleLines, KeepsTheEndsOfLines) {
  EXPECT_EQ(VisibleLines("one\n\ttwo\x1b\n"), "one\n^Itwo^[\n");
}

TEST(CountOf, KnowsOneFromMany) {
  EXPECT_EQ(CountOf(0, "file"), "0 files");
  EXPECT_EQ(CountOf(1, "file"), "1 file");
  EXPECT_EQ(CountOf(2, "file"), "2 files");
}

TEST(Times, AreOfGreenwich) {
  EXPECT_EQ(UtcTime(0), "1970-01-01 00:00:00 UTC");
  EXPECT_EQ(UtcTime(951'825'599), "2000-02-29 11:59:59 UTC");
  EXPECT_EQ(IsoTime(951'825'599), "2000-02-29T11:59:59Z");
}

std::string Section(const std::vector<std::string>& lines, std::size_t maximum) {
  std::ostringstream output;
  WriteSection("files", lines, maximum, output);
  return output.str();
}

TEST(WriteSection, ShowsNoMoreThanItMay) {
  EXPECT_EQ(Section({}, 2), "");
  EXPECT_EQ(Section({"a", "b"}, 2), "files (2):\n  a\n  b\n");
  EXPECT_EQ(Section({"a", "b\x1b", "c"}, 2),
            "files (3):\n  a\n  b^[\n  ... and 1 more; -v shows all\n");
}

struct Wrapped {
  const char* text;
  const char* wrapped;
};

TEST(WrappedText, FitsAndKeepsItsColumns) {
  const Wrapped table[] = {
      {"", ""},
      {"all of this\nfits well\n", "all of this\nfits well\n"},
      {"prose that is too wide\nfor it\n\nnext\n", "prose that is too\nwide for it\n\nnext\n"},
      {"prose that is too wide", "prose that is too\nwide"},
      {"  indented and too wide", "  indented and too\n  wide"},
      {"a  what a does is to sort", "a  what a does is to\n   sort"},
      {"too-far-right  what is meant", "too-far-right  what\nis meant"},
      {"averyveryverylongwordthat stays", "averyveryverylongwordthat\nstays"},
      {"```\na line of a program is not wrapped\n```",
       "```\na line of a program is not wrapped\n```"},
      {"- one item\n- another item that is wide", "- one item\n- another item that\nis wide"},
      {"\xc3\xa4\xc3\xa4\xc3\xa4\xc3\xa4\xc3\xa4 \xc3\xa4\xc3\xa4\xc3\xa4\xc3\xa4\xc3\xa4 1234 "
       "5678",
       "\xc3\xa4\xc3\xa4\xc3\xa4\xc3\xa4\xc3\xa4 \xc3\xa4\xc3\xa4\xc3\xa4\xc3\xa4\xc3\xa4 "
       "1234\n5678"},
  };
  for (const auto& [text, wrapped] : table) EXPECT_EQ(Wrap(text, 20), wrapped);
}

TEST(ShellWords, AreQuotedWhereAShellWouldTakeThemForSomethingElse) {
  const std::pair<const char*, const char*> table[] = {
      {"/srv/r-1", "/srv/r-1"},
      {"job@7:a+b", "job@7:a+b"},
      {"", R"("")"},
      {"a b", R"("a b")"},
      {"a'b", R"("a'b")"},
      {"*", R"("*")"},
      {"a;b", R"("a;b")"},
      {R"(a"$b`\)", R"("a\"\$b\`\\")"},
  };
  for (const auto& [word, quoted] : table) EXPECT_EQ(ShellWord(word), quoted);
}

}  // namespace
