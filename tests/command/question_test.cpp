// Hunts questions that are understood otherwise than asked, and refusals that do not say what would
// be understood.

#include "query/question.h"

#include <gmock/gmock.h>

#include <filesystem>

#include "host/linux/operation/state_use.h"
#include "support/policy_tree.h"

namespace {

using SecPolicyCli::Question;
using SecPolicyCli::QuestionError;
using SecPolicyCli::ReadQuestion;
using SecPolicyTest::PolicyTree;
using SecPolicyTest::TemporaryDirectory;
using testing::ElementsAre;

using Words = std::vector<std::string>;

// A state of its own with one domain and one object beside those that are built in.
class QuestionTest : public testing::Test {
 protected:
  QuestionTest() {
    sshDomain = access.CreateDomain("sshDom", TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE);
    access.AddLabels({"sshConfig"}, TeskCtl::Security::TESKACCESS_LABEL_OBJECT);
  }

  Question Read(const Words& words) { return ReadQuestion(words, access); }

  std::string Refusal(const Words& words) {
    try {
      Read(words);
    } catch (const QuestionError& refusal) {
      return refusal.what();
    }
    return "";
  }

  TemporaryDirectory directory;
  LinuxHost::UsedState state{directory / "host.db"};
  SecPolicy::TeskAccessInterfaceImpl access;
  unsigned int sshDomain = 0;
};

TEST_F(QuestionTest, RefusesWordsAndSaysWhatWouldBeUnderstood) {
  const std::pair<Words, const char*> table[] = {
      {{"reed", "/etc"}, "there is no question 'reed'; did you mean 'read'?"},
      {{"read"}, "write: read PATH"},
      {{"read", "/etc", "/usr"}, "write: read PATH"},
      {{"create", "sshConfig", "file"}, "write: create OBJECT NEWOBJECT KIND"},
      {{"write", "etc/ssh"}, "'etc/ssh' is no path from the root on: it begins with a slash"},
      {{"call", "sokcet"}, "there is no system call 'sokcet'; did you mean 'socket'?"},
      {{"call", "nothing_near_this"}, "there is no system call 'nothing_near_this'"},
      {{"access", "sshConfgi", "read"},
       "there is no object 'sshConfgi'; did you mean 'sshConfig'?"},
      {{"enter", "sshDmo"}, "there is no domain 'sshDmo'; did you mean 'sshDom'?"},
      // An object is no domain, though a domain is an object.
      {{"enter", "sshConfig"}, "there is no domain 'sshConfig'; there are hostDom, sshDom"},
      {{"pass", "bind_port", "eighty"},
       "'eighty' is not an unsigned number, decimal or hexadecimal with 0x"},
      {{"pass", "bind_prt", "80"},
       "there is no parameter check 'bind_prt'; did you mean "
       "'bind_port'?"},
  };
  for (const auto& [words, refusal] : table) EXPECT_EQ(Refusal(words), refusal);
}

TEST_F(QuestionTest, ListsAllQuestionsWhereNoneIsNear) {
  std::string all;
  for (const auto& form : SecPolicyCli::QuestionForms()) all += std::string(", ") + form.action;
  EXPECT_EQ(Refusal({"xyzzy"}), "there is no question 'xyzzy'; there are " + all.substr(2));
}

TEST_F(QuestionTest, RefusesADomainInTheSameWords) {
  EXPECT_THAT(
      [&] { SecPolicyCli::RefuseDomain("sshDmo", access); },
      testing::ThrowsMessage<QuestionError>("there is no domain 'sshDmo'; did you mean 'sshDom'?"));
}

TEST_F(QuestionTest, KeepsWordsInTheirOrder) {
  const Question question = Read({"create", "sshConfig", "sshDom", "regular"});
  EXPECT_EQ(question.Text(), "create sshConfig sshDom regular");
  EXPECT_FALSE(question.file);
  const auto& asked = std::get<Policy::WordsQuestion>(question.asked);
  EXPECT_EQ(asked.kind, Policy::RuleKind::kFileCreation);
  EXPECT_THAT(asked.words, ElementsAre("sshConfig", "sshDom", "regular"));
}

TEST_F(QuestionTest, AsksAboutANumber) {
  const Question question = Read({"pass", "bind_port", "0x50"});
  const auto& asked = std::get<Policy::ParameterQuestion>(question.asked);
  EXPECT_EQ(asked.check, "bind_port");
  EXPECT_EQ(asked.number, "0x50");
}

TEST_F(QuestionTest, AsksForTheWaysIntoADomain) {
  access.SetDomTransRule({.line = 1,
                          .domainId = 0,
                          .domainName = "hostDom",
                          .label = "sshConfig",
                          .targetDomain = "sshDom",
                          .targetDomainId = sshDomain,
                          .transitionKind = "exec",
                          .grant = true});
  const Question question = Read({"enter", "sshDom"});
  const auto& asked = std::get<Policy::EntryQuestion>(question.asked);
  EXPECT_EQ(asked.domain, "sshDom");
  EXPECT_EQ(asked.ways.size(), 1u);
}

TEST_F(QuestionTest, TakesEachWayToUseAPath) {
  using enum Policy::FileAccess;
  const std::pair<const char*, Policy::FileAccess> table[] = {
      {"read", kRead}, {"write", kWrite},   {"exec", kExecute},
      {"list", kList}, {"remove", kRemove}, {"truncate", kTruncate},
  };
  for (const auto& [action, wanted] : table) {
    const Question question = Read({action, "/no/such//"});
    EXPECT_EQ(question.Text(), std::string(action) + " /no/such//");
    const auto& asked = std::get<Policy::FileQuestion>(question.asked);
    EXPECT_EQ(asked.access, wanted);
    EXPECT_EQ(asked.path, "/no/such");
    EXPECT_EQ(asked.label, "");
    ASSERT_TRUE(question.file);
    EXPECT_FALSE(question.file->exists);
  }
  EXPECT_EQ(std::get<Policy::FileQuestion>(Read({"read", "//"}).asked).path, "/");
}

TEST_F(QuestionTest, FollowsAPathToItsFile) {
  const PolicyTree tree({{"file", ""}});
  std::filesystem::create_symlink("file", tree / "link");
  const Question question = Read({"read", tree / "link"});
  const std::string real = std::filesystem::canonical(tree / "file");
  EXPECT_TRUE(question.file->exists);
  EXPECT_THAT(question.file->paths, ElementsAre(tree / "link", real));
  EXPECT_EQ(std::get<Policy::FileQuestion>(question.asked).path, real);
}

TEST_F(QuestionTest, FollowsADirectoryToWhereSomethingIsMade) {
  const PolicyTree tree({{"directory/", ""}});
  std::filesystem::create_directory_symlink("directory", tree / "link");
  const Question question = Read({"make-socket", tree / "link/new/", "stream"});
  EXPECT_TRUE(question.file->exists);
  const auto& asked = std::get<Policy::CreationQuestion>(question.asked);
  EXPECT_EQ(asked.kind, Policy::RuleKind::kUnixSocketCreation);
  EXPECT_EQ(asked.what, "stream");
  EXPECT_EQ(asked.path, std::filesystem::canonical(tree / "directory").string() + "/new");
  EXPECT_EQ(std::get<Policy::CreationQuestion>(Read({"make", "/new", "regular"}).asked).path,
            "/new");
}

}  // namespace
