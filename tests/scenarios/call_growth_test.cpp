// How much a load asks of its host: counted, so that a walk that grows faster than the policy shows
// on every machine.
#include <gtest/gtest.h>

#include "secpolicy/secpolicy.h"
#include "support/policy_tree.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

// One rule of each kind that is checked and set by a call of its own, `times` over.
std::string Rules(int times) {
  std::string text;
  for (int i = 0; i < times; ++i) {
    text += "-a tool read grant\n-c cap_kill grant\n-f tool tool regular grant\n";
    text += "-p bind_port 80 grant\n-s read grant\n-u tool stream grant\n";
  }
  return text;
}

// The lines that loading `domains` domains of `times` such rules adds to the trace.
long CallsOfLoad(int domains, int times) {
  ScriptedHost host;
  host.DeclareLabel("tool", 2);
  const PolicyTree tree;
  for (int i = 0; i < domains; ++i) tree.Write("domain" + std::to_string(i), Rules(times));
  TeskCtl::Security::TeskAccessInterfaceImpl access;
  const auto load = Record([&] { SecPolicy::LoadPolicyDomains(tree.Root(), access); });
  EXPECT_EQ(load.exceptionText, "");
  return static_cast<long>(load.trace.size());
}

// Ten words are checked and six rules are set.
TEST(CallsOfALoad, AreAsManyForEachFurtherRule) {
  const long one = CallsOfLoad(1, 1);
  EXPECT_EQ(CallsOfLoad(1, 2) - one, 10 + 6);
  EXPECT_EQ(CallsOfLoad(1, 200) - one, 199 * (10 + 6));
}

// A domain is looked for, created, and has its constraints checked.
TEST(CallsOfALoad, AreAsManyForEachFurtherDomain) {
  const long one = CallsOfLoad(1, 1);
  EXPECT_EQ(CallsOfLoad(2, 1) - one, 3 + 10 + 6);
  EXPECT_EQ(CallsOfLoad(100, 1) - one, 99 * (3 + 10 + 6));
}

// The lines that synchronising `count` labels of policy and kernel, none the same, adds to the
// trace. That many labels are obsolete: each is asked about and reported.
long CallsOfSync(int count) {
  ScriptedHost host;
  std::vector<std::string> policy;
  std::map<std::string, long> kernel;
  for (int i = 0; i < count; ++i) {
    policy.push_back("new" + std::to_string(i));
    kernel["old" + std::to_string(i)] = i;
  }
  TeskCtl::Security::TeskAccessInterfaceImpl access;
  const auto sync = Record([&] {
    SecPolicy::SyncLabelsFromPolicy(policy, kernel, TeskCtl::Security::TESKACCESS_LABEL_OBJECT,
                                    access);
  });
  return static_cast<long>(sync.trace.size());
}

TEST(CallsOfASync, AreTwoForEachObsoleteLabel) {
  const long one = CallsOfSync(1);
  EXPECT_EQ(CallsOfSync(2) - one, 2);
  EXPECT_EQ(CallsOfSync(1000) - one, 999 * 2);
}

}  // namespace
}  // namespace SecPolicyTest
