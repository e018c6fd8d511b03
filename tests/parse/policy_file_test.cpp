// Words and lines of a policy file: comments, blanks, NUL bytes, lines of 1023 characters and
// more; and which files a directory has.

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include "secpolicy/secpolicy.h"
#include "support/policy_tree.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

using Words = std::vector<std::string>;
using ParsedFile = std::map<unsigned int, std::queue<std::string>>;

Words WordsOf(std::queue<std::string> tokens) {
  Words words;
  for (; !tokens.empty(); tokens.pop()) words.push_back(tokens.front());
  return words;
}

std::map<unsigned int, Words> WordsOf(const ParsedFile& parsed) {
  std::map<unsigned int, Words> words;
  for (const auto& [line, tokens] : parsed) words[line] = WordsOf(tokens);
  return words;
}

std::map<unsigned int, Words> Parse(const std::string& text) {
  const PolicyTree tree({{"file", text}});
  ParsedFile parsed;
  SecPolicy::ParseFile(tree / "file", parsed);
  return WordsOf(parsed);
}

// ---- StringToQueue and ParsePolicyLine.

TEST(StringToQueue, GivesNothingForAnEmptyText) {
  EXPECT_THAT(WordsOf(SecPolicy::StringToQueue("")), IsEmpty());
}

TEST(StringToQueue, GivesNothingForSpacesAlone) {
  EXPECT_THAT(WordsOf(SecPolicy::StringToQueue(" ")), IsEmpty());
  EXPECT_THAT(WordsOf(SecPolicy::StringToQueue("    ")), IsEmpty());
}

TEST(StringToQueue, KeepsTheOrderOfWords) {
  EXPECT_THAT(WordsOf(SecPolicy::StringToQueue("one two three")),
              ElementsAre("one", "two", "three"));
}

TEST(StringToQueue, DropsEmptyPieces) {
  EXPECT_THAT(WordsOf(SecPolicy::StringToQueue("  a   b ")), ElementsAre("a", "b"));
}

TEST(StringToQueue, SplitsAtSpacesOnly) {
  EXPECT_THAT(WordsOf(SecPolicy::StringToQueue("x\ty z\v\r")), ElementsAre("x\ty", "z\v\r"));
}

TEST(StringToQueue, KnowsNoComments) {
  EXPECT_THAT(WordsOf(SecPolicy::StringToQueue("a #b c")), ElementsAre("a", "#b", "c"));
}

TEST(ParsePolicyLine, SplitsALineWithoutComment) {
  EXPECT_THAT(WordsOf(SecPolicy::ParsePolicyLine("-s read grant")),
              ElementsAre("-s", "read", "grant"));
}

TEST(ParsePolicyLine, CutsAtTheFirstHash) {
  EXPECT_THAT(WordsOf(SecPolicy::ParsePolicyLine("a b # c # d")), ElementsAre("a", "b"));
}

TEST(ParsePolicyLine, CutsInTheMiddleOfAWord) {
  EXPECT_THAT(WordsOf(SecPolicy::ParsePolicyLine("c#d  e")), ElementsAre("c"));
}

TEST(ParsePolicyLine, GivesNothingForAComment) {
  EXPECT_THAT(WordsOf(SecPolicy::ParsePolicyLine("# all comment")), IsEmpty());
  EXPECT_THAT(WordsOf(SecPolicy::ParsePolicyLine("  # all comment")), IsEmpty());
}

TEST(ParsePolicyLine, KnowsNoQuotingOrEscape) {
  EXPECT_THAT(WordsOf(SecPolicy::ParsePolicyLine(R"("a b" \#c)")), ElementsAre("\"a", "b\"", "\\"));
}

// ---- ParseFile.

TEST(ParseFile, NumbersPhysicalLinesAndLeavesOutEmptyOnes) {
  EXPECT_THAT(Parse("a b\n\n  # comment\nc#d  e\n"),
              ElementsAre(Pair(1, ElementsAre("a", "b")), Pair(4, ElementsAre("c"))));
}

TEST(ParseFile, KeepsATabInsideAWord) {
  EXPECT_THAT(Parse("x\ty z\n"), ElementsAre(Pair(1, ElementsAre("x\ty", "z"))));
}

TEST(ParseFile, KeepsLastLineWithoutLineFeed) {
  EXPECT_THAT(Parse("a\nb"), ElementsAre(Pair(1, ElementsAre("a")), Pair(2, ElementsAre("b"))));
}

TEST(ParseFile, GivesNothingForAnEmptyFile) { EXPECT_THAT(Parse(""), IsEmpty()); }

TEST(ParseFile, GivesNothingForBlankLinesAndComments) {
  EXPECT_THAT(Parse("\n   \n# a\n"), IsEmpty());
}

