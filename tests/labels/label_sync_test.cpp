// Labels of the policy beside those of the kernel: which are removed and added, in which order,
// and what is printed of them.

#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <string>
#include <vector>

#include "labels/expected_reports.h"
#include "secpolicy/secpolicy.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

using TeskCtl::Security::TESKACCESS_LABEL_DOMAIN;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;

using Names = std::vector<std::string>;
using KernelLabels = std::map<std::string, long>;

constexpr auto kOtherLabelType = static_cast<TeskAccessLabelType>(2);

// A call of one of the functions, on an interface object that was there before.
class LabelSync : public testing::Test {
 protected:
  Transcript Sync(const Names& policyLabels, const KernelLabels& kernelLabels,
                  TeskAccessLabelType type = TESKACCESS_LABEL_OBJECT) {
    return Record(
        [&] { SecPolicy::SyncLabelsFromPolicy(policyLabels, kernelLabels, type, access); });
  }
  Names Obsolete(const Names& policyLabels, const KernelLabels& kernelLabels,
                 TeskAccessLabelType type = TESKACCESS_LABEL_OBJECT) {
    return SecPolicy::GetObsoleteLabels(policyLabels, kernelLabels, type, access);
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
};

class SyncLabelsFromPolicy : public LabelSync {};
class GetObsoleteLabels : public LabelSync {};
class PrintInvalidLabels : public LabelSync {};
class PrintObsoleteLabels : public LabelSync {};

TEST_F(SyncLabelsFromPolicy, PrintsNothingWhenNothingChanges) {
  EXPECT_EQ(Sync({"tool", "base"}, {{"base", 4}, {"tool", 5}}).Text(),
            Lines({
                R"(GetInvalidLabels(OBJECT))",
                R"(RemoveLabels([], OBJECT))",
                R"(AddLabels([], OBJECT))",
                R"(RemoveLabels([], OBJECT))",
                R"(AddLabels(["tool", "base"], OBJECT))",
                R"(returns)",
            }));
}

TEST_F(SyncLabelsFromPolicy, MakesInvalidLabelsAnewThenRemovesObsoleteThenAddsThePolicys) {
  host.invalidLabels[TESKACCESS_LABEL_OBJECT] = {"stale", "base"};
  EXPECT_EQ(Sync({"tool", "base"}, {{"old", 7}, {"base", 4}, {"older", 8}}).Text(),
            Lines({
                R"(GetInvalidLabels(OBJECT))",
                R"(RemoveLabels(["stale", "base"], OBJECT))",
                R"(AddLabels(["stale", "base"], OBJECT))",
                ReportedInformation("The values of the following objects have been changed:"),
                ReportedInformation("stale"),
                ReportedInformation("base"),
                R"(IsPredefinedLabel("old", OBJECT))",
                R"(IsPredefinedLabel("older", OBJECT))",
                R"(RemoveLabels(["old", "older"], OBJECT))",
                ReportedInformation("The following objects have been removed:"),
                ReportedInformation("old"),
                ReportedInformation("older"),
                R"(AddLabels(["tool", "base"], OBJECT))",
                R"(returns)",
            }));
}

TEST_F(SyncLabelsFromPolicy, SpeaksOfDomainsForDomainLabels) {
  host.invalidLabels[TESKACCESS_LABEL_DOMAIN] = {"staleDom"};
  EXPECT_EQ(Sync({"newDom"}, {{"oldDom", 7}}, TESKACCESS_LABEL_DOMAIN).Text(),
            Lines({
                R"(GetInvalidLabels(DOMAIN))",
                R"(RemoveLabels(["staleDom"], DOMAIN))",
                R"(AddLabels(["staleDom"], DOMAIN))",
                ReportedInformation("The values of the following domains have been changed:"),
                ReportedInformation("staleDom"),
                R"(IsPrivilegedVm("oldDom"))",
                R"(IsPredefinedLabel("oldDom", DOMAIN))",
                R"(RemoveLabels(["oldDom"], DOMAIN))",
                ReportedInformation("The following domains have been removed:"),
                ReportedInformation("oldDom"),
                R"(AddLabels(["newDom"], DOMAIN))",
                R"(returns)",
            }));
}

TEST_F(SyncLabelsFromPolicy, ReportsALabelThatIsInvalidAndObsoleteTwice) {
  host.invalidLabels[TESKACCESS_LABEL_OBJECT] = {"stale"};
  EXPECT_EQ(Sync({}, {{"stale", 7}}).Text(),
            Lines({
                R"(GetInvalidLabels(OBJECT))",
                R"(RemoveLabels(["stale"], OBJECT))",
                R"(AddLabels(["stale"], OBJECT))",
                ReportedInformation("The values of the following objects have been changed:"),
                ReportedInformation("stale"),
                R"(IsPredefinedLabel("stale", OBJECT))",
                R"(RemoveLabels(["stale"], OBJECT))",
                ReportedInformation("The following objects have been removed:"),
                ReportedInformation("stale"),
                R"(AddLabels([], OBJECT))",
                R"(returns)",
            }));
}

TEST_F(SyncLabelsFromPolicy, KeepsPredefinedLabelsWithoutAWord) {
  host.predefinedLabels = {"unlabeled"};
  EXPECT_EQ(Sync({"tool"}, {{"unlabeled", 2}}).Text(),
            Lines({
                R"(GetInvalidLabels(OBJECT))",
                R"(RemoveLabels([], OBJECT))",
                R"(AddLabels([], OBJECT))",
                R"(IsPredefinedLabel("unlabeled", OBJECT))",
                R"(RemoveLabels([], OBJECT))",
                R"(AddLabels(["tool"], OBJECT))",
                R"(returns)",
            }));
}

TEST_F(SyncLabelsFromPolicy, HandsDuplicatesOnAsTheyCome) {
  EXPECT_EQ(Sync({"tool", "base", "tool"}, {}).Text(),
            Lines({
                R"(GetInvalidLabels(OBJECT))",
                R"(RemoveLabels([], OBJECT))",
                R"(AddLabels([], OBJECT))",
                R"(RemoveLabels([], OBJECT))",
                R"(AddLabels(["tool", "base", "tool"], OBJECT))",
                R"(returns)",
            }));
}

TEST_F(SyncLabelsFromPolicy, DoesNotLookAtTheResultsOfRemovingAndAdding) {
  host.invalidLabels[TESKACCESS_LABEL_OBJECT] = {"stale"};
  const std::string wellDone = Sync({"tool"}, {{"old", 7}}).Text();
  host.ReturnFalse("RemoveLabels");
  host.ReturnFalse("AddLabels");
  EXPECT_EQ(Sync({"tool"}, {{"old", 7}}).Text(), wellDone);
  EXPECT_TRUE(wellDone.ends_with("AddLabels([\"tool\"], OBJECT)\nreturns\n")) << wellDone;
}

// Everything that a synchronisation with one invalid and one obsolete label does.
const std::vector<std::string> kWholeSync = {
    R"(GetInvalidLabels(OBJECT))",
    R"(RemoveLabels(["stale"], OBJECT))",
    R"(AddLabels(["stale"], OBJECT))",
    R"(WriteToKlog("The values of the following objects have been changed:", "[INFO]"))",
    R"(WriteToKlog("stale", "[INFO]"))",
    R"(IsPredefinedLabel("old", OBJECT))",
    R"(RemoveLabels(["old"], OBJECT))",
    R"(WriteToKlog("The following objects have been removed:", "[INFO]"))",
    R"(WriteToKlog("old", "[INFO]"))",
    R"(AddLabels(["tool"], OBJECT))",
};

TEST(SyncLabelsFromPolicyFaults, AnyFailingStepEndsItAndPassesUnchanged) {
  for (unsigned int failing = 1; failing <= kWholeSync.size() + 1; ++failing) {
    SCOPED_TRACE(failing);
    ScriptedHost host;
    host.syslogRunning = false;
    host.invalidLabels[TESKACCESS_LABEL_OBJECT] = {"stale"};
    TeskAccessInterfaceImpl access;
    // The first call of all made the interface object.
    host.FailCall(failing + 1, DerivedBraxoException("refused"));

    const Transcript run = Record([&] {
      SecPolicy::SyncLabelsFromPolicy({"tool"}, {{"old", 7}}, TESKACCESS_LABEL_OBJECT, access);
    });

    std::string expected;
    for (unsigned int step = 0; step < std::min<std::size_t>(failing, kWholeSync.size()); ++step) {
      expected += kWholeSync[step] + "\n";
    }
    expected += failing > kWholeSync.size()
                    ? "returns\n"
                    : "throws SecPolicyTest::DerivedBraxoException: refused\n";
    EXPECT_EQ(run.Text(), expected);
  }
}

TEST_F(SyncLabelsFromPolicy, PassesForeignExceptions) {
  host.FailForeign("RemoveLabels", Nth(2));
  EXPECT_EQ(Sync({"tool"}, {{"old", 7}}).Text(),
            Lines({
                R"(GetInvalidLabels(OBJECT))",
                R"(RemoveLabels([], OBJECT))",
                R"(AddLabels([], OBJECT))",
                R"(IsPredefinedLabel("old", OBJECT))",
                R"(RemoveLabels(["old"], OBJECT))",
                R"(throws SecPolicyTest::ForeignException: foreign)",
            }));
}

TEST_F(GetObsoleteLabels, AreInAscendingOrderWhateverTheIdentifiers) {
  EXPECT_EQ(Obsolete({"keep"}, {{"z", 1}, {"a", 9}, {"keep", 3}, {"Z", 5}, {"m", 2}}),
            (Names{"Z", "a", "m", "z"}));
}

TEST_F(GetObsoleteLabels, AreNoneWhenTheKernelHasNone) {
  EXPECT_EQ(Obsolete({"tool"}, {}), Names{});
}

TEST_F(GetObsoleteLabels, DistinguishLetterCase) {
  EXPECT_EQ(Obsolete({"Tool"}, {{"Tool", 4}, {"tool", 5}, {"TOOL", 6}}), (Names{"TOOL", "tool"}));
}

TEST_F(GetObsoleteLabels, AreComparedWhole) {
  EXPECT_EQ(Obsolete({"tool", "to"}, {{"tool", 4}, {"too", 5}, {"tools", 6}}),
            (Names{"too", "tools"}));
}

TEST_F(GetObsoleteLabels, AreFoundThroughUnsortedAndRepeatedPolicyLabels) {
  EXPECT_EQ(Obsolete({"z", "a", "z", "m"}, {{"a", 4}, {"b", 5}, {"m", 6}, {"z", 7}}), Names{"b"});
}

TEST_F(GetObsoleteLabels, LeaveOutPredefinedLabels) {
  host.predefinedLabels = {"unlabeled"};
  EXPECT_EQ(Obsolete({}, {{"unlabeled", 2}, {"old", 4}}), Names{"old"});
}

TEST_F(GetObsoleteLabels, LeaveOutPrivilegedVmsAmongDomains) {
  host.privilegedVms = {"vmDom"};
  EXPECT_EQ(Obsolete({}, {{"vmDom", 2}, {"oldDom", 4}}, TESKACCESS_LABEL_DOMAIN), Names{"oldDom"});
}

TEST_F(GetObsoleteLabels, IncludeObjectsThatAreCalledLikeAPrivilegedVm) {
  host.privilegedVms = {"vmDom"};
  const Transcript run = Record([&] {
    EXPECT_EQ(Obsolete({}, {{"vmDom", 2}}, TESKACCESS_LABEL_OBJECT), Names{"vmDom"});
  });
  EXPECT_EQ(run.Text(), Lines({R"(IsPredefinedLabel("vmDom", OBJECT))", "returns"}));
}

TEST_F(GetObsoleteLabels, IgnorePrivilegedVmsForEveryOtherType) {
  host.privilegedVms = {"vmDom"};
  const Transcript run = Record([&] {
    EXPECT_EQ(Obsolete({}, {{"vmDom", 2}}, kOtherLabelType), Names{"vmDom"});
  });
  EXPECT_EQ(run.Text(), Lines({R"(IsPredefinedLabel("vmDom", 2))", "returns"}));
}

TEST_F(GetObsoleteLabels, AskForThePrivilegedVmFirstThenThePolicyThenThePredefined) {
  host.privilegedVms = {"aVm"};
  const Transcript run = Record([&] {
    Obsolete({"bPolicy"}, {{"aVm", 2}, {"bPolicy", 3}, {"cOld", 4}}, TESKACCESS_LABEL_DOMAIN);
  });
  EXPECT_EQ(run.Text(), Lines({
                            R"(IsPrivilegedVm("aVm"))",
                            R"(IsPrivilegedVm("bPolicy"))",
                            R"(IsPrivilegedVm("cOld"))",
                            R"(IsPredefinedLabel("cOld", DOMAIN))",
                            R"(returns)",
                        }));
}

TEST_F(GetObsoleteLabels, PassExceptions) {
  host.FailWith("IsPrivilegedVm", Every(), DerivedBraxoException("no vm table"));
  EXPECT_EQ(Record([&] {
              Obsolete({}, {{"aVm", 2}}, TESKACCESS_LABEL_DOMAIN);
            }).Text(),
            Lines({
                R"(IsPrivilegedVm("aVm"))",
                R"(throws SecPolicyTest::DerivedBraxoException: no vm table)",
            }));
}

TEST_F(PrintInvalidLabels, PrintNothingForNone) {
  EXPECT_EQ(Record([] { SecPolicy::PrintInvalidLabels({}, TESKACCESS_LABEL_OBJECT); }).Text(),
            Lines({"returns"}));
}

TEST_F(PrintInvalidLabels, KeepTheOrderOfTheList) {
  EXPECT_EQ(Record([] {
              SecPolicy::PrintInvalidLabels({"z", "a", "z"}, TESKACCESS_LABEL_OBJECT);
            }).Text(),
            Lines({
                ReportedInformation("The values of the following objects have been changed:"),
                ReportedInformation("z"),
                ReportedInformation("a"),
                ReportedInformation("z"),
                "returns",
            }));
}

TEST_F(PrintInvalidLabels, SpeakOfDomainsForTypeZeroOnly) {
  const auto headingOf = [](TeskAccessLabelType type) {
    return Record([=] { SecPolicy::PrintInvalidLabels({"a"}, type); }).trace.at(0);
  };
  EXPECT_EQ(headingOf(TESKACCESS_LABEL_DOMAIN),
            ReportedInformation("The values of the following domains have been changed:"));
  EXPECT_EQ(headingOf(kOtherLabelType),
            ReportedInformation("The values of the following objects have been changed:"));
}

TEST_F(PrintObsoleteLabels, PrintNothingForNone) {
  EXPECT_EQ(Record([] { SecPolicy::PrintObsoleteLabels({}, TESKACCESS_LABEL_DOMAIN); }).Text(),
            Lines({"returns"}));
}

TEST_F(PrintObsoleteLabels, KeepTheOrderOfTheList) {
  EXPECT_EQ(Record([] {
              SecPolicy::PrintObsoleteLabels({"z", "a"}, TESKACCESS_LABEL_OBJECT);
            }).Text(),
            Lines({
                ReportedInformation("The following objects have been removed:"),
                ReportedInformation("z"),
                ReportedInformation("a"),
                "returns",
            }));
}

TEST_F(PrintObsoleteLabels, SpeakOfDomainsForTypeZeroOnly) {
  const auto headingOf = [](TeskAccessLabelType type) {
    return Record([=] { SecPolicy::PrintObsoleteLabels({"a"}, type); }).trace.at(0);
  };
  EXPECT_EQ(headingOf(TESKACCESS_LABEL_DOMAIN),
            ReportedInformation("The following domains have been removed:"));
  EXPECT_EQ(headingOf(kOtherLabelType),
            ReportedInformation("The following objects have been removed:"));
}

}  // namespace
}  // namespace SecPolicyTest
