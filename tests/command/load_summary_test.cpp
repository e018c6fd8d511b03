// Hunts what the end of a load says wrongly of files with problems and of what no file has.

#include "load/load_summary.h"

#include <gtest/gtest.h>

namespace {

using LinuxHost::LoadEnding;
using LinuxHost::LoadRemainder;
using SecPolicyCli::DescribeProblems;
using SecPolicyCli::DescribeRemainder;
using SecPolicyCli::DescribeUnremoved;

struct Problems {
  std::map<std::string, std::size_t> problems;
  const char* policyDir;
  const char* text;
};

TEST(DescribeProblems, CountsByFileAndTellsHowToSeeTheLines) {
  const Problems table[] = {
      {{}, "/p", ""},
      {{{"/p/domains/b", 2}, {"/p/domains/a", 1}},
       "/p",
       "/p/domains/a: 1 error\n/p/domains/b: 2 errors\n"
       "'secpolicy check /p' shows the lines, and what may be meant\n"},
      {{{"/etc/zorvan/secpolicy/early/domains/a", 1}},
       "/etc/zorvan/secpolicy/early",
       "/etc/zorvan/secpolicy/early/domains/a: 1 error\n"
       "'secpolicy check /etc/zorvan/secpolicy' shows the lines, and what may be meant\n"},
      {{{"/p/a\nb", 1}},
       "/p",
       "/p/a^Jb: 1 error\n'secpolicy check /p' shows the lines, and what may be meant\n"},
  };
  for (const auto& [problems, policyDir, text] : table) {
    EXPECT_EQ(DescribeProblems(problems, policyDir), text);
  }
}

struct Remainder {
  LoadEnding ending;
  bool keep;
  const char* text;
};

TEST(DescribeRemainder, TellsWhatWasRemovedAndWhatStays) {
  const LoadRemainder nothing;
  const LoadRemainder rules{.rules = 2, .domains = {}};
  const LoadRemainder domain{.rules = 0, .domains = {"a"}};
  const LoadRemainder both{.rules = 1, .domains = {"a", "b"}};
  const Remainder table[] = {
      {{nothing, nothing}, false, ""},
      {{nothing, nothing}, true, ""},
      {{rules, nothing}, false, ", 2 rules removed that no file has"},
      {{domain, nothing}, false, ", 1 domain removed that no file has"},
      {{both, rules}, false, ", 2 domains and 1 rule removed that no file has"},
      {{nothing, both}, true, ", 2 domains and 1 rule kept that no file has"},
      {{nothing, domain}, true, ", 1 domain kept that no file has"},
      {{nothing, domain}, false, ""},
  };
  for (const auto& [ending, keep, text] : table) EXPECT_EQ(DescribeRemainder(ending, keep), text);
}

TEST(DescribeUnremoved, TellsWhatAFailedLoadHasNotFound) {
  const LoadRemainder nothing;
  const LoadRemainder rules{.rules = 2, .domains = {}};
  const LoadRemainder domain{.rules = 0, .domains = {"a"}};
  const LoadRemainder both{.rules = 1, .domains = {"a", "b"}};
  EXPECT_EQ(DescribeUnremoved({nothing, nothing}), "");
  EXPECT_EQ(DescribeUnremoved({nothing, both}),
            "; nothing was removed: 2 domains and 1 rule found in no file");
  EXPECT_EQ(DescribeUnremoved({nothing, domain}),
            "; nothing was removed: 1 domain found in no file");
  EXPECT_EQ(DescribeUnremoved({rules, domain}), ", 2 rules removed that no file has");
}

}  // namespace