TEST(ParseFile, ReadsALineOf1023CharactersWhole) {
  const std::string line(1023, 'x');
  EXPECT_THAT(Parse(line + "\nnext\n"),
              ElementsAre(Pair(1, ElementsAre(line)), Pair(2, ElementsAre("next"))));
}

TEST(ParseFile, ReadsALastLineOf1023CharactersWithoutLineFeed) {
  const std::string line(1023, 'x');
  EXPECT_THAT(Parse("a\n" + line),
              ElementsAre(Pair(1, ElementsAre("a")), Pair(2, ElementsAre(line))));
}

TEST(ParseFile, CutsALineOf1024CharactersAndEndsThere) {
  const std::string line(1024, 'x');
  EXPECT_THAT(Parse("a\n" + line + "\nnext\n"),
              ElementsAre(Pair(1, ElementsAre("a")), Pair(2, ElementsAre(line.substr(0, 1023)))));
}

TEST(ParseFile, CutsALineOf1024CharactersWithoutLineFeed) {
  EXPECT_THAT(Parse(std::string(1024, 'x')),
              ElementsAre(Pair(1, ElementsAre(std::string(1023, 'x')))));
}

TEST(ParseFile, SplitsWhatIsLeftOfACutLine) {
  const std::string head = "word " + std::string(1018, 'x');
  EXPECT_THAT(Parse(head + "rest of it\nnext\n"),
              ElementsAre(Pair(1, ElementsAre("word", std::string(1018, 'x')))));
}

TEST(ParseFile, EndsAtALongComment) {
  EXPECT_THAT(Parse("a\n#" + std::string(2000, 'x') + "\nb\n"),
              ElementsAre(Pair(1, ElementsAre("a"))));
}

TEST(ParseFile, KeepsACarriageReturnInTheLastWord) {
  EXPECT_THAT(Parse("a b\r\nc\r\n"),
              ElementsAre(Pair(1, ElementsAre("a", "b\r")), Pair(2, ElementsAre("c\r"))));
}

TEST(ParseFile, TakesALoneCarriageReturnForAWord) {
  EXPECT_THAT(Parse("\r\n"), ElementsAre(Pair(1, ElementsAre("\r"))));
}

TEST(ParseFile, DropsWhatFollowsANulByteInItsLine) {
  EXPECT_THAT(Parse(std::string("a b\0c d\ne\n", 10)),
              ElementsAre(Pair(1, ElementsAre("a", "b")), Pair(2, ElementsAre("e"))));
}

TEST(ParseFile, KeepsBytesAbove127) {
  EXPECT_THAT(Parse("gr\xc3\xbc\xc3\x9f \xff\n"),
              ElementsAre(Pair(1, ElementsAre("gr\xc3\xbc\xc3\x9f", "\xff"))));
}

TEST(ParseFile, OverwritesTheSameLinesAndKeepsOthers) {
  const PolicyTree tree({{"file", "new\n\n"}});
  ParsedFile parsed;
  parsed[1] = SecPolicy::StringToQueue("old one");
  parsed[2] = SecPolicy::StringToQueue("old two");
  parsed[9] = SecPolicy::StringToQueue("old nine");

  SecPolicy::ParseFile(tree / "file", parsed);

  EXPECT_THAT(WordsOf(parsed),
              ElementsAre(Pair(1, ElementsAre("new")), Pair(2, ElementsAre("old", "two")),
                          Pair(9, ElementsAre("old", "nine"))));
}

TEST(ParseFile, RefusesAMissingFileAndKeepsTheMap) {
  ScriptedHost host;
  const PolicyTree tree({{"present", "a\n"}});
  ParsedFile parsed;
  parsed[3] = SecPolicy::StringToQueue("old");
  const std::string path = tree / "missing";

  const Transcript run = Record([&] { SecPolicy::ParseFile(path, parsed); });

  EXPECT_EQ(run.Text(),
            Lines({"throws Braxo::Lib::BraxoException: Unable to open policy file " + path}));
  EXPECT_THAT(WordsOf(parsed), ElementsAre(Pair(3, ElementsAre("old"))));

  const Transcript control = Record([&] { SecPolicy::ParseFile(tree / "present", parsed); });
  EXPECT_EQ(control.Text(), Lines({"returns"}));
  EXPECT_THAT(WordsOf(parsed), ElementsAre(Pair(1, ElementsAre("a")), Pair(3, ElementsAre("old"))));
}

// Opening succeeds, every read fails.
TEST(ParseFile, EndsQuietlyAtAReadError) {
  ScriptedHost host;
  const PolicyTree tree({{"directory/", ""}});
  ParsedFile parsed;
  const Transcript run = Record([&] { SecPolicy::ParseFile(tree / "directory", parsed); });
  EXPECT_EQ(run.Text(), Lines({"returns"}));
  EXPECT_THAT(WordsOf(parsed), IsEmpty());
}

