// The plan of a whole domain: that every rule has its fate, by what this kernel can do.

#include "host/enforce/compile.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "domain_of.h"
#include "host/enforce/module/module_plan.h"

namespace EnforceTest {
namespace {

using Enforce::Compile;
using Enforce::CompiledPlan;
using Enforce::Fate;
using Enforce::Features;
using Enforce::FileKind;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::EndsWith;
using ::testing::Field;
using ::testing::IsEmpty;
using ::testing::SizeIs;

// Every path is a directory without entries, but for one device and one file.
class EmptyDirectories : public Enforce::FileTree {
 public:
  FileKind KindOf(const std::string& path) override {
    if (path == "/dev/null") return FileKind::kSpecial;
    return path == "/dev/file" ? FileKind::kFile : FileKind::kDirectory;
  }
  std::optional<std::vector<std::string>> List(const std::string& /*directory*/,
                                               std::size_t /*most*/) override {
    return std::vector<std::string>();
  }
  bool CanMask() override { return true; }
};

Features NewKernel() {
  return {.landlock = 7,
          .seccomp = true,
          .notifies = true,
          .capabilities = ~std::uint64_t{0},
          .lastCapability = 40};
}

const std::vector<std::string> kOneOfEachKind = {"-a label read grant",
                                                 "-c cap_kill grant",
                                                 "-d gate otherDom exec grant",
                                                 "-f label label regular grant",
                                                 "-p set_uid 7 grant",
                                                 "-p bind_port 80 grant",
                                                 "-s read grant",
                                                 "-u label stream revoke"};

constexpr std::uint64_t kAllRights = Enforce::Landlock::AllRights(7);

CompiledPlan CompileOn(const Features& features, const std::vector<std::string>& lines) {
  EmptyDirectories files;
  const std::vector<Enforce::LabelledPath> places = {{"/", "label"}};
  return Compile(DomainOf(lines), {.features = features, .places = places, .files = files});
}

TEST(Compile, GivesEveryRuleItsFateInOrder) {
  const CompiledPlan compiled = CompileOn(NewKernel(), kOneOfEachKind);
  ASSERT_EQ(compiled.fates.size(), kOneOfEachKind.size());
  for (std::size_t index = 0; index < kOneOfEachKind.size(); ++index) {
    EXPECT_EQ(compiled.fates[index].rule.Text(), kOneOfEachKind[index]);
  }
}

TEST(Compile, TakesWhatEachPartHas) {
  const CompiledPlan compiled = CompileOn(NewKernel(), kOneOfEachKind);
  EXPECT_EQ(compiled.plan.handledFiles, kAllRights);
  EXPECT_THAT(compiled.plan.paths, ElementsAre(Field(&Enforce::PathRight::path, "/")));
  EXPECT_TRUE(compiled.plan.bindsChecked);
  EXPECT_THAT(compiled.plan.bindPorts, ElementsAre(80));
  EXPECT_EQ(compiled.plan.capabilities, std::uint64_t{1} << 5);
  EXPECT_TRUE(compiled.plan.isScoped);
  EXPECT_FALSE(compiled.plan.filter.empty());
  EXPECT_TRUE(compiled.plan.secret.has_value());
}

TEST(Compile, TakesThePortsOfBothEnds) {
  const CompiledPlan compiled =
      CompileOn(NewKernel(), {"-p bind_port 80 grant", "-p connect_port 443 grant"});
  EXPECT_TRUE(compiled.plan.connectsChecked);
  EXPECT_THAT(compiled.plan.bindPorts, ElementsAre(80));
  EXPECT_THAT(compiled.plan.connectPorts, ElementsAre(443));
}

// What says that nothing can start there.
TEST(Compile, KnowsWhetherProgramsMayEndAndMapFiles) {
  const auto of = [](const std::vector<std::string>& lines) {
    const CompiledPlan compiled = CompileOn(NewKernel(), lines);
    return std::pair(compiled.plan.mayEnd, compiled.plan.mayMap);
  };
  EXPECT_EQ(of({"-s @start grant"}), std::pair(true, true));
  EXPECT_EQ(of({"-s @io grant"}), std::pair(false, false));
  EXPECT_EQ(of({"-s exit grant"}), std::pair(true, false));
  EXPECT_EQ(of({"-s exit_group grant", "-s mmap grant"}), std::pair(true, true));
  EXPECT_EQ(of({"-s @start grant", "-s mmap revoke"}), std::pair(true, false));
  EXPECT_EQ(of({"-s @start grant", "-s exit revoke", "-s exit_group revoke"}),
            std::pair(false, true));
}

TEST(Compile, TellsWhatAKernelWithoutLandlockCannotRefuse) {
  for (const int version : {0, 1, 2}) {
    Features features = NewKernel();
    features.landlock = version;
    const CompiledPlan compiled =
        CompileOn(features, {"-r /srv rw", "-a label read grant", "-c cap_kill grant"});
    EXPECT_EQ(compiled.plan.handledFiles, 0U);
    EXPECT_THAT(compiled.plan.paths, IsEmpty());
    EXPECT_EQ(NotExpressible(compiled.fates).size(), 2U) << version;
    EXPECT_EQ(compiled.fates[0].how,
              "this kernel's Landlock cannot refuse what no rule grants (version 3 or newer can)");
  }
}

// ---- Domains that write nothing

std::uint64_t HandledFor(const std::vector<std::string>& lines) {
  return CompileOn(NewKernel(), lines).plan.handledFiles;
}

TEST(Compile, LeavesTruncationToTheFilterWhereNothingIsWritten) {
  constexpr std::uint64_t kWithoutTruncation = kAllRights & ~Enforce::Landlock::kTruncate;
  EXPECT_EQ(HandledFor({}), kWithoutTruncation);
  EXPECT_EQ(HandledFor({"-r /srv rx", "-s @file grant"}), kWithoutTruncation);
  for (const char* const line : {"-r /srv rw", "-a label write grant", "-a label truncate grant",
                                 "-a label remove grant", "-f label label regular grant"}) {
    EXPECT_EQ(HandledFor({"-a label read grant", line}), kAllRights) << line;
  }
}

// Nearly every program writes to one, and none can be emptied.
TEST(Compile, LeavesTruncationToTheFilterWhereOnlyDevicesAreWritten) {
  EXPECT_EQ(HandledFor({"-r /srv rx", "-r /dev/null rw"}),
            kAllRights & ~Enforce::Landlock::kTruncate);
  EXPECT_EQ(HandledFor({"-r /srv rx", "-r /dev/file rw"}), kAllRights);
  EXPECT_EQ(HandledFor({"-r /dev/null rw", "-r /srv rw"}), kAllRights);
}

// Whatever is in place of the device when the domain is entered could be emptied.
TEST(Compile, LeavesTruncationToLandlockWhereADeviceMayBeWrittenAndNotTruncated) {
  EmptyDirectories files;
  const Features features = NewKernel();
  const std::vector<Enforce::LabelledPath> places = {{"/dev/null", "device"}};
  const auto handledFor = [&](const std::vector<std::string>& lines) {
    return Compile(DomainOf(lines), {.features = features, .places = places, .files = files})
        .plan.handledFiles;
  };
  EXPECT_EQ(handledFor({"-a device write grant", "-a device truncate grant"}),
            kAllRights & ~Enforce::Landlock::kTruncate);
  EXPECT_EQ(handledFor({"-a device write grant"}), kAllRights);
}

TEST(Compile, LeavesTruncationToLandlockBesideACallWhoseFlagsNoFilterSees) {
  EXPECT_EQ(HandledFor({"-r /srv r", "-s openat2 grant"}), kAllRights);
  EXPECT_THAT(CompileOn(NewKernel(), {"-s openat2 grant"}).fates,
              ElementsAre(Field(&Enforce::RuleFate::fate, Fate::kEnforced)));
  EXPECT_THAT(CompileOn(NewKernel(), {"-s @file grant"}).fates,
              ElementsAre(Field(&Enforce::RuleFate::fate, Fate::kNarrowed)));
  EXPECT_THAT(CompileOn(NewKernel(), {"-s @file grant", "-r /srv rw"}).fates,
              Each(Field(&Enforce::RuleFate::fate, Fate::kEnforced)));
}

TEST(Compile, LeavesTruncationToLandlockWhereThereAreNoFilters) {
  Features features = NewKernel();
  features.seccomp = false;
  EXPECT_EQ(CompileOn(features, {"-r /srv r"}).plan.handledFiles, kAllRights);
}

TEST(Compile, KeepsFilesWholeOnKernelsWhoseLandlockCannot) {
  for (const int version : {1, 2}) {
    Features features = NewKernel();
    features.landlock = version;
    const CompiledPlan compiled = CompileOn(features, {"-r /srv rx", "-s openat grant"});
    EXPECT_TRUE(KeepsAllRules(compiled));
    EXPECT_EQ(compiled.plan.handledFiles, Enforce::Landlock::AllRights(version));
    EXPECT_THAT(compiled.plan.paths, SizeIs(1));
    EXPECT_FALSE(KeepsAllRules(CompileOn(features, {"-r /srv rx", "-s openat2 grant"})));
    features.seccomp = false;
    EXPECT_THAT(CompileOn(features, {"-r /srv rx"}).gaps, SizeIs(2)) << version;
  }
}

TEST(Compile, AsksLandlockNothingOfWhatAllFilesMayBeReadFor) {
  constexpr std::uint64_t kReading = Enforce::Landlock::kReadFile | Enforce::Landlock::kReadDir;
  const CompiledPlan compiled = CompileOn(NewKernel(), {"-r / rx", "-r /srv r"});
  EXPECT_EQ(compiled.plan.handledFiles & kReading, 0U);
  EXPECT_NE(compiled.plan.handledFiles & Enforce::Landlock::kExecute, 0U);
  EXPECT_EQ(HandledFor({"-a label read grant"}) & kReading, Enforce::Landlock::kReadDir);
  EXPECT_EQ(HandledFor({"-r / r", "-r /srv"}) & kReading, kReading);
  EXPECT_EQ(HandledFor({"-r / r", "-r /srv rw"}), kAllRights);
}

// Or who comes by a descriptor of what is outside could read that, too.
TEST(Compile, AsksLandlockOfAllFilesBelowARoot) {
  EmptyDirectories files;
  const Features features = NewKernel();
  const auto plan =
      Compile(DomainOf({"-r / r"}),
              {.features = features, .places = {}, .files = files, .isBelowRoot = true})
          .plan;
  EXPECT_EQ(plan.handledFiles, kAllRights & ~Enforce::Landlock::kTruncate);
  EXPECT_THAT(plan.paths, SizeIs(1));
}

// ---- Other kernels

TEST(Compile, TellsWhatCannotBeRefusedAlsoWhereNoRuleIsAboutIt) {
  EXPECT_THAT(CompileOn(NewKernel(), {"-s read grant"}).gaps, IsEmpty());
  EXPECT_THAT(CompileOn(Features{}, {}).gaps,
              ElementsAre("this kernel's Landlock cannot refuse what no rule grants (version 3 or "
                          "newer can)",
                          "this kernel filters no system calls"));
}

TEST(Compile, GivesNoRightThatTheKernelDoesNotKnow) {
  for (int version = 3; version <= 7; ++version) {
    Features features = NewKernel();
    features.landlock = version;
    const CompiledPlan compiled = CompileOn(features, {"-r /srv rw"});
    const std::uint64_t known = Enforce::Landlock::AllRights(version);
    EXPECT_EQ(compiled.plan.handledFiles, known);
    for (const auto& right : compiled.plan.paths) EXPECT_EQ(right.rights & ~known, 0U) << version;
    EXPECT_EQ(compiled.plan.isScoped, version >= 6);
  }
}

TEST(Compile, TellsHowFarSignalsReach) {
  Features features = NewKernel();
  const std::vector<std::string> lines = {"-s kill grant", "-s @signal grant", "-s tkill revoke",
                                          "-s read grant"};
  const std::vector<Fate> narrowed = {Fate::kNarrowed, Fate::kNarrowed, Fate::kEnforced,
                                      Fate::kEnforced};
  const CompiledPlan compiled = CompileOn(features, lines);
  for (std::size_t index = 0; index < lines.size(); ++index) {
    EXPECT_EQ(compiled.fates[index].fate, narrowed[index]) << lines[index];
  }
  EXPECT_EQ(compiled.fates[0].how,
            "signals reach only what was started with the same entry into the domain");
  features.landlock = 5;
  EXPECT_EQ(CompileOn(features, lines).fates[0].fate, Fate::kEnforced);
}

TEST(Compile, KeepsABrokerForWhoIsLedElsewhereAndMayAsk) {
  const auto keepsBroker = [](std::vector<std::string> lines) {
    lines.insert(lines.end(), {"-s pipe2 grant", "-s @network grant"});
    return CompileOn(NewKernel(), lines).plan.keepsBroker;
  };
  EXPECT_TRUE(keepsBroker({"-d program otherDom exec grant"}));
  EXPECT_FALSE(keepsBroker({}));
  EXPECT_FALSE(keepsBroker({"-d program testDom exec grant"}));
  EXPECT_FALSE(keepsBroker({"-d program otherDom exec revoke"}));
  EXPECT_FALSE(keepsBroker({"-d program otherDom tardisk_exec grant"}));
  EXPECT_FALSE(keepsBroker({"-d program otherDom exec grant", "-s sendmsg revoke"}));

  EmptyDirectories files;
  const Features features = NewKernel();
  auto domain = DomainOf({"-d program otherDom exec grant", "-s @io grant", "-s sendmsg grant"});
  const Enforce::Surroundings surroundings{.features = features, .places = {}, .files = files};
  EXPECT_TRUE(Compile(domain, surroundings).plan.keepsBroker);
  domain.level = Policy::Level::kPermissive;
  EXPECT_FALSE(Compile(domain, surroundings).plan.keepsBroker);
}

TEST(Compile, TellsWaysOutThatCannotBeAskedForFromWithin) {
  const auto told = [](const std::vector<std::string>& lines) {
    return CompileOn(NewKernel(), lines).fates.front().how;
  };
  const std::string way = "-d program otherDom exec grant";
  EXPECT_EQ(told({way, "-s pipe2 grant", "-s sendmsg grant"}), "only by \"secpolicy exec\"");
  EXPECT_EQ(told({way, "-s pipe2 grant"}),
            "only by \"secpolicy exec\" from outside of the domain, as asking from within takes "
            "-s pipe2 and sendmsg");
}

TEST(Compile, TellsWhatAKernelWithoutFiltersCannotRefuse) {
  Features features = NewKernel();
  features.seccomp = false;
  const CompiledPlan compiled = CompileOn(features, {"-s read grant", "-p set_uid 7 grant"});
  EXPECT_THAT(compiled.fates, Each(Field(&Enforce::RuleFate::fate, Fate::kNotExpressible)));
}

TEST(Compile, ShowsPeopleWhatBecomesOfAllRules) {
  EmptyDirectories files;
  Features features = NewKernel();
  features.seccomp = false;
  const Enforce::Surroundings surroundings{.features = features, .places = {}, .files = files};
  auto domain = DomainOf({"-s kill grant", "-c cap_chown grant", "-r /srv r"});
  domain.rules[2].origin = {.file = "/etc/policy/testDom", .line = 7};
  const std::string lines =
      "notExpressible: files and calls beyond the rules (this kernel filters no system calls)\n"
      "notExpressible: -s kill grant (this kernel filters no system calls; signals reach only what "
      "was started with the same entry into the domain)\n"
      "enforced: -c cap_chown grant\n"
      "enforced: /etc/policy/testDom:7: -r /srv r\n";
  std::string shown;
  const CompiledPlan compiled = Compile(domain, surroundings);
  for (const std::string& line : CoverageOf(compiled)) shown += line + "\n";
  EXPECT_EQ(shown, lines);
  EXPECT_THAT(Explain(domain, surroundings), EndsWith("\nrefused: all others\n" + lines));
}

// ---- Beside the module

CompiledPlan CompileBesideModule(const std::vector<std::string>& lines,
                                 const Features& features = NewKernel()) {
  const auto domain = DomainOf(lines);
  return Enforce::CompileBesideModule(domain, Enforce::FatesByModule(domain, 40), features);
}

TEST(CompileBesideModule, PlansNothingButAFilter) {
  const CompiledPlan compiled = CompileBesideModule(kOneOfEachKind);
  EXPECT_EQ(compiled.plan.handledFiles, 0U);
  EXPECT_THAT(compiled.plan.paths, IsEmpty());
  EXPECT_FALSE(compiled.plan.bindsChecked || compiled.plan.connectsChecked);
  EXPECT_FALSE(compiled.plan.isScoped || compiled.plan.keepsBroker);
  EXPECT_FALSE(compiled.plan.filter.empty());
  EXPECT_TRUE(KeepsAllRules(compiled));
}

TEST(CompileBesideModule, TellsOfEachRuleInOrder) {
  const CompiledPlan compiled = CompileBesideModule(kOneOfEachKind);
  ASSERT_EQ(compiled.fates.size(), kOneOfEachKind.size());
  for (std::size_t index = 0; index < kOneOfEachKind.size(); ++index) {
    EXPECT_EQ(compiled.fates[index].rule.Text(), kOneOfEachKind[index]);
  }
  EXPECT_THAT(Told(compiled.fates),
              ElementsAre("narrowed: -d gate otherDom exec grant (what the filter of this domain "
                          "refuses is refused there, too)"));
}

// The module alone refuses the first one by halves.
TEST(CompileBesideModule, RefusesCallsThatComeToNoHook) {
  const std::vector<std::string> lines = {"-s fsync revoke", "-s ioctl grant"};
  EXPECT_EQ(Enforce::FatesByModule(DomainOf(lines), 40)[0].fate, Fate::kNotExpressible);
  EXPECT_THAT(CoverageOf(CompileBesideModule(lines)),
              ElementsAre("enforced: -s fsync revoke",
                          "narrowed: -s ioctl grant (ioctl: TIOCSTI is refused unless granted by "
                          "itself; ioctl: TIOCLINUX is refused unless granted by itself; ioctl: "
                          "FS_IOC_SETFLAGS is refused unless granted by itself; ioctl: "
                          "FS_IOC_FSSETXATTR is refused unless granted by itself)"));
}

TEST(CompileBesideModule, LeavesTheModulesFatesWhereNothingIsFiltered) {
  Features features = NewKernel();
  features.seccomp = false;
  const CompiledPlan compiled =
      CompileBesideModule({"-s fsync revoke", "-c cap_kill grant"}, features);
  EXPECT_FALSE(KeepsAllRules(compiled));
  EXPECT_THAT(compiled.gaps, SizeIs(1));
  EXPECT_EQ(compiled.fates[0].fate, Fate::kNotExpressible);
  EXPECT_EQ(compiled.fates[1].fate, Fate::kEnforced);
}

TEST(CompileBesideModule, ShowsPeopleWhoKeepsTheRules) {
  const auto domain = DomainOf({"-s kill grant"});
  EXPECT_EQ(Enforce::ExplainBesideModule(domain, Enforce::FatesByModule(domain, 40), NewKernel()),
            "the module keeps the rules, and a filter all those about system calls\n"
            "answered as unknown: clone3\n"
            "allowed: kill\n"
            "refused but to enter: execve execveat exit_group write\n"
            "refused: all others\n"
            "enforced: -s kill grant\n");
}

// Every path is a directory with too many entries to list.
class CrowdedDirectories : public EmptyDirectories {
 public:
  std::optional<std::vector<std::string>> List(const std::string& /*directory*/,
                                               std::size_t /*most*/) override {
    return std::nullopt;
  }
};

TEST(Compile, MasksNothingThatTheDomainCouldUncover) {
  CrowdedDirectories files;
  const Features features = NewKernel();
  const auto masksBeside = [&](const std::string& line) {
    const auto domain = DomainOf({"-r /srv r", "-r /srv/private", line});
    return Compile(domain, {.features = features, .places = {}, .files = files}).plan.masks;
  };
  EXPECT_THAT(masksBeside("-c cap_chown grant"), SizeIs(1));
  for (const char* capability : {"cap_sys_admin", "cap_dac_read_search", "cap_dac_override"}) {
    EXPECT_THAT(masksBeside(std::string("-c ") + capability + " grant"), IsEmpty()) << capability;
  }
}

}  // namespace
}  // namespace EnforceTest
