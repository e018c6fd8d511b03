// Hunts proposals by which a program would still be refused what it was seen to do, and proposals
// that grant more than the directory or the set that they name.

#include "observe/proposal.h"

#include <gmock/gmock.h>

#include <string>

namespace {

using Policy::CreationQuestion;
using Policy::FileAccess;
using Policy::FileQuestion;
using Policy::InstalledDomain;
using Policy::ParameterQuestion;
using Policy::Permissions;
using Policy::Rule;
using Policy::RuleKind;
using Policy::WordsQuestion;
using SecPolicyCli::Observations;
using SecPolicyCli::Propose;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;

constexpr char kStart[] = "-s @start grant   # what every program needs to start";

FileQuestion File(FileAccess access, const std::string& path, const std::string& label = "") {
  return {.access = access, .path = path, .label = label, .labelIsBuiltIn = false};
}

CreationQuestion Making(const std::string& what, const std::string& path,
                        const std::string& label = "") {
  return {.kind = RuleKind::kFileCreation,
          .what = what,
          .path = path,
          .directoryLabel = label,
          .labelIsBuiltIn = false};
}

WordsQuestion Call(const std::string& name) {
  return {.kind = RuleKind::kSyscall, .words = {name}};
}

WordsQuestion Capability(const std::string& name) {
  return {.kind = RuleKind::kCapability, .words = {name}};
}

ParameterQuestion Check(const std::string& check, const std::string& number) {
  return {.check = check, .number = number};
}

Rule Path(const std::string& path, const std::string& letters) {
  return {.kind = RuleKind::kFilePath, .words = {path}, .verdict = Permissions::Parse(letters)};
}

Observations Of(std::initializer_list<Policy::Question> questions) {
  Observations observations;
  for (const Policy::Question& each : questions) observations.Note(each, "/bin/prog");
  return observations;
}

std::vector<std::string> ProposedFor(std::initializer_list<Policy::Question> questions,
                                     const InstalledDomain& domain = {}) {
  return Propose(Of(questions), domain);
}

TEST(Propose, GivesAProgramThatDoesNothingItsStart) {
  EXPECT_THAT(ProposedFor({}), ElementsAre(kStart));
}

TEST(Propose, CountsAndNamesTheFirst) {
  Observations observations;
  EXPECT_TRUE(observations.Note(Call("socket"), "/usr/bin/nc"));
  EXPECT_FALSE(observations.Note(Call("socket"), "/bin/other"));
  EXPECT_THAT(Propose(observations, {}),
              ElementsAre(kStart, "-s socket grant   # 2 times, first by /usr/bin/nc"));
}

TEST(Propose, TakesASetForManyOfItsCallsAndNotForFew) {
  const auto few = ProposedFor({Call("bind"), Call("listen"), Call("accept"), Call("socket")});
  EXPECT_THAT(few, Not(Contains(HasSubstr("@network"))));
  EXPECT_EQ(few.size(), 5);
  const auto many =
      ProposedFor({Call("bind"), Call("listen"), Call("accept"), Call("socket"), Call("connect")});
  EXPECT_THAT(
      many,
      ElementsAre(kStart, "-s @network grant   # 5 calls: bind listen accept socket connect"));
}

TEST(Propose, TakesTheSetOfMostCallsFirst) {
  EXPECT_THAT(ProposedFor({Call("bind"), Call("listen"), Call("accept"), Call("socket"),
                           Call("connect"), Call("mkdir"), Call("rmdir"), Call("rename"),
                           Call("link"), Call("symlink"), Call("unlink")}),
              ElementsAre(kStart, HasSubstr("-s @file grant   # 6 calls: mkdir "),
                          HasSubstr("-s @network grant   # 5 calls: bind ")));
}

TEST(Propose, NeverTakesTheSetOfAnAdministrator) {
  const auto lines = ProposedFor(
      {Call("reboot"), Call("swapon"), Call("swapoff"), Call("acct"), Call("sethostname")});
  EXPECT_THAT(lines, Not(Contains(HasSubstr("@privileged"))));
  EXPECT_EQ(lines.size(), 6);
}

TEST(Propose, HasALineForTheFilesOfALabel) {
  EXPECT_THAT(
      ProposedFor(
          {File(FileAccess::kRead, "/etc/b", "config"), File(FileAccess::kRead, "/etc/a", "config"),
           File(FileAccess::kWrite, "/etc/a", "config"), Making("regular", "/spool/x", "spool")}),
      ElementsAre(kStart, "-a config read grant   # 2 files, first /etc/b",
                  "-a config write grant   # 1 file, first /etc/a",
                  "-f spool spool regular grant   # 1 file, first /spool/x"));
}

TEST(Propose, TakesADirectoryForThreeFilesThatNeedTheSame) {
  EXPECT_THAT(
      ProposedFor({File(FileAccess::kRead, "/etc/p/a"), File(FileAccess::kRead, "/etc/p/b"),
                   File(FileAccess::kWrite, "/etc/p/w")}),
      ElementsAre(kStart, "-r /etc/p/a r   # first by /bin/prog",
                  "-r /etc/p/b r   # first by /bin/prog", "-r /etc/p/w w   # first by /bin/prog"));
  EXPECT_THAT(
      ProposedFor({File(FileAccess::kRead, "/etc/p/a"), File(FileAccess::kRead, "/etc/p/b"),
                   File(FileAccess::kRead, "/etc/p/c"), File(FileAccess::kWrite, "/etc/p/w")}),
      ElementsAre(kStart, "-r /etc/p r   # 3 files, first /etc/p/a",
                  "-r /etc/p/w rw   # first by /bin/prog"));
}

TEST(Propose, TakesNoDirectoryRightBelowTheRootForItsFiles) {
  EXPECT_THAT(ProposedFor({File(FileAccess::kRead, "/etc/a"), File(FileAccess::kRead, "/etc/b"),
                           File(FileAccess::kRead, "/etc/c")}),
              ElementsAre(kStart, HasSubstr("-r /etc/a r "), HasSubstr("-r /etc/b r "),
                          HasSubstr("-r /etc/c r ")));
}

TEST(Propose, NeverProposesTheRoot) {
  EXPECT_THAT(
      ProposedFor({File(FileAccess::kList, "/"), File(FileAccess::kRead, "/a"),
                   File(FileAccess::kRead, "/b"), File(FileAccess::kRead, "/c")}),
      ElementsAre(kStart, HasSubstr("-r /a r "), HasSubstr("-r /b r "), HasSubstr("-r /c r ")));
}

TEST(Propose, SpeaksOfWhatIsMadeByItsDirectory) {
  EXPECT_THAT(
      ProposedFor({Making("directory", "/srv/new"), Making("regular", "/srv/new/f"),
                   File(FileAccess::kWrite, "/srv/new/f"), File(FileAccess::kRead, "/srv/new/f"),
                   File(FileAccess::kRemove, "/srv/new/f")}),
      ElementsAre(kStart, "-r /srv rw   # first by /bin/prog"));
}

// Who writes to the state may do all.
TEST(Propose, TellsOfRulesThatReachThePolicy) {
  EXPECT_THAT(ProposedFor({Making("regular", "/run/prog.pid"), Making("regular", "/srv/x"),
                           File(FileAccess::kWrite, "/run/secpolicy/host.db"),
                           File(FileAccess::kRead, "/etc/zorvan/secpolicy/objects/base"),
                           File(FileAccess::kWrite, "/etc/zorvan/settings")}),
              ElementsAre(kStart, "-r /etc/zorvan/secpolicy/objects/base r   # first by /bin/prog",
                          "-r /etc/zorvan/settings w   # first by /bin/prog",
                          "-r /run w   # first by /bin/prog; the policy can be changed with it",
                          "-r /srv w   # first by /bin/prog"));
}

TEST(Propose, SpeaksOfNumberedFilesByTheirDirectory) {
  EXPECT_THAT(ProposedFor({File(FileAccess::kRead, "/proc/12/stat"),
                           File(FileAccess::kWrite, "/dev/pts/3")}),
              ElementsAre(kStart, HasSubstr("-r /dev/pts w "), HasSubstr("-r /proc r ")));
}

TEST(Propose, SpeaksOfAPathThatNoLineCanHoldByItsDirectory) {
  EXPECT_THAT(
      ProposedFor({File(FileAccess::kRead, "/opt/a b"), File(FileAccess::kRead, "/srv/#1/x")}),
      ElementsAre(kStart, HasSubstr("-r /opt r "), HasSubstr("-r /srv r ")));
}

// The rule for the path is the nearest one and would refuse what the label grants.
TEST(Propose, PutsNoPathInTheWayOfALabel) {
  EXPECT_THAT(ProposedFor({File(FileAccess::kRead, "/etc/p/a"), File(FileAccess::kRead, "/etc/p/b"),
                           File(FileAccess::kRead, "/etc/p/c"),
                           File(FileAccess::kWrite, "/etc/p/k", "key")}),
              ElementsAre(kStart, HasSubstr("-a key write grant "), HasSubstr("-r /etc/p r "),
                          HasSubstr("-r /etc/p/k rw ")));
}

TEST(Propose, LeavesOutWhatTheDomainIsGranted) {
  InstalledDomain domain;
  domain.rules = {
      {.kind = RuleKind::kSyscall, .words = {"@start"}, .verdict = true},
      {.kind = RuleKind::kSyscall, .words = {"socket"}, .verdict = true},
      Path("/etc", "r"),
  };
  EXPECT_THAT(ProposedFor({Call("socket"), Call("bind"), File(FileAccess::kRead, "/etc/a"),
                           File(FileAccess::kWrite, "/etc/a")},
                          domain),
              ElementsAre(HasSubstr("-s bind grant "), HasSubstr("-r /etc/a rw ")));
  EXPECT_THAT(ProposedFor({File(FileAccess::kRead, "/etc/a")}, domain), ElementsAre());
}

TEST(Propose, HasPortsFamiliesAndIdentitiesOfANewDomainOnly) {
  const std::initializer_list<Policy::Question> asked = {
      Check("socket_family", "2"), Check("socket_type", "1"),       Check("bind_port", "80"),
      Check("bind_port", "0"),     Check("ioctl_request", "21505"), Check("set_uid", "33")};
  EXPECT_THAT(ProposedFor(asked),
              ElementsAre(kStart, HasSubstr("-p socket_family 2 grant "),
                          HasSubstr("-p bind_port 80 grant "), HasSubstr("-p bind_port 0 grant "),
                          HasSubstr("-p set_uid 33 grant ")));
  InstalledDomain domain;
  domain.rules = {{.kind = RuleKind::kSyscall, .words = {"@start"}, .verdict = true}};
  EXPECT_THAT(ProposedFor(asked, domain), ElementsAre());
}

TEST(Propose, HasCapabilitiesWithoutThoseThatAWiderOneImplies) {
  EXPECT_THAT(ProposedFor({Capability("cap_dac_read_search"), Capability("cap_kill")}),
              ElementsAre(kStart, HasSubstr("-c cap_dac_read_search grant "),
                          HasSubstr("-c cap_kill grant ")));
  EXPECT_THAT(ProposedFor({Capability("cap_dac_read_search"), Capability("cap_dac_override")}),
              ElementsAre(kStart, HasSubstr("-c cap_dac_override grant ")));
  InstalledDomain domain;
  domain.rules = {{.kind = RuleKind::kSyscall, .words = {"@start"}, .verdict = true},
                  {.kind = RuleKind::kCapability, .words = {"cap_dac_override"}, .verdict = true}};
  EXPECT_THAT(ProposedFor({Capability("cap_dac_read_search")}, domain), ElementsAre());
}

// With a rule for local sockets no kernel could keep the domain from local services.
TEST(Propose, HasNoFamiliesBesidePairsOfLocalSockets) {
  EXPECT_THAT(
      ProposedFor({Call("socketpair"), Check("socket_family", "2"), Check("connect_port", "80")}),
      ElementsAre(kStart, HasSubstr("-s socketpair grant "),
                  HasSubstr("-p connect_port 80 grant ")));
  EXPECT_THAT(
      ProposedFor({Call("socketpair"), Check("socket_family", "2"), Check("socket_family", "1")}),
      ElementsAre(kStart, HasSubstr("-s socketpair grant "), HasSubstr("-p socket_family 2 grant "),
                  HasSubstr("-p socket_family 1 grant ")));
}

// Beside rules for groups setgroups is refused.
TEST(Propose, HasNoGroupsBesideSetgroups) {
  EXPECT_THAT(
      ProposedFor({Call("setgroups"), Check("set_uid", "33"), Check("set_gid", "33")}),
      ElementsAre(kStart, HasSubstr("-s setgroups grant "), HasSubstr("-p set_uid 33 grant ")));
}

// Beside rules for ports no other protocol passes.
TEST(Propose, HasNoPortsBesideDatagrams) {
  EXPECT_THAT(ProposedFor({Check("socket_type", "2"), Check("connect_port", "53"),
                           Check("connect_port", "443")}),
              ElementsAre(kStart));
}

}  // namespace