// ---- GetFileList.

using FileList = std::map<std::string, std::string>;

TEST(GetFileList, ListsOnlyRegularFiles) {
  const PolicyTree tree({{"dir/file", ""}, {"dir/sub/inner", ""}});
  ASSERT_EQ(symlink("file", (tree / "dir/link").c_str()), 0);
  ASSERT_EQ(mkfifo((tree / "dir/fifo").c_str(), 0600), 0);
  FileList files;
  SecPolicy::GetFileList(tree / "dir", files);
  EXPECT_THAT(files, ElementsAre(Pair(tree / "dir/file", "file")));
}

TEST(GetFileList, ListsInByteOrderOfNames) {
  const PolicyTree tree({{"b", ""}, {"a", ""}, {"B", ""}, {"a.b", ""}, {".hidden", ""}});
  FileList files;
  SecPolicy::GetFileList(tree.Root(), files);
  EXPECT_THAT(files,
              ElementsAre(Pair(tree / ".hidden", ".hidden"), Pair(tree / "B", "B"),
                          Pair(tree / "a", "a"), Pair(tree / "a.b", "a.b"), Pair(tree / "b", "b")));
}

TEST(GetFileList, GivesNothingForAnEmptyDirectory) {
  const PolicyTree tree;
  FileList files;
  SecPolicy::GetFileList(tree.Root(), files);
  EXPECT_THAT(files, IsEmpty());
}

TEST(GetFileList, KeepsADoubledSlash) {
  const PolicyTree tree({{"file", ""}});
  FileList files;
  SecPolicy::GetFileList(tree.Root() + "/", files);
  EXPECT_THAT(files, ElementsAre(Pair(tree.Root() + "//file", "file")));
}

TEST(GetFileList, KeepsOtherEntriesAndOverwritesTheSame) {
  const PolicyTree tree({{"file", ""}});
  FileList files = {{"/other/file", "kept"}, {tree / "file", "old name"}};
  SecPolicy::GetFileList(tree.Root(), files);
  EXPECT_THAT(files, testing::UnorderedElementsAre(Pair("/other/file", "kept"),
                                                   Pair(tree / "file", "file")));
}

TEST(GetFileList, RefusesAMissingDirectoryAndKeepsTheList) {
  ScriptedHost host;
  const PolicyTree tree({{"present/file", ""}});
  FileList files = {{"/other/file", "kept"}};
  const std::string dir = tree / "missing";

  const Transcript run = Record([&] { SecPolicy::GetFileList(dir, files); });

  EXPECT_EQ(run.Text(),
            Lines({"throws Braxo::Lib::BraxoException: Unable to open policy directory " + dir}));
  EXPECT_THAT(files, ElementsAre(Pair("/other/file", "kept")));

  const Transcript control = Record([&] { SecPolicy::GetFileList(tree / "present", files); });
  EXPECT_EQ(control.Text(), Lines({"returns"}));
  EXPECT_EQ(files.size(), 2u);
}

TEST(GetFileList, RefusesAFile) {
  ScriptedHost host;
  const PolicyTree tree({{"file", ""}});
  FileList files;
  const Transcript run = Record([&] { SecPolicy::GetFileList(tree / "file", files); });
  EXPECT_EQ(run.Text(), Lines({"throws Braxo::Lib::BraxoException: "
                               "Unable to open policy directory " +
                               (tree / "file")}));
}

// ---- IsGrant.

TEST(IsGrant, TellsGrantFromRevoke) {
  std::string grant = "grant";
  std::string revoke = "revoke";
  EXPECT_TRUE(SecPolicy::IsGrant(grant));
  EXPECT_FALSE(SecPolicy::IsGrant(revoke));
  EXPECT_EQ(grant, "grant");
  EXPECT_EQ(revoke, "revoke");
}

class IsGrantRefusal : public testing::TestWithParam<std::string> {};

TEST_P(IsGrantRefusal, NamesTheWord) {
  ScriptedHost host;
  std::string word = GetParam();
  const Transcript run = Record([&] { SecPolicy::IsGrant(word); });
  EXPECT_EQ(run.Text(),
            Lines({"throws Braxo::Lib::BraxoException: invalid keyword " + GetParam()}));
  EXPECT_EQ(word, GetParam());
}

INSTANTIATE_TEST_SUITE_P(Words, IsGrantRefusal,
                         testing::Values("Grant", "GRANT", "granted", "gran", "Revoke", "revoke\r",
                                         ""));

}  // namespace
}  // namespace SecPolicyTest
