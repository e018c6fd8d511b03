// Plans for the module: hunts for a rule that it is told otherwise, and for one that is said to be
// kept and is not.

#include "host/enforce/module/module_plan.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/capability.h>

#include "enforce/domain_of.h"
#include "host/enforce/module/path_hash.h"
#include "host/enforce/module/transition_plan.h"

namespace EnforceTest {
namespace {

using Enforce::FatesByModule;
using Enforce::ModulePlan;
using Enforce::PlanModule;
using Policy::InstalledDomain;
using testing::AllOf;
using testing::Each;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

constexpr unsigned int kLast = CAP_CHECKPOINT_RESTORE;

InstalledDomain Numbered(unsigned int id, Policy::Level level,
                         const std::vector<std::string>& rules) {
  InstalledDomain domain = DomainOf(rules);
  domain.id = id;
  domain.level = level;
  return domain;
}

TEST(PlanModule, HasAllDomains) {
  EXPECT_EQ(Dump(PlanModule({Numbered(3, Policy::Level::kEnforcing,
                                      {"-c cap_chown grant", "-c cap_bpf grant",
                                       "-c cap_kill grant", "-c cap_kill revoke"}),
                             Numbered(7, Policy::Level::kPermissive, {"-c cap_chown revoke"}),
                             Numbered(511, Policy::Level::kDisabled, {"-s chown grant"})},
                            kLast)),
            "domain 3 enforcing: cap_chown cap_bpf\n"
            "domain 7 permissive: none\n"
            "domain 511 disabled: none\n"
            "  calls: 1\n"
            "  calls_of_32_bits: 1\n");
}

TEST(PlanModule, HasTheValuesThatPass) {
  EXPECT_EQ(Dump(PlanModule({DomainOf({"-p socket_family 1 2 grant", "-p socket_family 10 grant",
                                       "-p socket_family 2 revoke", "-p socket_type 3 revoke",
                                       "-p prctl_option 5 grant", "-p prctl_option 5 revoke"})},
                            kLast)),
            "domain 0 enforcing: none\n"
            "  socket_family: 1 10\n"
            "  socket_type: 0-2 4-4294967295\n"
            "  prctl_option: none\n");
  EXPECT_EQ(Dump(PlanModule({DomainOf({"-p bind_port 80 grant", "-p connect_port 25 revoke",
                                       "-p set_uid 1000 1999 grant", "-p set_gid 0 revoke"})},
                            kLast)),
            "domain 0 enforcing: none\n"
            "  bind_port: 80\n"
            "  connect_port: 0-24 26-4294967295\n"
            "  set_uid: 1000-1999\n"
            "  set_gid: 1-4294967295\n");
}

TEST(PlanModule, LetsNothingPassThatThereIsNoRoomFor) {
  std::vector<std::string> rules;
  for (int number = 0; number < 33; ++number)
    rules.push_back("-p ioctl_request " + std::to_string(2 * number) + " grant");
  EXPECT_EQ(Dump(PlanModule({DomainOf(rules)}, kLast)),
            "domain 0 enforcing: none\n  ioctl_request: none\n");
  EXPECT_THAT(Told(FatesByModule(DomainOf(rules), kLast)),
              AllOf(SizeIs(33), Each(HasSubstr("(refused, as ioctl_request has more than 32 ranges "
                                               "of values)"))));
  rules.pop_back();
  EXPECT_THAT(Told(FatesByModule(DomainOf(rules), kLast)), IsEmpty());
}

TEST(PlanModule, GrantsByLinuxsNumbers) {
  const ModulePlan plan =
      PlanModule({DomainOf({"-c cap_chown grant", "-c cap_checkpoint_restore grant"})}, kLast);
  ASSERT_EQ(plan.size(), 1U);
  EXPECT_EQ(plan[0].rules.capabilities,
            std::uint64_t{1} << CAP_CHOWN | std::uint64_t{1} << CAP_CHECKPOINT_RESTORE);
}

const Enforce::LabelNumbers kLabels = {{"red", 7}, {"blue", 8}};

std::string FilesOf(const std::vector<std::string>& rules) {
  return Dump(Enforce::PlanFiles(DomainOf(rules), kLabels));
}

TEST(PlanModule, HasWhatLabelsGrant) {
  EXPECT_EQ(FilesOf({"-a red read grant", "-a red list grant", "-a blue write grant",
                     "-d blue otherDom exec grant", "-d red otherDom enter grant",
                     "-a green read grant"}),
            "  label 7: read list\n  label 8: write execute\n");
}

TEST(PlanModule, RefusesToTheUnknownWhatItRefusesToAny) {
  EXPECT_EQ(FilesOf({"-a red read grant", "-a red read revoke", "-a blue write revoke"}),
            "  label 0: nothing, not read write\n"
            "  label 7: read, not read\n"
            "  label 8: nothing, not write\n");
}

TEST(PlanModule, MakesWhatOneRuleGrants) {
  EXPECT_EQ(FilesOf({"-f red blue regular revoke", "-f red red regular grant",
                     "-f red blue directory grant", "-f red red fifo revoke",
                     "-u blue stream grant", "-u blue stream revoke"}),
            "  label 0: nothing, not fifo\n"
            "  label 7: regular directory, not fifo, directory as 8\n"
            "  label 8: stream\n");
}

TEST(PlanModule, HasPathsAndWhatIsAboveThem) {
  const auto paths =
      Enforce::PlanFiles(DomainOf({"-r /srv/www/data rw", "-r /srv rx", "-r /opt"}), {}).paths;
  EXPECT_THAT(paths,
              ElementsAre(std::pair("/", Enforce::kPathIsAboveRule),
                          std::pair("/opt", Enforce::kPathHasRule),
                          std::pair("/srv", Enforce::kPathIsAboveRule | Enforce::kPathHasRule |
                                                Enforce::kPathRead | Enforce::kPathExecute),
                          std::pair("/srv/www", Enforce::kPathIsAboveRule),
                          std::pair("/srv/www/data", Enforce::kPathHasRule | Enforce::kPathRead |
                                                         Enforce::kPathWrite)));
  EXPECT_EQ(FilesOf({"-r / r", "-r /srv"}), "  /: r\n  /srv: \n");
}

TEST(PlanModule, HashesPathsByTheirNames) {
  const Enforce::ModuleHashing how = {3, 0x9e3779b97f4a7c15, 0, 0};
  EXPECT_EQ(Enforce::HashOf("/", how), 3U);
  EXPECT_NE(Enforce::HashOf("/ab", how), Enforce::HashOf("/a/b", how));
  EXPECT_NE(Enforce::HashOf("/a/b", how), Enforce::HashOf("/b/a", how));
  EXPECT_NE(Enforce::HashOf("/longer than eight", how), Enforce::HashOf("/longer than ei", how));
  const std::string name = "/a name that is longer";
  EXPECT_EQ(Enforce::HashOf("/srv" + name, how) - Enforce::HashOf("/srv", how) * how.multiplier,
            Enforce::HashOf(name, how) - how.basis * how.multiplier);
}

TEST(PlanModule, OfNothingIsEmpty) { EXPECT_EQ(Dump(PlanModule({}, kLast)), ""); }

TEST(FatesByModule, KeepsCapabilitiesFilesAndSomeChecks) {
  EXPECT_THAT(
      Told(FatesByModule(
          DomainOf({"-c cap_chown grant", "-c cap_kill revoke", "-p socket_type 1 grant",
                    "-p socket_family 1 revoke", "-p prctl_option 3 grant",
                    "-p ioctl_request 7 grant", "-p bind_port 80 grant",
                    "-p connect_port 25 revoke", "-p set_uid 1000 grant", "-p set_gid 0 revoke",
                    "-a object read grant", "-r /srv", "-f object object fifo grant"}),
          kLast)),
      IsEmpty());
}

TEST(FatesByModule, TellsWhatItDoesNotKeepInOrder) {
  EXPECT_THAT(
      Told(FatesByModule(
          DomainOf({"-s read revoke", "-c cap_chown grant", "-r /srv r", "-a object read revoke",
                    "-u object stream grant", "-s lseek revoke"}),
          kLast)),
      ElementsAre("notExpressible: -s read revoke (not refused, as not each use of it comes to a "
                  "hook)",
                  "notExpressible: -s lseek revoke (not refused, as not each use of it comes to a "
                  "hook)"));
}

TEST(PlanModule, TellsSmallValuesAsBits) {
  const auto plan =
      PlanModule({DomainOf({"-p socket_family 1 3 grant", "-p socket_family 63 64 grant"})}, kLast);
  const auto& family = plan[0].rules.checks[Enforce::kCheckFamily];
  EXPECT_EQ(family.small, 1ULL << 63 | 0b1110U);
  EXPECT_EQ(family.count, 2U);
  EXPECT_EQ(plan[0].rules.checks[Enforce::kCheckUser].small, ~0ULL);
}

TEST(PlanModule, LetsWhoNamesItTypeIntoTerminals) {
  const auto checksOf = [](const std::string& rule) {
    return PlanModule({DomainOf({rule})}, kLast)[0].rules.checks[Enforce::kCheckIoctl];
  };
  const auto open = checksOf("-c cap_chown grant");
  ASSERT_EQ(open.count, 3U);
  EXPECT_EQ(open.ranges[0].last, 0x5411U);
  EXPECT_EQ(open.ranges[1].first, 0x5413U);
  EXPECT_EQ(open.ranges[1].last, 0x541bU);
  EXPECT_EQ(open.ranges[2].first, 0x541dU);
  EXPECT_EQ(checksOf("-p ioctl_request 0x5412 grant").count, 1U);
  EXPECT_EQ(checksOf("-p ioctl_request 0x5412 0x5413 grant").ranges[0].first, 0x5413U);
}

TEST(FatesByModule, TellsWhoGrantsToTypeIntoTerminals) {
  const std::string both =
      " (TIOCSTI is refused unless granted by itself; TIOCLINUX is refused unless granted by "
      "itself)";
  EXPECT_THAT(Told(FatesByModule(DomainOf({"-s ioctl grant", "-s close grant"}), kLast)),
              ElementsAre("narrowed: -s ioctl grant" + both));
  EXPECT_THAT(Told(FatesByModule(DomainOf({"-s ioctl grant", "-p ioctl_request 7 grant"}), kLast)),
              IsEmpty());
  EXPECT_THAT(Told(FatesByModule(DomainOf({"-s ioctl grant", "-p ioctl_request 0x5412 grant",
                                           "-p ioctl_request 0x5400 0x5420 grant"}),
                                 kLast)),
              ElementsAre("narrowed: -p ioctl_request 0x5400 0x5420 grant (TIOCLINUX is refused "
                          "unless granted by itself)"));
}

TEST(FatesByModule, TellsSocketsThatGoPastPorts) {
  const std::vector<std::string> grants = {
      "-p socket_family 2 10 grant", "-p socket_family 17 grant", "-p socket_family 21 revoke",
      "-p socket_type 1 2 grant", "-p socket_type 3 grant"};
  EXPECT_THAT(Told(FatesByModule(DomainOf(grants), kLast)), IsEmpty());
  for (const char* const port : {"-p bind_port 80 grant", "-p connect_port 25 revoke"}) {
    std::vector<std::string> rules = grants;
    rules.emplace_back(port);
    EXPECT_THAT(
        Told(FatesByModule(DomainOf(rules), kLast)),
        ElementsAre("narrowed: -p socket_family 17 grant (sockets that go past rules for "
                    "ports are refused)",
                    "narrowed: -p socket_type 3 grant (sockets that go past rules for ports "
                    "are refused)"));
  }
}

TEST(FatesByModule, TellsOfLabelsThatAreWrittenLater) {
  EXPECT_THAT(Told(FatesByModule(DomainOf({"-f red blue regular grant", "-f red blue fifo revoke"}),
                                 kLast)),
              ElementsAre("narrowed: -f red blue regular grant (the label is on the disk only once "
                          "the module was told to write it)"));
}

TEST(FatesByModule, TellsWhatAKernelDoesNotKnow) {
  EXPECT_THAT(Told(FatesByModule(DomainOf({"-c cap_bpf grant"}), CAP_AUDIT_READ)),
              ElementsAre("narrowed: -c cap_bpf grant (this kernel has no cap_bpf)"));
}

TEST(PlanTransitions, LeadWhereTheFirstRuleOfALabelLeads) {
  Enforce::ModuleFileRules files;
  Enforce::PlanTransitions(
      DomainOf({"-d program otherDom exec grant", "-d program thirdDom exec grant",
                "-d lost missingDom exec grant", "-d same testDom exec grant",
                "-d revoked otherDom exec revoke", "-d unknown otherDom exec grant"}),
      {{"program", 7}, {"lost", 8}, {"same", 9}, {"revoked", 10}},
      {{"otherDom", 3}, {"thirdDom", 4}, {"testDom", 5}}, files);
  ASSERT_THAT(files.labels, testing::UnorderedElementsAre(testing::Key(7), testing::Key(8)));
  EXPECT_EQ(files.labels[7].next, 3U + 1);
  EXPECT_GT(files.labels[8].next, unsigned{Enforce::kModuleDomains} + 1);
  EXPECT_EQ(files.labels[7].nextOfTardisk, 0U);
}

TEST(PlanTransitions, LeadByTardisksAndByLabelsOfTheirOwn) {
  Enforce::ModuleFileRules files;
  Enforce::PlanTransitions(
      DomainOf({"-d both otherDom tardisk_exec grant", "-d both thirdDom exec grant",
                "-d both thirdDom tardisk_exec grant", "-d tardisk otherDom tardisk_exec grant",
                "-d same testDom tardisk_exec grant", "-d revoked otherDom tardisk_exec revoke"}),
      {{"both", 7}, {"tardisk", 8}, {"same", 9}, {"revoked", 10}},
      {{"otherDom", 3}, {"thirdDom", 4}, {"testDom", 5}}, files);
  ASSERT_THAT(files.labels, testing::UnorderedElementsAre(testing::Key(7), testing::Key(8)));
  EXPECT_EQ(files.labels[7].next, 4U + 1);
  EXPECT_EQ(files.labels[7].nextOfTardisk, 3U + 1);
  EXPECT_EQ(files.labels[8].next, 0U);
  EXPECT_EQ(files.labels[8].nextOfTardisk, 3U + 1);
  EXPECT_EQ(Dump(files),
            "  label 7: nothing, to 4, tardisks: 3\n"
            "  label 8: nothing, tardisks: 3\n");
}

TEST(FatesByModule, TellsOfTransitionsThatGiveWay) {
  EXPECT_THAT(
      Told(FatesByModule(
          DomainOf({"-d red otherDom tardisk_exec grant", "-d red thirdDom tardisk_exec grant",
                    "-d red thirdDom exec grant", "-d red otherDom exec grant",
                    "-d red otherDom enter grant", "-d blue otherDom tardisk_exec revoke"}),
          kLast)),
      ElementsAre("narrowed: -d red thirdDom tardisk_exec grant (what came from a tardisk labelled "
                  "red enters otherDom)",
                  "narrowed: -d red otherDom exec grant (what is labelled red enters thirdDom)",
                  "narrowed: -d red otherDom enter grant (only services of this host enter a "
                  "domain this way)"));
}

}  // namespace
}  // namespace EnforceTest
