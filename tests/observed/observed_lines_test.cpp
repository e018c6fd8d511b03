// What an observer is told of lines that cannot be read: which word is to blame for what.

#include <gmock/gmock.h>

#include "observed/observer_log.h"
#include "secpolicy/observed/loading.h"
#include "support/fixed_roots.h"
#include "support/policy_tree.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

using testing::ElementsAre;

struct RefusedLine {
  const char* line;
  const char* fault;
  const char* reason;
};

void PrintTo(const RefusedLine& refused, std::ostream* stream) { *stream << refused.line; }

// A host that knows one word of each table but "odd".
class KnowingHost : public ScriptedHost {
 public:
  KnowingHost() {
    for (int type = 1; type <= 8; ++type) {
      Fail("ValidateKeyword", With(std::string(kTables[type - 1]) + ", \"odd\""), "no such word");
    }
  }

 private:
  static constexpr const char* kTables[] = {
      "LABEL",     "CAPABILITY",    "PARAM_CHECK",        "OBJECT_ACCESS",
      "DOM_TRANS", "FILE_CREATION", "UNIX_SOCK_CREATION", "SYSCALL"};
};

class RefusedDomainLine : public testing::TestWithParam<RefusedLine> {
 protected:
  KnowingHost host;
  TeskAccessInterfaceImpl access;
};

TEST_P(RefusedDomainLine, IsToldWithItsPlaceAndTheWordToBlame) {
  const auto& [line, fault, reason] = GetParam();
  host.hiddenDomains = {"noDom"};
  const PolicyTree tree({{"one", std::string("\n") + line + "\n"}});
  ObserverLog log;
  EXPECT_THROW(SecPolicy::LoadPolicyDomains(tree.Root(), access, log), BraxoException);
  EXPECT_THAT(log.Problems(),
              ElementsAre("problem " + tree / "one" + ":2 " + fault + " " + reason));
}

constexpr char kCount[] = "incorrect number of arguments for this rule type";

INSTANTIATE_TEST_SUITE_P(
    Lines, RefusedDomainLine,
    testing::Values(
        RefusedLine{"-x y", "rule-type in word 0", "invalid policy rule type (-x)"},
        RefusedLine{"-E label oneDom", "rule-type in word 0", "invalid policy rule type (-E)"},
        RefusedLine{"-s", "argument-count in all", kCount},
        RefusedLine{"-s read grant grant", "argument-count in all", kCount},
        RefusedLine{"-s odd Grant", "grant-word in word 2", "invalid keyword Grant"},
        RefusedLine{"-s odd grant", "unknown-word in word 1", "no such word"},
        RefusedLine{"-c odd revoke", "unknown-word in word 1", "no such word"},
        RefusedLine{"-a odd odd grant", "unknown-word in word 1", "no such word"},
        RefusedLine{"-a label odd grant", "unknown-word in word 2", "no such word"},
        RefusedLine{"-a label grant", "argument-count in all", kCount},
        RefusedLine{"-u label odd grant", "unknown-word in word 2", "no such word"},
        RefusedLine{"-f label odd kind grant", "unknown-word in word 2", "no such word"},
        RefusedLine{"-f label label odd grant", "unknown-word in word 3", "no such word"},
        RefusedLine{"-f label label kind no", "grant-word in word 4", "invalid keyword no"},
        RefusedLine{"-p odd 1 grant", "unknown-word in word 1", "no such word"},
        RefusedLine{"-p check 1 2 3", "grant-word in word 4", "invalid keyword 3"},
        RefusedLine{"-p check 1 2", "grant-word in word 3", "invalid keyword 2"},
        RefusedLine{"-p check grant", "argument-count in all", kCount},
        RefusedLine{"-p check 1 2 3 grant", "argument-count in all", kCount},
        RefusedLine{"-d odd noDom odd no", "unknown-domain in word 2",
                    "Failed to fetch domain id for: noDom"},
        RefusedLine{"-d label hostDom kind no", "grant-word in word 4", "invalid keyword no"},
        RefusedLine{"-d odd hostDom odd grant", "unknown-word in word 1", "no such word"},
        RefusedLine{"-d label hostDom odd grant", "unknown-word in word 3", "no such word"},
        RefusedLine{"-r", "argument-count in all", kCount},
        RefusedLine{"-r /a rw x", "argument-count in all", kCount}));

