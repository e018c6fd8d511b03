// What refusals by the module asked of the rules: hunts for one that is told as something else.

#include "host/enforce/module/refusal_question.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/capability.h>

#include "enforce/domain_of.h"
#include "host/enforce/module/module_plan.h"
#include "host/enforce/system_calls.h"

namespace EnforceTest {
namespace {

using Enforce::EventNames;
using Enforce::ModuleEvent;
using Enforce::QuestionsOf;
using Policy::Question;
using testing::IsEmpty;
using testing::SizeIs;

ModuleEvent Event(unsigned int act, unsigned int detail, std::uint64_t value) {
  ModuleEvent event = {};
  event.act = act;
  event.detail = detail;
  event.value = value;
  return event;
}

Question Only(const std::vector<Question>& questions) {
  EXPECT_THAT(questions, SizeIs(1));
  return questions.empty() ? Question() : questions.front();
}

bool IsGranted(const Question& question, const std::string& rule) {
  return Decide(question, DomainOf({rule})).granted;
}

TEST(QuestionsOf, AsksForACapability) {
  const Question asked =
      Only(QuestionsOf(Event(Enforce::kActUseCapability, 0, CAP_SYS_CHROOT), "", {}));
  EXPECT_TRUE(IsGranted(asked, "-c cap_sys_chroot grant"));
  EXPECT_FALSE(IsGranted(asked, "-c cap_chown grant"));
  EXPECT_THAT(QuestionsOf(Event(Enforce::kActUseCapability, 0, 63), "", {}), IsEmpty());
}

TEST(QuestionsOf, AsksForEachCheck) {
  for (unsigned int check = 0; check < Enforce::kModuleChecks; ++check) {
    const Question asked = Only(QuestionsOf(Event(Enforce::kActPassValue, check, 256), "", {}));
    const auto& parameter = std::get<Policy::ParameterQuestion>(asked);
    EXPECT_EQ(parameter.check, Enforce::NameOfCheck(check));
    EXPECT_TRUE(IsGranted(asked, "-p " + parameter.check + " 256 grant"));
    EXPECT_FALSE(IsGranted(asked, "-p " + parameter.check + " 512 grant"));
  }
  EXPECT_THAT(QuestionsOf(Event(Enforce::kActPassValue, Enforce::kModuleChecks, 7), "", {}),
              IsEmpty());
}

TEST(QuestionsOf, WritesRequestsAsTheyAreKnown) {
  const Question asked =
      Only(QuestionsOf(Event(Enforce::kActPassValue, Enforce::kCheckIoctl, 0x5401), "", {}));
  EXPECT_EQ(std::get<Policy::ParameterQuestion>(asked).number, "0x5401");
}

TEST(QuestionsOf, AsksForEachUseOfAFile) {
  const struct {
    unsigned int use;
    const char* byPath;
    const char* byLabel;
  } uses[] = {
      {Enforce::kUseRead, "-r /etc/key r", "-a sshKey read grant"},
      {Enforce::kUseWrite, "-r /etc/key w", "-a sshKey write grant"},
      {Enforce::kUseExecute, "-r /etc/key x", "-a sshKey execute grant"},
      {Enforce::kUseList, "-r /etc/key r", "-a sshKey list grant"},
      {Enforce::kUseRemove, "-r /etc/key w", "-a sshKey remove grant"},
      {Enforce::kUseTruncate, "-r /etc/key w", "-a sshKey truncate grant"},
  };
  for (const auto& [use, byPath, byLabel] : uses) {
    const ModuleEvent event = Event(Enforce::kActUseFile, use, 0);
    const Question asked = Only(QuestionsOf(event, "/etc/key", {.label = "sshKey"}));
    EXPECT_TRUE(IsGranted(asked, byPath)) << byPath;
    EXPECT_TRUE(IsGranted(asked, byLabel)) << byLabel;
    EXPECT_FALSE(IsGranted(asked, "-r /etc/other rwx"));
    EXPECT_FALSE(IsGranted(Only(QuestionsOf(event, "/etc/key", {})), byLabel));
    EXPECT_TRUE(IsGranted(Only(QuestionsOf(event, "", {.label = "sshKey"})), byLabel));
    EXPECT_THAT(QuestionsOf(event, "", {}), IsEmpty());
  }
}

TEST(QuestionsOf, AsksForAllUsesAtOnce) {
  const std::vector<Question> asked = QuestionsOf(
      Event(Enforce::kActUseFile, Enforce::kUseRead | Enforce::kUseWrite, 0), "/etc/key", {});
  ASSERT_THAT(asked, SizeIs(2));
  EXPECT_TRUE(IsGranted(asked[0], "-r /etc r"));
  EXPECT_FALSE(IsGranted(asked[1], "-r /etc r"));
}

TEST(QuestionsOf, AsksToMakeFilesAndSockets) {
  const char* const kinds[] = {"regular", "directory",   "symlink",
                               "fifo",    "char_device", "block_device"};
  for (unsigned int kind = 0; kind < std::size(kinds); ++kind) {
    const Question asked =
        Only(QuestionsOf(Event(Enforce::kActMakeFile, kind, 0), "/srv/new", {.label = "spool"}));
    EXPECT_TRUE(IsGranted(asked, std::string("-f spool spool ") + kinds[kind] + " grant"));
    EXPECT_FALSE(IsGranted(asked, std::string("-f other spool ") + kinds[kind] + " grant"));
    EXPECT_EQ(IsGranted(asked, "-r /srv w"), kind < 4);
  }
  const Question socket = Only(QuestionsOf(
      Event(Enforce::kActMakeSocket, Enforce::kSocketDatagram, 0), "/srv/s", {.label = "spool"}));
  EXPECT_TRUE(IsGranted(socket, "-u spool dgram grant"));
  EXPECT_FALSE(IsGranted(socket, "-u spool stream grant"));
  EXPECT_THAT(QuestionsOf(Event(Enforce::kActMakeFile, 6, 0), "/srv/new", {}), IsEmpty());
  EXPECT_THAT(QuestionsOf(Event(Enforce::kActMakeSocket, 3, 0), "/srv/new", {}), IsEmpty());
  EXPECT_THAT(QuestionsOf(Event(Enforce::kActMakeFile, 0, 0), "", {}), IsEmpty());
  EXPECT_TRUE(
      IsGranted(Only(QuestionsOf(Event(Enforce::kActMakeFile, 0, 0), "", {.label = "spool"})),
                "-f spool spool regular grant"));
  EXPECT_TRUE(
      IsGranted(Only(QuestionsOf(Event(Enforce::kActMakeSocket, 0, 0), "", {.label = "spool"})),
                "-u spool stream grant"));
}

TEST(QuestionsOf, AsksForACall) {
  const auto number = static_cast<std::uint64_t>(Enforce::NumberOf("mount").value());
  const Question asked = Only(QuestionsOf(Event(Enforce::kActCall, 0, number), "", {}));
  EXPECT_TRUE(IsGranted(asked, "-s mount grant"));
  EXPECT_FALSE(IsGranted(asked, "-s bpf grant"));
  EXPECT_THAT(QuestionsOf(Event(Enforce::kActCall, 0, 1'000'000), "", {}), IsEmpty());
  EXPECT_THAT(QuestionsOf(Event(Enforce::kActCall, 0, std::uint64_t{1} << 40), "", {}), IsEmpty());
}

TEST(QuestionsOf, AsksToEnterADomain) {
  const Question asked =
      Only(QuestionsOf(Event(Enforce::kActEnter, 0, 9), "/bin/app", {.domain = "appDom"}));
  EXPECT_TRUE(IsGranted(asked, "-d app appDom exec grant"));
  EXPECT_FALSE(IsGranted(asked, "-d app otherDom exec grant"));
  EXPECT_THAT(QuestionsOf(Event(Enforce::kActEnter, 0, 9), "/bin/app", {}), IsEmpty());
}

TEST(QuestionsOf, AsksNothingOfWhatNoRuleGrants) {
  const ModuleEvent event = Event(Enforce::kActReachModule, 0, 0);
  EXPECT_TRUE(IsOfNoRule(event));
  EXPECT_TRUE(IsOfNoRule(Event(Enforce::kActPassPorts, 1, 45)));
  EXPECT_TRUE(IsOfNoRule(Event(Enforce::kActReachSocket, 0, 0)));
  EXPECT_FALSE(IsOfNoRule(Event(Enforce::kActCall, 0, 0)));
  EXPECT_THAT(QuestionsOf(event, "/etc/key", {.label = "sshKey"}), IsEmpty());
  EXPECT_THAT(QuestionsOf(Event(Enforce::kModuleActs, 0, 0), "/etc/key", {}), IsEmpty());
}

}  // namespace
}  // namespace EnforceTest
