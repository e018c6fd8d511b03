// How many statements a call runs. Each costs locks and writes, so the count is the cost that no
// busy machine can hide.
#include <dlfcn.h>
#include <gtest/gtest.h>
#include <sqlite3.h>

#include <list>
#include <string>

#include "host/linux/state/domain_table.h"
#include "host/linux/state/file_policy_table.h"
#include "host/linux/state/host_state.h"
#include "host/linux/state/label_table.h"
#include "state_directory.h"
#include "teskctl/security.h"

namespace {

int steps = 0;
int preparations = 0;  // of statements that had been prepared before

}  // namespace

// In the place of the engine's own, which it counts and calls.
extern "C" int sqlite3_step(sqlite3_stmt* statement) {
  using Step = int (*)(sqlite3_stmt*);
  static const auto step = reinterpret_cast<Step>(dlsym(RTLD_NEXT, "sqlite3_step"));
  ++steps;
  const int result = step(statement);
  preparations += sqlite3_stmt_status(statement, SQLITE_STMTSTATUS_REPREPARE, 1);
  return result;
}

namespace LinuxHostTest {
namespace {

using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
using TeskCtl::Security::TESKACCESS_KEYWORD_LABEL;
using TeskCtl::Security::TeskAccess_ObjectAccessRule;

class StatementsOfACall : public ::testing::Test {
 protected:
  StatementsOfACall() {
    domain = access.CreateDomain("owner", TESKACCESS_DEFAULT_DOM_NONE);
    // What is read once is read before anything is counted.
    access.ValidateKeyword(TESKACCESS_KEYWORD_LABEL, "unlabeled");
  }

  template <class Call>
  static int Steps(Call call) {
    const int before = steps;
    call();
    return steps - before;
  }

  void SetRule(unsigned int line) {
    TeskAccess_ObjectAccessRule rule;
    rule.line = line;
    rule.domainId = domain;
    rule.domainName = "owner";
    rule.label = "unlabeled";
    rule.accessKind = "read";
    rule.grant = true;
    access.SetObjectAccessRule(rule);
  }

  StateDirectory directory;
  TeskCtl::Security::TeskAccessInterfaceImpl access;
  unsigned int domain = 0;
};

TEST_F(StatementsOfACall, AreOneForARule) {
  EXPECT_EQ(Steps([&] { SetRule(1); }), 1);
  EXPECT_EQ(Steps([&] {
              for (unsigned int line = 2; line <= 101; ++line) SetRule(line);
            }),
            100);
}

TEST_F(StatementsOfACall, AreNoneForAWordWhileNothingChanged) {
  EXPECT_EQ(Steps([&] { access.ValidateKeyword(TESKACCESS_KEYWORD_LABEL, "unlabeled"); }), 0);
  EXPECT_EQ(
      Steps([&] { access.LookupLabel("unlabeled", TeskCtl::Security::TESKACCESS_LABEL_OBJECT); }),
      0);
}

// The transaction of several begins and ends, and each policy is one statement between.
TEST_F(StatementsOfACall, AreOneForEachFilePolicyAndTwoForABatch) {
  const LinuxHost::FilePolicy written = {.domain = {domain, {}}, .path = "/link", .permission = 1};
  const LinuxHost::FilePolicy resolved = {.domain = {domain, {}}, .path = "/file", .permission = 1};
  auto& policies = LinuxHost::HostState::Current().FilePolicies();
  const std::vector<LinuxHost::FilePolicy> two = {written, resolved};
  const std::vector<LinuxHost::FilePolicy> same = {written, written};
  EXPECT_EQ(Steps([&] { policies.Install(two); }), 4);
  EXPECT_EQ(Steps([&] { policies.Install(same); }), 1);
}

// The transaction, the highest number, the version of the table, and each label.
TEST_F(StatementsOfACall, AreOneForEachLabelAndFourForTheBatch) {
  std::vector<std::string> labels;
  for (int number = 0; number < 100; ++number) labels.push_back("label" + std::to_string(number));
  EXPECT_EQ(Steps([&] { access.AddLabels(labels, TeskCtl::Security::TESKACCESS_LABEL_OBJECT); }),
            104);
}

// One for each row, and one that finds the end.
TEST_F(StatementsOfACall, AreOneForEachRuleThatIsRead) {
  SetRule(1);
  std::list<TeskAccess_ObjectAccessRule> rules;
  access.GetObjectAccessRules(domain, rules);
  EXPECT_EQ(Steps([&] { access.GetObjectAccessRules(domain, rules); }), 2);
}

TEST_F(StatementsOfACall, AreNotPreparedAnewForRulesOfAnotherKind) {
  std::list<TeskAccess_ObjectAccessRule> objectAccess;
  std::list<TeskCtl::Security::TeskAccess_SyscallRule> syscalls;
  access.GetObjectAccessRules(domain, objectAccess);
  preparations = 0;
  access.GetSyscallRules(domain, syscalls);
  access.GetObjectAccessRules(domain, objectAccess);
  EXPECT_EQ(preparations, 0);
}

}  // namespace
}  // namespace LinuxHostTest
