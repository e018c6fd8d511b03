// Enforcement levels that were stored: each domain gets its own and no other, in small letters,
// and a failure ends the walk.

#include "secpolicy/domain/enforcement.h"

#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

class RestoreDomainEnforcement : public testing::Test {
 protected:
  std::string Restore() {
    return Record([&] { SecPolicy::RestoreDomainEnforcement(access); }).Text();
  }
  void Store(const std::string& domain, const std::map<std::string, std::string>& values) {
    host.storedObjects[{"domain_settings", "security", "orin", domain}] = values;
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
};

TEST_F(RestoreDomainEnforcement, DoesNothingWithoutSlots) {
  host.maxDomains = 0;
  EXPECT_EQ(Restore(), Lines({"GetMaxDomains()", "returns"}));
}

TEST_F(RestoreDomainEnforcement, LeavesDomainWithoutStoredSettingsAlone) {
  EXPECT_EQ(Restore(),
            Lines({"GetMaxDomains()", "GetCompleteDomainInfo(0)",
                   R"(GetDesiredUserConfig({"domain_settings", "security", "orin", "hostDom"}, 0))",
                   "returns"}));
  EXPECT_EQ(host.domains.at(0).level, "enforcing");
}

TEST_F(RestoreDomainEnforcement, AppliesStoredLevelInSmallLetters) {
  Store("hostDom", {{"enforcement_level", "PERMISSIVE"}});
  EXPECT_EQ(Restore(),
            Lines({"GetMaxDomains()", "GetCompleteDomainInfo(0)",
                   R"(GetDesiredUserConfig({"domain_settings", "security", "orin", "hostDom"}, 0))",
                   R"(StoreObject::GetValue("enforcement_level"))",
                   R"(EnableDomain("hostDom", "permissive", false))",
                   R"(SetBootStatus({"domain_settings", "security", "orin", "hostDom"}, true))",
                   "returns"}));
  EXPECT_EQ(host.domains.at(0).level, "permissive");
}

TEST_F(RestoreDomainEnforcement, WalksAllSlotsInOrder) {
  host.domains[1].name = "first";
  host.domains[3].name = "third";
  Store("first", {{"enforcement_level", "Enforcing"}});
  Store("third", {{"enforcement_level", "disabled"}});
  EXPECT_EQ(Restore(),
            Lines({"GetMaxDomains()", "GetCompleteDomainInfo(0)",
                   R"(GetDesiredUserConfig({"domain_settings", "security", "orin", "hostDom"}, 0))",
                   "GetCompleteDomainInfo(1)",
                   R"(GetDesiredUserConfig({"domain_settings", "security", "orin", "first"}, 0))",
                   R"(StoreObject::GetValue("enforcement_level"))",
                   R"(EnableDomain("first", "enforcing", false))",
                   R"(SetBootStatus({"domain_settings", "security", "orin", "first"}, true))",
                   "GetCompleteDomainInfo(2)", "GetCompleteDomainInfo(3)",
                   R"(GetDesiredUserConfig({"domain_settings", "security", "orin", "third"}, 0))",
                   R"(StoreObject::GetValue("enforcement_level"))",
                   R"(EnableDomain("third", "disabled", false))",
                   R"(SetBootStatus({"domain_settings", "security", "orin", "third"}, true))",
                   "returns"}));
}

TEST_F(RestoreDomainEnforcement, SendsEmptyLevelWhenKeyIsAbsent) {
  Store("hostDom", {{"other", "permissive"}});
  EXPECT_EQ(Restore(),
            Lines({"GetMaxDomains()", "GetCompleteDomainInfo(0)",
                   R"(GetDesiredUserConfig({"domain_settings", "security", "orin", "hostDom"}, 0))",
                   R"(StoreObject::GetValue("enforcement_level"))",
                   R"(EnableDomain("hostDom", "", false))",
                   R"(SetBootStatus({"domain_settings", "security", "orin", "hostDom"}, true))",
                   "returns"}));
}

// A level of one domain is not left over for the next.
TEST_F(RestoreDomainEnforcement, SendsEmptyLevelAfterDomainThatHasOne) {
  host.domains[1].name = "second";
  Store("hostDom", {{"enforcement_level", "permissive"}});
  Store("second", {});
  EXPECT_EQ(Restore(),
            Lines({"GetMaxDomains()", "GetCompleteDomainInfo(0)",
                   R"(GetDesiredUserConfig({"domain_settings", "security", "orin", "hostDom"}, 0))",
                   R"(StoreObject::GetValue("enforcement_level"))",
                   R"(EnableDomain("hostDom", "permissive", false))",
                   R"(SetBootStatus({"domain_settings", "security", "orin", "hostDom"}, true))",
                   "GetCompleteDomainInfo(1)",
                   R"(GetDesiredUserConfig({"domain_settings", "security", "orin", "second"}, 0))",
                   R"(StoreObject::GetValue("enforcement_level"))",
                   R"(EnableDomain("second", "", false))",
                   R"(SetBootStatus({"domain_settings", "security", "orin", "second"}, true))",
                   "returns"}));
}

// The words are the kernel's to judge; bytes that are no ASCII letters stay.
TEST_F(RestoreDomainEnforcement, PassesOnAnyLevel) {
  Store("hostDom", {{"enforcement_level", "No Such LEVEL-1 \xc3\x84\xff"}});
  EXPECT_EQ(Restore(),
            Lines({"GetMaxDomains()", "GetCompleteDomainInfo(0)",
                   R"(GetDesiredUserConfig({"domain_settings", "security", "orin", "hostDom"}, 0))",
                   R"(StoreObject::GetValue("enforcement_level"))",
                   "EnableDomain(\"hostDom\", \"no such level-1 \xc3\x84\xff\", false)",
                   R"(SetBootStatus({"domain_settings", "security", "orin", "hostDom"}, true))",
                   "returns"}));
}

struct Step {
  const char* call;
  std::vector<std::string> transcript;  // up to the call that fails
};
void PrintTo(const Step& step, std::ostream* stream) { *stream << step.call; }

class RestoreDomainEnforcementFailure : public RestoreDomainEnforcement,
                                        public testing::WithParamInterface<Step> {
 protected:
  // Two domains have stored settings; the second is never reached.
  void ExpectLeaves(const std::string& exceptionType, const std::string& text) {
    host.domains[1].name = "second";
    Store("hostDom", {{"enforcement_level", "permissive"}});
    Store("second", {{"enforcement_level", "permissive"}});
    const Transcript run = Record([&] { SecPolicy::RestoreDomainEnforcement(access); });

    EXPECT_EQ(run.trace, GetParam().transcript);
    EXPECT_EQ(run.exceptionType, exceptionType);
    EXPECT_EQ(run.exceptionText, text);
    EXPECT_EQ(host.domains.at(1).level, "enforcing");
  }
};

constexpr char kWanted[] =
    R"(GetDesiredUserConfig({"domain_settings", "security", "orin", "hostDom"}, 0))";
constexpr char kLevel[] = R"(StoreObject::GetValue("enforcement_level"))";
constexpr char kEnable[] = R"(EnableDomain("hostDom", "permissive", false))";
constexpr char kApplied[] =
    R"(SetBootStatus({"domain_settings", "security", "orin", "hostDom"}, true))";

INSTANTIATE_TEST_SUITE_P(
    Steps, RestoreDomainEnforcementFailure,
    testing::Values(
        Step{"GetMaxDomains", {"GetMaxDomains()"}},
        Step{"GetCompleteDomainInfo", {"GetMaxDomains()", "GetCompleteDomainInfo(0)"}},
        Step{"GetDesiredUserConfig", {"GetMaxDomains()", "GetCompleteDomainInfo(0)", kWanted}},
        Step{"StoreObject::GetValue",
             {"GetMaxDomains()", "GetCompleteDomainInfo(0)", kWanted, kLevel}},
        Step{"EnableDomain",
             {"GetMaxDomains()", "GetCompleteDomainInfo(0)", kWanted, kLevel, kEnable}},
        Step{"SetBootStatus",
             {"GetMaxDomains()", "GetCompleteDomainInfo(0)", kWanted, kLevel, kEnable, kApplied}}));

TEST_P(RestoreDomainEnforcementFailure, EndsWalkAndLeavesAsItIs) {
  host.FailWith(GetParam().call, Nth(1), DerivedBraxoException("refused"));
  ExpectLeaves("SecPolicyTest::DerivedBraxoException", "refused");
}

TEST_P(RestoreDomainEnforcementFailure, OfForeignTypeEndsWalkAndLeavesAsItIs) {
  host.FailForeign(GetParam().call, Nth(1));
  ExpectLeaves("SecPolicyTest::ForeignException", "foreign");
}

}  // namespace
}  // namespace SecPolicyTest
