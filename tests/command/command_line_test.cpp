// Hunts words of a command line that are dropped, taken for others or refused without saying what
// would be understood.

#include "command_line.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <iostream>

namespace {

using SecPolicyCli::Action;
using SecPolicyCli::CommandLine;
using SecPolicyCli::kFailed;
using SecPolicyCli::Kind;
using SecPolicyCli::kUsage;
using SecPolicyCli::kWell;
using SecPolicyCli::Option;
using SecPolicyCli::Syntax;
using SecPolicyCli::Verb;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

// What the verbs of these tests were given.
struct Given {
  bool thick = false;
  bool thin = false;
  bool isVerbose = false;
  std::string color = "white";
  std::string format;
  std::string wood;
  std::vector<std::string> coats;
  std::vector<std::string> walls;
  std::size_t wordsBehindDashes = 0;
};

Given given;

std::string WhyNoColor(const std::string& color) { return color == "plaid" ? "no color" : ""; }

const Verb kPaint = {
    .name = "paint",
    .summary = "Paints",
    .help = "Example: paint",
    .define = [](Syntax& syntax) -> Action {
      const Option thick = syntax.AddFlag("--thick", given.thick, "Thick");
      syntax.AddFlag("--thin", given.thin, "Thin").Exclude(thick);
      syntax.AddOption("--color", given.color, "Color").Check(WhyNoColor).Need(thick);
      syntax.AddFormat(given.format, "it", {"text", "json", "xml"});
      syntax.AddList("--coat", given.coats, "Coat");
      syntax.AddList("WALL", given.walls, "Walls")
          .Require()
          .Offer(SecPolicyCli::OfferWords({"door"}));
      given.wordsBehindDashes = syntax.WordsBehindDashes();
      return [verbose = syntax.Verbose()] {
        given.isVerbose = verbose.IsGiven();
        return kFailed;
      };
    },
};

const Verb kCarve = {
    .name = "carve",
    .summary = "Carves",
    .help = "Example: carve",
    .define = [](Syntax& syntax) -> Action {
      static const Kind kinds[] = {
          {"bowl", "A bowl", "Bowls are round",
           [](Syntax& kind) -> Action {
             kind.AddOption("WOOD", given.wood, "Wood")
                 .Require()
                 .Offer(SecPolicyCli::OfferWords({"oak"}));
             return [] { return kWell; };
           }},
          {"spoon", "A spoon", nullptr, [](Syntax&) -> Action { return [] { return kFailed; }; }},
      };
      return syntax.AddKinds(kinds);
    },
};

const SecPolicyCli::VerbGroup kVerbs[] = {{"Work", {&kPaint, &kCarve}}};

class CommandLineTest : public testing::Test {
 protected:
  // A command line is read once.
  std::optional<SecPolicyCli::ExitCode> Read(std::vector<std::string> words) {
    given = {};
    line.emplace(SecPolicyCli::Description{"Tests.", "The end.", "secpolicy 1.2.3"}, kVerbs);
    words.insert(words.begin(), "secpolicy");
    std::vector<char*> arguments(words.size() + 1);
    std::transform(words.begin(), words.end(), arguments.begin(),
                   [](std::string& word) { return word.data(); });
    testing::internal::CaptureStdout();
    testing::internal::CaptureStderr();
    const auto end = line->Read(static_cast<int>(words.size()), arguments.data(),
                                [](const std::string& text) { std::cout << text; });
    output = testing::internal::GetCapturedStdout();
    error = testing::internal::GetCapturedStderr();
    return end;
  }