class RefusedLabelLine : public testing::TestWithParam<RefusedLine> {
 protected:
  KnowingHost host;
  TeskAccessInterfaceImpl access;
};

TEST_P(RefusedLabelLine, IsToldWithItsPlaceAndTheWordToBlame) {
  const auto& [line, fault, reason] = GetParam();
  const PolicyTree tree({{"labels", std::string("/ok label\n") + line + "\n/never label\n"}});
  ObserverLog log;
  EXPECT_THROW(SecPolicy::LoadPolicyFileLabels(tree.Root(), access, log), BraxoException);
  EXPECT_THAT(log.Problems(),
              ElementsAre("problem " + tree / "labels" + ":2 " + fault + " " + reason));
  EXPECT_THAT(log.lines, testing::Contains("label label of /ok from " + tree / "labels" + ":1"));
  EXPECT_THAT(log.lines, testing::Not(testing::Contains(testing::HasSubstr("/never"))));
}

INSTANTIATE_TEST_SUITE_P(
    Lines, RefusedLabelLine,
    testing::Values(RefusedLine{"/a", "argument-count in all", "incorrect no of parameters"},
                    RefusedLine{"/a/*/b odd", "unknown-word in word 1", "no such word"},
                    RefusedLine{"/a/*/b label", "tree-marker in word 0",
                                "Unrecognized format for file/dir specification"}));

class ObservedLoad : public testing::Test {
 protected:
  ScriptedHost host;
  TeskAccessInterfaceImpl access;
  ObserverLog log;
};

TEST_F(ObservedLoad, TellsOfALineWithTwoObjects) {
  const PolicyTree tree({{"base", "one\ntwo words\nthree\n"}});
  EXPECT_THROW(SecPolicy::LoadPolicyObjects(tree.Root(), access, log), BraxoException);
  const std::string reason = "cannot define more than one object per line";
  EXPECT_EQ(log.lines, (std::vector<std::string>{
                           "problem " + tree / "base" + ":2 argument-count in all " + reason,
                           "error " + tree / "base" + ":2 : " + reason,
                           "error Error in parsing some object files", "end objects"}));
}

TEST_F(ObservedLoad, TellsOfADirectoryThatCannotBeRead) {
  for (const auto load :
       {static_cast<void (*)(const std::string&, TeskAccessInterfaceImpl&,
                             SecPolicy::PolicyObserver&)>(SecPolicy::LoadPolicyObjects),
        static_cast<void (*)(const std::string&, TeskAccessInterfaceImpl&,
                             SecPolicy::PolicyObserver&)>(SecPolicy::LoadPolicyDomains),
        static_cast<void (*)(const std::string&, TeskAccessInterfaceImpl&,
                             SecPolicy::PolicyObserver&)>(SecPolicy::LoadPolicyFileLabels)}) {
    ObserverLog told;
    EXPECT_THROW(load("/no/such", access, told), BraxoException);
    EXPECT_THAT(told.Problems(),
                ElementsAre("problem /no/such:0 Unable to open policy directory /no/such"));
  }
}

TEST_F(ObservedLoad, TellsOfPathRulesBeforeTheyAreInstalledAndOfTheOneThatFails) {
  const PolicyTree tree({{"one", "-r /a r\n\n-r /b q\n-r /c\n"}});
  EXPECT_THROW(SecPolicy::LoadPolicyDomains(tree.Root(), access, log), BraxoException);
  EXPECT_EQ(log.lines, (std::vector<std::string>{
                           "path /a of one:1", "path /b of one:3",
                           "problem " + tree / "one" + ":3 Unknown access privilege specified.",
                           "error Unknown access privilege specified.",
                           "error Error in setting the policy for some domains", "end domains"}));
}

TEST_F(ObservedLoad, TellsTheLineOfARuleThatTheKernelRefuses) {
  host.Fail("SetSyscallRule", Nth(2), "no room");
  const PolicyTree tree({{"one", "-s a grant\n\n-s b grant\n-s c grant\n"}});
  EXPECT_THROW(SecPolicy::LoadPolicyDomains(tree.Root(), access, log), BraxoException);
  EXPECT_THAT(log.Problems(),
              ElementsAre("problem " + tree / "one" +
                          ":3 Error in setting policy for domain: one: 3 : no room"));
}

