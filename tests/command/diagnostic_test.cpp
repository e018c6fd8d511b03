// Hunts problems of a check under a wrong code, in a wrong order, or marked at wrong characters.

#include "check/diagnostic.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>

#include "check/source_file.h"

namespace {

using SecPolicy::Fault;
using SecPolicyCli::AllCodes;
using SecPolicyCli::Code;
using SecPolicyCli::CodeOf;
using SecPolicyCli::Diagnostic;
using SecPolicyCli::DiagnosticList;
using SecPolicyCli::Selection;
using SecPolicyCli::Severity;
using SecPolicyCli::SourceFile;
namespace Codes = SecPolicyCli::Codes;
using testing::ElementsAre;

TEST(CodeOf, NamesEveryFault) {
  const std::pair<Fault, const char*> table[] = {
      {Fault::kRuleType, "rule-type"},       {Fault::kArgumentCount, "argument-count"},
      {Fault::kGrantWord, "grant-word"},     {Fault::kUnknownDomain, "unknown-domain"},
      {Fault::kUnknownWord, "unknown-word"}, {Fault::kTreeMarker, "tree-marker"},
      {Fault::kSecondRule, "second-rule"},
  };
  for (const auto& [fault, name] : table) {
    EXPECT_STREQ(CodeOf(fault).name, name);
    EXPECT_EQ(CodeOf(fault).severity, Severity::kError);
  }
}

TEST(AllCodes, AreTheErrorsAndThenTheWarningsByName) {
  std::vector<std::string> errors;
  std::vector<std::string> warnings;
  for (const Code* code : AllCodes()) {
    const bool isError = code->severity == Severity::kError;
    EXPECT_TRUE(!isError || warnings.empty()) << code->name;
    (isError ? errors : warnings).emplace_back(code->name);
  }
  EXPECT_TRUE(std::is_sorted(errors.begin(), errors.end()));
  EXPECT_TRUE(std::is_sorted(warnings.begin(), warnings.end()));
}

Diagnostic Problem(const Code& code, const std::string& file, unsigned int line,
                   std::size_t column) {
  Diagnostic problem;
  problem.code = &code;
  problem.file = file;
  problem.line = line;
  problem.column = column;
  return problem;
}

TEST(DiagnosticList, SortsErrorsFirstThenByFilesAsTheyCameLineAndColumn) {
  DiagnosticList list({});
  list.BeginFile("/z");
  list.Add(Problem(Codes::kTab, "/a", 1, 1));
  list.Add(Problem(Codes::kTab, "/z", 2, 9));
  list.Add(Problem(Codes::kTab, "/z", 10, 1));
  list.Add(Problem(Codes::kTab, "/z", 2, 3));
  list.Add(Problem(Codes::kGrantWord, "/z", 2, 3));
  list.Sort();
  list.Select({});
  std::vector<std::string> places;
  for (const Diagnostic& problem : list.Shown()) {
    places.push_back(problem.file + ":" + std::to_string(problem.line) + ":" +
                     std::to_string(problem.column) + " " + problem.code->name);
  }
  EXPECT_THAT(places, ElementsAre("/z:2:3 grant-word", "/z:2:3 tab", "/z:2:9 tab", "/z:10:1 tab",
                                  "/a:1:1 tab"));
}

TEST(DiagnosticList, CountsAlsoWhatIsNotShown) {
  DiagnosticList list({});
  list.Add(Problem(Codes::kTab, "/a", 1, 1));
  list.Add(Problem(Codes::kGrantWord, "/a", 2, 1));
  list.Add(Problem(Codes::kTab, "/b", 1, 1));
  list.Sort();
  const auto shown = [&](const Selection& selection) {
    list.Select(selection);
    return list.Shown().size();
  };
  EXPECT_EQ(shown({}), 3U);
  EXPECT_EQ(shown({.errorsOnly = true, .codes = {}}), 1U);
  EXPECT_EQ(shown({.codes = {"tab"}}), 2U);
  EXPECT_EQ(shown({.codes = {"tab"}, .most = 1}), 1U);
  EXPECT_EQ(shown({.codes = {}, .most = 0}), 0U);
  EXPECT_EQ(list.Count(Severity::kWarning), 2U);
  EXPECT_THAT(list.Tally(),
              ElementsAre(std::pair(&Codes::kGrantWord, 1U), std::pair(&Codes::kTab, 2U)));
}

TEST(DiagnosticList, KeepsOneFile) {
  DiagnosticList list({});
  list.Add(Problem(Codes::kTab, "/a", 1, 1));
  list.Add(Problem(Codes::kGrantWord, "/b", 2, 1));
  EXPECT_TRUE(list.Knows("/a"));
  EXPECT_FALSE(list.Knows("/c"));
  list.KeepFile("/b");
  EXPECT_EQ(list.Count(), 1U);
  EXPECT_EQ(list.Count(Severity::kError), 1U);
}

TEST(DiagnosticList, LeavesOutUnwantedWarningsButNoErrors) {
  DiagnosticList list({"tab", "grant-word"});
  list.Add(Problem(Codes::kTab, "/a", 1, 1));
  list.Add(Problem(Codes::kNulByte, "/a", 1, 1));
  list.Add(Problem(Codes::kGrantWord, "/a", 1, 1));
  EXPECT_EQ(list.Count(Severity::kWarning), 1u);
  EXPECT_EQ(list.Count(Severity::kError), 1u);
}

class SourceFileTest : public testing::Test {
 protected:
  SourceFileTest() {
    if (mkdtemp(directory.data()) == nullptr) std::abort();
  }
  ~SourceFileTest() override { std::filesystem::remove_all(directory); }

