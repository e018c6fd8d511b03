// Hunts suggestions that miss the word that was meant, or name one that was not.

#include "text/suggestion.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using SecPolicyCli::NearestWord;
using SecPolicyCli::Vocabulary;

struct Slip {
  const char* word;
  std::vector<std::string> candidates;
  const char* nearest;  // empty: none
};

void PrintTo(const Slip& slip, std::ostream* stream) { *stream << slip.word; }

class NearestWordTest : public testing::TestWithParam<Slip> {};

TEST_P(NearestWordTest, IsTheOneThatWasMeant) {
  const auto& [word, candidates, nearest] = GetParam();
  EXPECT_EQ(NearestWord(word, candidates), nearest);
}

INSTANTIATE_TEST_SUITE_P(
    Slips, NearestWordTest,
    testing::Values(Slip{"read", {"write", "read"}, "read"}, Slip{"READ", {"read"}, "read"},
                    Slip{"raed", {"read"}, "read"}, Slip{"rea", {"read"}, "read"},
                    Slip{"reead", {"read"}, "read"}, Slip{"rexd", {"read"}, "read"},
                    Slip{"rxxd", {"read"}, ""}, Slip{"re", {"rd"}, ""}, Slip{"rd", {"RD"}, "RD"},
                    Slip{"", {"", "read"}, ""}, Slip{"read", {}, ""},
                    // The first one of several.
                    Slip{"bind", {"bins", "find"}, "bins"},
                    // The nearer one, wherever it stands.
                    Slip{"webSites", {"webSides1", "webSite"}, "webSite"},
                    // A third of the letters may differ, at most four.
                    Slip{"abcdef", {"abcdxy"}, "abcdxy"}, Slip{"abcdef", {"abcxyz"}, ""},
                    Slip{"abcdefghijklmnopqr", {"abcdefghijklmnWXYZ"}, "abcdefghijklmnWXYZ"},
                    Slip{"abcdefghijklmnopqr", {"abcdefghijklmVWXYZ"}, ""},
                    Slip{"abcdefghijklmnopqr", {"abcdefghijklm"}, ""}));

TEST(Vocabulary, AnswersTheSameAgain) {
  Vocabulary words({"listen", "accept"});
  EXPECT_EQ(words.Size(), 2u);
  EXPECT_EQ(words.Nearest("lisen"), "listen");
  EXPECT_EQ(words.Nearest("lisen"), "listen");
  EXPECT_EQ(words.Nearest("acept"), "accept");
}

TEST(Vocabulary, GivesUpAfterManyDifferentQuestions) {
  Vocabulary words({"listen"});
  EXPECT_EQ(words.Nearest("lisen"), "listen");
  for (int question = 0; question < 4999; ++question) words.Nearest(std::to_string(question));
  EXPECT_EQ(words.Nearest("listn"), "");
  EXPECT_EQ(words.Nearest("lisen"), "listen");
}

}  // namespace