TEST_F(ObservedLoad, TellsOfConflictsOnce) {
  host.Fail("CheckCapabilityParamRuleConstraints", "they conflict");
  const PolicyTree tree({{"one", "-p check 1 grant\n"}});
  EXPECT_THROW(SecPolicy::LoadPolicyDomains(tree.Root(), access, log), BraxoException);
  EXPECT_THAT(log.Problems(),
              ElementsAre("problem " + tree / "one" +
                          ":0 Policy constraint error for domain: one : they conflict"));
}

TEST_F(ObservedLoad, TellsOfLabelsThatCannotBeGiven) {
  host.FailErrno("SetXattr", "/b", EPERM);
  const PolicyTree tree({{"labels", "/a label\n/b label\n"}});
  EXPECT_THROW(SecPolicy::LoadPolicyFileLabels(tree.Root(), access, log), BraxoException);
  EXPECT_THAT(log.Problems(), ElementsAre("problem " + tree / "labels" +
                                          ":2 Unable to set file label (label) for file /b: "
                                          "Operation not permitted"));
}

TEST_F(ObservedLoad, EndsThePhaseWhenAnotherExceptionPasses) {
  host.FailForeign("GetInvalidLabels");
  const PolicyTree tree({{"base", "one\n"}});
  EXPECT_THROW(SecPolicy::LoadPolicyObjects(tree.Root(), access, log), ForeignException);
  EXPECT_EQ(log.lines, (std::vector<std::string>{"end objects"}));
}

constexpr char kToolPolicy[] = "/etc/zorvan/secpolicy/tardisks/tool";

class RefusedTardiskLine : public FixedRootsTest, public testing::WithParamInterface<RefusedLine> {
 protected:
  ScriptedHost host;
  TeskAccessInterfaceImpl access;
};

TEST_P(RefusedTardiskLine, IsToldWithItsPlaceAndTheWordToBlame) {
  const auto& [line, fault, reason] = GetParam();
  const FixedRoots roots(
      {{"/tardisks/tool.tgz", ""}, {kToolPolicy, std::string("-E label hostDom\n") + line}});
  host.SetTardisk(kToolPolicy, "tool.tgz");
  host.tardiskLaunchDomains.clear();
  ObserverLog log;
  EXPECT_THROW(SecPolicy::LoadPolicyTardisks("/etc/zorvan/secpolicy/tardisks", access, log),
               BraxoException);
  EXPECT_THAT(log.Problems(),
              ElementsAre(std::string("problem ") + kToolPolicy + ":2 " + fault + " " + reason));
}

INSTANTIATE_TEST_SUITE_P(Lines, RefusedTardiskLine,
                         testing::Values(RefusedLine{"-x", "rule-type in word 0",
                                                     "invalid tardisk policy rule type (-x)"},
                                         RefusedLine{"-E other hostDom", "second-rule in all",
                                                     "Only one rule of this type is allowed"}));

class RefusedOnlyTardiskLine : public RefusedTardiskLine {};

TEST_P(RefusedOnlyTardiskLine, IsToldWithItsPlaceAndTheWordToBlame) {
  const auto& [line, fault, reason] = GetParam();
  const FixedRoots roots({{"/tardisks/tool.tgz", ""}, {kToolPolicy, line}});
  host.SetTardisk(kToolPolicy, "tool.tgz");
  host.hiddenDomains = {"noDom"};
  ObserverLog log;
  EXPECT_THROW(SecPolicy::LoadPolicyTardisks("/etc/zorvan/secpolicy/tardisks", access, log),
               BraxoException);
  EXPECT_THAT(log.Problems(),
              ElementsAre(std::string("problem ") + kToolPolicy + ":1 " + fault + " " + reason));
}

INSTANTIATE_TEST_SUITE_P(Lines, RefusedOnlyTardiskLine,
                         testing::Values(RefusedLine{"-E label", "argument-count in all", kCount},
                                         RefusedLine{"-E label noDom", "unknown-domain in word 2",
                                                     "Failed to fetch domain id for noDom"}));

}  // namespace
}  // namespace SecPolicyTest
