// The words in which a bad line of a domain's policy is told.

#include "secpolicy/domain/policy_errors.h"

#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

TEST(RaisePolicyParseError, NamesDomainLineAndFailure) {
  ScriptedHost host;
  EXPECT_EQ(
      Record([] { SecPolicy::RaisePolicyParseError(7, "appDom", "invalid keyword x"); }).Text(),
      "throws SecPolicy::LineFailure: Error in parsing policy for domain: appDom: 7 : invalid "
      "keyword x\n");
}

TEST(RaisePolicyParseError, KeepsEmptyPieces) {
  ScriptedHost host;
  EXPECT_EQ(Record([] { SecPolicy::RaisePolicyParseError(4294967295, "", ""); }).Text(),
            "throws SecPolicy::LineFailure: Error in parsing policy for domain: : 4294967295 : "
            "\n");
}

TEST(RaisePolicySetError, NamesDomainLineAndFailure) {
  ScriptedHost host;
  EXPECT_EQ(Record([] { SecPolicy::RaisePolicySetError(12, "foo", "no room: 5%"); }).Text(),
            "throws SecPolicy::LineFailure: Error in setting policy for domain: foo: 12 : no "
            "room: 5%\n");
}

}  // namespace
}  // namespace SecPolicyTest
