// The tardisk policies of the corpus. What a policy holds shows when it is installed, and only the
// scripted host has a file that comes from a tardisk without one being there.

#include <gtest/gtest.h>

#include "case.h"
#include "corpus_host.h"
#include "secpolicy/secpolicy.h"
#include "support/message_of.h"
#include "support/scripted_host.h"

namespace CorpusTest {
namespace {

using SecPolicyTest::MessageOf;
using SecPolicyTest::ScriptedHost;
using TeskCtl::Security::TeskAccessInterfaceImpl;
using Rows = std::vector<std::vector<std::string>>;

std::string LabelOf(const std::string& path) {
  const auto& attributes = ScriptedHost::Current().attributes;
  if (!attributes.contains(path)) return {};
  TeskAccessInterfaceImpl access;
  return SecPolicy::GetFileLabel(path, access);
}

// By launch domain, in the order in which a policy installs them.
Rows InstalledTransitions(const Words& words) {
  TeskAccessInterfaceImpl access;
  Rows rows;
  for (const std::string& launchDomain : words.launchDomains) {
    unsigned int id = 0;
    EXPECT_TRUE(access.FindDomain(launchDomain, &id));
    for (const auto& rule : ScriptedHost::Current().rules[id].domTrans) {
      EXPECT_EQ(rule.transitionKind, "tardisk_exec");
      EXPECT_TRUE(rule.grant);
      unsigned int targetId = 0;
      EXPECT_TRUE(access.FindDomain(rule.targetDomain, &targetId));
      EXPECT_EQ(rule.targetDomainId, targetId);
      rows.push_back({std::to_string(rule.line), rule.domainName, rule.label, rule.targetDomain});
    }
  }
  return rows;
}

TEST(TardiskCorpus, Tardisks) {
  const Words words = ReadWords();
  for (const Case& input : ReadCases("tardisks")) {
    SCOPED_TRACE(input.Name());
    const CorpusHost host(words);
    TeskAccessInterfaceImpl access;
    const std::string& file = WriteInput(input);

    SecPolicy::TardiskPolicy policy(file);
    EXPECT_EQ(MessageOf([&] { policy.ParsePolicy(access); }), input.Error("error", file));
    EXPECT_EQ(MessageOf([&] { policy.SetPolicy(access); }), input.Error("setError", file));
    EXPECT_EQ(LabelOf("/tardisks/" + words.tardisk), input.Text("label"));
    EXPECT_EQ(InstalledTransitions(words), input.Rows("transitions"));
  }
}

}  // namespace
}  // namespace CorpusTest
