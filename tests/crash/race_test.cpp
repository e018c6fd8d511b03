// Loaders that run at the same time, and readers beside them.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <list>
#include <map>
#include <sstream>
#include <string>
#include <vector>

#include "command.h"
#include "host_root.h"
#include "state_content.h"

namespace CrashTest {
namespace {

// The lines of each domain in what `display` printed, by the line that begins it.
std::map<std::string, std::vector<std::string>> DomainsOf(const std::string& display) {
  std::map<std::string, std::vector<std::string>> domains;
  std::string domain;
  std::istringstream lines(display);
  for (std::string line; std::getline(lines, line);) {
    if (line.starts_with("Domain Name: ")) domain = line.substr(0, line.find(" Domain ID"));
    if (line.starts_with("-") && !line.starts_with("--")) domains[domain].push_back(line);
  }
  return domains;
}

std::vector<std::string> OfKind(const std::vector<std::string>& rules, const std::string& kind) {
  std::vector<std::string> found;
  for (const std::string& rule : rules) {
    if (rule.starts_with(kind)) found.push_back(rule);
  }
  return found;
}

class LoadersAtOnce : public ::testing::TestWithParam<int> {};

TEST_P(LoadersAtOnce, EndRightAndLeaveTheStateOfOne) {
  const HostRoot root;
  ASSERT_EQ(RunCommand(root.Path(), {"load"}).exitStatus, 0);
  const std::string content = ContentOf(root.State());

  for (int round = 0; round < (LongTests() ? 20 : 2); ++round) {
    root.Forget();
    std::list<Command> loaders;
    for (int loader = 0; loader < GetParam(); ++loader) {
      loaders.emplace_back(root.Path(), std::vector<std::string>{"load"});
    }
    for (Command& loader : loaders) {
      const Outcome outcome = loader.Wait();
      EXPECT_EQ(outcome.exitStatus, 0);
      EXPECT_THAT(outcome.errors, ::testing::MatchesRegex("secpolicy: load: done \\(.*\\)\n"));
    }
    EXPECT_EQ(ContentOf(root.State()), content);
    EXPECT_EQ(StateFile(root.State()).Integrity(), "ok");
  }
}

INSTANTIATE_TEST_SUITE_P(Loaders, LoadersAtOnce, ::testing::Values(2, 4, 8));

TEST(Reader, NeverSeesHalfALoad) {
  const HostRoot root;
  ASSERT_EQ(RunCommand(root.Path(), {"load"}).exitStatus, 0);
  const std::string whole = RunCommand(root.Path(), {"display"}).output;
  const std::size_t domains = DomainsOf(whole).size();
  // Those of the policy, and the built-in one.
  ASSERT_EQ(domains, static_cast<std::size_t>(kServices) + 5);
  ASSERT_EQ(OfKind(DomainsOf(whole).at("Domain Name: service0"), "-r").size(), 2U * kLinks);

  int early = 0;
  for (int round = 0; round < (LongTests() ? 100 : 15); ++round) {
    root.Forget();
    Command loader(root.Path(), {"load"});
    std::string display;
    for (int reads = 0; display != whole; ++reads) {
      if (reads == 1000) FAIL() << "never loaded: " << loader.Wait().errors << display;
      const Outcome reader = RunCommand(root.Path(), {"display"});
      // Nothing is shown while there is no state.
      ASSERT_EQ(reader.exitStatus, reader.output.empty() ? 1 : 0) << reader.errors;
      display = reader.output;
      if (display == whole) continue;
      ++early;
      // The built-in one.
      ASSERT_LE(DomainsOf(display).size(), 1U) << display;
    }
    EXPECT_EQ(loader.Wait().exitStatus, 0);
  }
  EXPECT_GT(early, 0);
}

}  // namespace
}  // namespace CrashTest