  std::optional<CommandLine> line;
  std::string output;
  std::string error;
};

TEST_F(CommandLineTest, LeavesWhatIsNotGiven) {
  EXPECT_EQ(Read({"paint", "north"}), std::nullopt);
  EXPECT_EQ(&line->AskedVerb(), &kPaint);
  EXPECT_EQ(line->Root(), std::nullopt);
  EXPECT_FALSE(line->IsVerbose());
  EXPECT_EQ(line->ColorChoice(), "auto");
  EXPECT_TRUE(line->IsPagerWanted());
  EXPECT_EQ(line->Act(), kFailed);
  EXPECT_FALSE(given.isVerbose);
  EXPECT_FALSE(given.thick);
  EXPECT_EQ(given.color, "white");
  EXPECT_EQ(given.format, "text");
  EXPECT_THAT(given.coats, IsEmpty());
  EXPECT_THAT(given.walls, ElementsAre("north"));
}

TEST_F(CommandLineTest, TakesWhatIsGiven) {
  EXPECT_EQ(Read({"--root", "/r", "paint", "north", "--coat", "a", "south", "--coat", "b",
                  "--thick", "--color=red", "--format", "xml"}),
            std::nullopt);
  EXPECT_EQ(line->Root(), "/r");
  EXPECT_TRUE(given.thick);
  EXPECT_EQ(given.color, "red");
  EXPECT_EQ(given.format, "xml");
  EXPECT_THAT(given.coats, ElementsAre("a", "b"));
  EXPECT_THAT(given.walls, ElementsAre("north", "south"));
}

TEST_F(CommandLineTest, TellsWhatStandsBehindTheFirstDashes) {
  EXPECT_EQ(Read({"paint", "north", "south"}), std::nullopt);
  EXPECT_EQ(given.wordsBehindDashes, 0);
  EXPECT_EQ(Read({"paint", "north", "--"}), std::nullopt);
  EXPECT_EQ(given.wordsBehindDashes, 0);
  EXPECT_EQ(Read({"paint", "--", "north", "south", "--", "--thick"}), std::nullopt);
  EXPECT_EQ(given.wordsBehindDashes, 4);
  EXPECT_THAT(given.walls, ElementsAre("north", "south", "--", "--thick"));
  EXPECT_EQ(Read({"paint", "--", "north"}), std::nullopt);
  EXPECT_EQ(given.wordsBehindDashes, 1);
}

TEST_F(CommandLineTest, TakesTheCommonOptionsBehindTheVerb) {
  EXPECT_EQ(Read({"paint", "north", "--root", "", "-v", "--no-pager"}), std::nullopt);
  EXPECT_FALSE(line->IsPagerWanted());
  EXPECT_EQ(line->Root(), "");
  EXPECT_TRUE(line->IsVerbose());
  line->Act();
  EXPECT_TRUE(given.isVerbose);
}

TEST_F(CommandLineTest, DoesWhatTheKindDoes) {
  EXPECT_EQ(Read({"carve", "bowl", "oak"}), std::nullopt);
  EXPECT_EQ(&line->AskedVerb(), &kCarve);
  EXPECT_EQ(given.wood, "oak");
  EXPECT_EQ(line->Act(), kWell);
  EXPECT_EQ(Read({"carve", "spoon"}), std::nullopt);
  EXPECT_EQ(line->Act(), kFailed);
}

// What can stand for the last word, told by the words that are offered.
struct Place {
  std::vector<std::string> line;
  std::vector<std::string> offered;
  std::vector<std::string> before;
};

TEST_F(CommandLineTest, KnowsWhatCanStandOnALineThatIsNotComplete) {
  const std::vector<std::string> paintOptions = {"--help",  "--thick",  "--thin",
                                                 "--color", "--format", "--coat"};
  const Place table[] = {
      {{""}, {"help", "paint", "carve"}, {}},
      {{"-v", "pa"}, {"help", "paint", "carve"}, {}},
      {{"help", ""}, {"paint", "carve"}, {}},
      {{"help", "carve", ""}, {}, {}},
      {{"nothing", ""}, {}, {}},
      {{"carve", ""}, {"bowl", "spoon"}, {}},
      {{"carve", "nothing", ""}, {}, {}},
      {{"carve", "bowl", ""}, {"oak"}, {}},
      {{"paint", "--format", ""}, {"text", "json", "xml"}, {}},
      {{"paint", "--format=j"}, {"--format=text", "--format=json", "--format=xml"}, {}},
      {{"paint", "--thick", "--coat", "a", "--"},
       {"--help", "--thin", "--color", "--format", "--coat"},
       {}},
      {{"paint", "-"}, paintOptions, {}},
      {{"paint", ""}, {"door"}, {}},
      {{"paint", "north", "--thin", "--root", "/r", "south", ""}, {"door"}, {"north", "south"}},
      {{"paint", "north", "--", "-"}, {"door"}, {}},
      {{"carve", "bowl", "oak", ""}, {"--help", "--color"}, {}},
  };
  for (const auto& [words, offered, before] : table) {
    line.emplace(SecPolicyCli::Description{"Tests.", "The end.", "secpolicy 1.2.3"}, kVerbs);
    const SecPolicyCli::WordPlace place = line->FindPlace(words);
    std::vector<std::string> found;
    for (const auto& each : place.words) found.push_back(each.word);
    if (place.offering) {
      for (const auto& each : place.offering(place.before).words)
        found.push_back(place.fixed + each.word);
    }
    std::erase_if(found, [](const std::string& word) {
      return word == "--root" || word == "--verbose" || word == "--version" || word == "--no-pager";
    });
    EXPECT_EQ(found, offered) << testing::PrintToString(words);
    EXPECT_EQ(place.before, before) << testing::PrintToString(words);
  }
}

TEST_F(CommandLineTest, KnowsTheRootOfALineThatIsNotComplete) {
  for (const std::vector<std::string>& words :
       {std::vector<std::string>{"--root", "/r", "paint", ""},
        {"paint", "--root=/r", "--coat", ""}}) {
    line.emplace(SecPolicyCli::Description{"Tests.", "The end.", "secpolicy 1.2.3"}, kVerbs);
    EXPECT_EQ(line->FindPlace(words).root, "/r");
  }
}

struct Misuse {
  std::vector<std::string> words;
  const char* problem;
  const char* command;
};

TEST_F(CommandLineTest, RefusesWhatItDoesNotUnderstand) {
  const Misuse table[] = {
      {{"pant", "north"}, "there is no verb or option 'pant'; did you mean 'paint'?", "secpolicy"},
      {{"xyzzy"}, "there is no verb or option 'xyzzy'", "secpolicy"},
      {{"--rot", "/r"}, "there is no verb or option '--rot'; did you mean '--root'?", "secpolicy"},
      {{"-v"}, "a verb is required", "secpolicy"},
      {{"carve"}, "one of bowl, spoon is required", "secpolicy carve"},
      {{"carve", "bolw"}, "there is no 'carve bolw'; did you mean 'bowl'?", "secpolicy carve"},
      {{"carve", "xyzzy"}, "there is no 'carve xyzzy'; there are bowl, spoon", "secpolicy carve"},
      {{"carve", "--xyzzy"}, "there is no option '--xyzzy'", "secpolicy carve"},
      {{"carve", "spoon", "oak"}, "'oak' is one word too many", "secpolicy carve spoon"},
      {{"paint", "--thik", "north"},
       "there is no option '--thik'; did you mean '--thick'?",
       "secpolicy paint"},
      {{"paint", "--verbos"},
       "there is no option '--verbos'; did you mean '--verbose'?",
       "secpolicy paint"},
      {{"paint", "--colr=red"},
       "there is no option '--colr'; did you mean '--color'?",
       "secpolicy paint"},
      {{"--thick", "paint", "north"},
       "the option '--thick' stands behind 'paint'",
       "secpolicy paint"},
      {{"paint", "north", "--coat"}, "--coat needs a value", "secpolicy paint"},
      {{"paint", "north", "--thick=5"}, "--thick takes no value", "secpolicy paint"},
      {{"paint", "north", "--verbose=no"}, "--verbose takes no value", "secpolicy paint"},
      {{"paint", "north", "--json"},
       "there is no option '--json'; did you mean '--format json'?",
       "secpolicy paint"},
      {{"carve", "--json"}, "there is no option '--json'", "secpolicy carve"},
      {{"paint", "north", "--thick", "--color", "red", "--color", "red"},
       "--color is given more than once",
       "secpolicy paint"},
      {{"paint", "north", "--format", "yaml"},
       "--format: there is no 'yaml'; there are text, json and xml",
       "secpolicy paint"},
      {{"carve", "bowl"}, "WOOD is required", "secpolicy carve bowl"},
      {{"paint"}, "WALL is required", "secpolicy paint"},
      {{"paint", "north", "--thick", "--thin"}, "--thick excludes --thin", "secpolicy paint"},
      {{"paint", "north", "--color", "red"}, "--color requires --thick", "secpolicy paint"},
      {{"paint", "north", "--thick", "--color", "plaid"}, "--color: no color", "secpolicy paint"},
      {{"paint", "a\x1b[31m", "--no\x1b"}, "there is no option '--no^['", "secpolicy paint"},
  };
  for (const auto& [words, problem, command] : table) {
    EXPECT_EQ(Read(words), kUsage);
    EXPECT_EQ(output, "");
    EXPECT_EQ(error, std::string("secpolicy: ") + problem + "\n'" + command +
                         " --help' explains the usage.\n");
  }
}

TEST_F(CommandLineTest, TellsItsVersionAndItsUsage) {
  EXPECT_EQ(Read({"--version"}), kWell);
  EXPECT_EQ(output, "secpolicy 1.2.3\n");
  EXPECT_EQ(Read({"--help"}), kWell);
  for (const char* part : {"Tests.", "paint", "Carves", "--root", "The end."}) {
    EXPECT_THAT(output, HasSubstr(part));
  }
  EXPECT_EQ(Read({"carve", "--help"}), kWell);
  EXPECT_THAT(output, HasSubstr("\nSubcommands:\n  bowl "));
  EXPECT_EQ(Read({"carve", "bowl", "--help"}), kWell);
  EXPECT_THAT(output, HasSubstr("Bowls are round"));
  EXPECT_EQ(Read({"paint", "--help"}), kWell);
  EXPECT_THAT(output, HasSubstr("How to write it: text, json or xml"));
  EXPECT_EQ(error, "");
}

}  // namespace