  SourceFile Write(const std::string& text) const {
    std::ofstream(directory + "/file", std::ios::binary) << text;
    return SourceFile(directory + "/file");
  }

  std::string directory = std::filesystem::temp_directory_path() / "source-file-XXXXXX";
};

struct Marked {
  std::size_t first;
  std::size_t last;
  std::size_t column;
  std::size_t length;
};

TEST_F(SourceFileTest, CountsCharactersFromTheFirstOn) {
  const SourceFile file = Write("\xc3\xa4 x\n");
  EXPECT_EQ(file.AtWords(Codes::kTab, 1, 1, 1, "odd").column, 3u);
  EXPECT_EQ(file.AtBytes(Codes::kTab, 1, 4, 0, "odd").column, 4u);
}

TEST_F(SourceFileTest, MarksWordsInCharacters) {
  const SourceFile file = Write("# first\n  -a  \xc3\xa4\xc3\xb6 read  grant # why\n");
  const Marked table[] = {{0, 0, 3, 2}, {1, 1, 7, 2}, {2, 2, 10, 4}, {3, 3, 16, 5}, {0, 3, 3, 18}};
  for (const auto& [first, last, column, length] : table) {
    const Diagnostic problem = file.AtWords(Codes::kTab, 2, first, last, "odd");
    EXPECT_EQ(problem.line, 2u);
    EXPECT_EQ(problem.column, column);
    EXPECT_EQ(problem.length, length);
  }
}

struct OddBytes {
  std::string text;
  std::vector<std::string> problems;
};

TEST_F(SourceFileTest, TellsBytesThatTheLibraryReadsOtherwise) {
  const OddBytes table[] = {
      {"-s read grant\n", {}},
      {"\xef\xbb\xbf-s read grant\n", {"byte-order-mark 1:1"}},
      {"-s\tread grant\n", {"tab 1:3"}},
      {"# a\tcomment\n-s read grant\r\n", {"carriage-return 2:14"}},
      {std::string("-s read\0 grant\n", 15), {"nul-byte 1:8"}},
      {"-s read grant\n" + std::string(1024, 'x') + "\n-s\twrite\n", {"long-line 2:1024"}},
      {std::string(1022, 'x') + '\0' + "x\n", {"nul-byte 1:1023", "long-line 1:1024"}},
      {std::string(1023, 'x') + '\0' + "x\n", {"long-line 1:1024"}},
      {"-s read grant\n" + std::string(1023, 'x') + "\n-s\twrite\n", {"tab 3:3"}},
  };
  for (const auto& [text, problems] : table) {
    DiagnosticList list({});
    Write(text).CheckBytes(list);
    list.Select({});
    std::vector<std::string> found;
    for (const Diagnostic& problem : list.Shown()) {
      found.push_back(std::string(problem.code->name) + " " + std::to_string(problem.line) + ":" +
                      std::to_string(problem.column));
    }
    EXPECT_EQ(found, problems) << text;
  }
}

}  // namespace
