// What every host does alike. Compiled once, and linked with each host in turn.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <cerrno>
#include <optional>
#include <string>
#include <vector>

#include "contract_host.h"
#include "kitlibs/file.h"
#include "orinconfigstore/config_store.h"
#include "support/message_of.h"
#include "teskctl/adv.h"
#include "teskctl/security.h"
#include "teskctl/sysinfo.h"
#include "zorvan/kernel.h"

namespace HostContractTest {
namespace {

using SecPolicyTest::MessageOf;
using TeskCtl::Security::TeskAccess_CapabilityParamRule;
using TeskCtl::Security::TeskAccess_CapabilityRule;
using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_CHECK_ACCESS;
using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
using TeskCtl::Security::TeskAccess_DomTransRule;
using TeskCtl::Security::TeskAccess_FileCreationRule;
using TeskCtl::Security::TeskAccess_FilePathAccessRule;
using TeskCtl::Security::TESKACCESS_KEYWORD_CAPABILITY;
using TeskCtl::Security::TESKACCESS_KEYWORD_DOM_TRANS;
using TeskCtl::Security::TESKACCESS_KEYWORD_FILE_CREATION;
using TeskCtl::Security::TESKACCESS_KEYWORD_LABEL;
using TeskCtl::Security::TESKACCESS_KEYWORD_OBJECT_ACCESS;
using TeskCtl::Security::TESKACCESS_KEYWORD_PARAM_CHECK;
using TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL;
using TeskCtl::Security::TESKACCESS_KEYWORD_UNIX_SOCK_CREATION;
using TeskCtl::Security::TeskAccess_KeywordType;
using TeskCtl::Security::TESKACCESS_LABEL_DOMAIN;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;
using TeskCtl::Security::TeskAccess_ObjectAccessRule;
using TeskCtl::Security::TeskAccess_SyscallRule;
using TeskCtl::Security::TeskAccess_UnixSockCreationRule;
using TeskCtl::Security::TeskAccessInterfaceImpl;
using TeskCtl::Security::TeskAccessKsi_DefaultDom;
using ::testing::AllOf;
using ::testing::Contains;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::IsSupersetOf;
using ::testing::Key;
using ::testing::Not;

constexpr unsigned int kUntouched = 4711;
constexpr unsigned int kNoLabel = 1;

class HostContract : public ::testing::Test {
 protected:
  unsigned int Create(const std::string& name) {
    return access.CreateDomain(name, TESKACCESS_DEFAULT_DOM_NONE);
  }

  unsigned int Find(const std::string& name) {
    unsigned int id = kUntouched;
    return access.FindDomain(name, &id) ? id : kUntouched;
  }

  ContractHost host;
  TeskAccessInterfaceImpl access;
};

// ---- The interface object.

TEST_F(HostContract, ObjectsComeAndGoWithoutTouchingErrno) {
  std::optional<TeskAccessInterfaceImpl> other;
  errno = E2BIG;
  other.emplace();
  EXPECT_EQ(errno, E2BIG);
  other.reset();
  EXPECT_EQ(errno, E2BIG);
}

TEST_F(HostContract, ObjectsSeeWhatOthersDid) {
  TeskAccessInterfaceImpl other;
  const unsigned int id = other.CreateDomain("tool", TESKACCESS_DEFAULT_DOM_NONE);
  EXPECT_EQ(Find("tool"), id);
}

// ---- Domains.

TEST_F(HostContract, FindsTheStartDomainInSlotZero) { EXPECT_EQ(Find("hostDom"), 0U); }

TEST_F(HostContract, FindLeavesTheIdentifierAloneWhenThereIsNoSuchDomain) {
  unsigned int id = kUntouched;
  EXPECT_FALSE(access.FindDomain("nobody", &id));
  EXPECT_EQ(id, kUntouched);
}

TEST_F(HostContract, CreatesDomainsInSlotsOfTheirOwn) {
  const unsigned int first = Create("first");
  const unsigned int second = Create("second");
  EXPECT_NE(first, second);
  EXPECT_EQ(Find("first"), first);
  EXPECT_EQ(Find("second"), second);
  EXPECT_LT(std::max(first, second), access.GetMaxDomains());
}

TEST_F(HostContract, DescribesADomain) {
  const unsigned int id = access.CreateDomain("template", TESKACCESS_DEFAULT_DOM_CHECK_ACCESS);
  std::string name;
  std::string level;
  unsigned int state = kUntouched;
  unsigned int refCount = kUntouched;
  unsigned int worldRefCount = kUntouched;
  TeskAccessKsi_DefaultDom dflt = TESKACCESS_DEFAULT_DOM_NONE;

  EXPECT_TRUE(access.GetCompleteDomainInfo(id, name, level, state, refCount, worldRefCount, dflt));

  EXPECT_EQ(name, "template");
  EXPECT_EQ(level, "enforcing");
  EXPECT_EQ(state, 0U);
  EXPECT_EQ(refCount, 0U);
  EXPECT_EQ(worldRefCount, 0U);
  EXPECT_EQ(dflt, TESKACCESS_DEFAULT_DOM_CHECK_ACCESS);
}

TEST_F(HostContract, TellsAnEmptySlot) {
  std::string name;
  std::string level;
  unsigned int state = 0;
  unsigned int refCount = 0;
  unsigned int worldRefCount = 0;
  TeskAccessKsi_DefaultDom dflt = TESKACCESS_DEFAULT_DOM_NONE;
  EXPECT_FALSE(
      access.GetCompleteDomainInfo(400, name, level, state, refCount, worldRefCount, dflt));
}

TEST_F(HostContract, SetsTheEnforcementLevelOfOneDomain) {
  const unsigned int changed = Create("changed");
  const unsigned int other = Create("other");
  EXPECT_TRUE(access.EnableDomain("changed", "permissive", false));

  std::string name;
  std::string level;
  unsigned int number = 0;
  TeskAccessKsi_DefaultDom dflt = TESKACCESS_DEFAULT_DOM_NONE;
  access.GetCompleteDomainInfo(changed, name, level, number, number, number, dflt);
  EXPECT_EQ(level, "permissive");
  access.GetCompleteDomainInfo(other, name, level, number, number, number, dflt);
  EXPECT_EQ(level, "enforcing");
}

TEST_F(HostContract, TakesTheDomainsThatPlayAPart) {
  EXPECT_TRUE(access.SetGlobalVMDomain(Create("globalVMDom")));
  EXPECT_TRUE(access.SetIoFilterDomain(Create("ioFilterDom")));
  EXPECT_TRUE(access.SetDaemonFrameworkDomain(Create("daemonFrameworkDom")));
}

TEST_F(HostContract, TakesAGuestService) {
  EXPECT_NO_THROW(access.AddGcomService(Create("guest"), "clipboard"));
}

TEST_F(HostContract, HasNoPrivilegedMachineWithoutBeingTold) {
  Create("plain");
  EXPECT_FALSE(access.IsPrivilegedVm("plain"));
  EXPECT_FALSE(access.IsPrivilegedVm("nobody"));
}

// ---- Keywords.

struct Keyword {
  TeskAccess_KeywordType type;
  const char* word;
};

class HostKeywords : public HostContract, public ::testing::WithParamInterface<Keyword> {};

TEST_P(HostKeywords, KnowsTheWordsOfItsTable) {
  EXPECT_TRUE(access.ValidateKeyword(GetParam().type, GetParam().word));
  EXPECT_THAT(access.GetKeywordsMap(GetParam().type), Contains(Key(GetParam().word)));
}

TEST_P(HostKeywords, RefusesOtherWords) {
  EXPECT_THAT(MessageOf([&] { access.ValidateKeyword(GetParam().type, "no_such_word"); }),
              HasSubstr("no_such_word"));
  EXPECT_THAT(MessageOf([&] { access.ValidateKeyword(GetParam().type, ""); }),
              HasSubstr("unknown"));
  EXPECT_THAT(access.GetKeywordsMap(GetParam().type), Not(Contains(Key("no_such_word"))));
}

INSTANTIATE_TEST_SUITE_P(Tables, HostKeywords,
                         ::testing::Values(Keyword{TESKACCESS_KEYWORD_LABEL, "unlabeled"},
                                           Keyword{TESKACCESS_KEYWORD_CAPABILITY, "cap_kill"},
                                           Keyword{TESKACCESS_KEYWORD_PARAM_CHECK, "bind_port"},
                                           Keyword{TESKACCESS_KEYWORD_OBJECT_ACCESS, "read"},
                                           Keyword{TESKACCESS_KEYWORD_DOM_TRANS, "enter"},
                                           Keyword{TESKACCESS_KEYWORD_FILE_CREATION, "fifo"},
                                           Keyword{TESKACCESS_KEYWORD_UNIX_SOCK_CREATION, "stream"},
                                           Keyword{TESKACCESS_KEYWORD_SYSCALL, "openat"}),
                         [](const auto& table) {
                           return std::string("Table") + std::to_string(table.param.type);
                         });

TEST_F(HostContract, TakesTheNameOfADomainForALabel) {
  EXPECT_THAT(MessageOf([&] { access.ValidateKeyword(TESKACCESS_KEYWORD_LABEL, "tool"); }),
              HasSubstr("tool"));
  Create("tool");
  EXPECT_TRUE(access.ValidateKeyword(TESKACCESS_KEYWORD_LABEL, "tool"));
}

// ---- Labels.

TEST_F(HostContract, HasThePredefinedLabels) {
  for (const auto& label : {std::string("unlabeled"), access.GetDefaultTardiskLabel()}) {
    const unsigned int id = access.LookupLabel(label, TESKACCESS_LABEL_OBJECT);
    EXPECT_GE(id, 2U);
    EXPECT_EQ(access.GetLabel(id, TESKACCESS_LABEL_OBJECT), label);
    EXPECT_TRUE(access.IsPredefinedLabel(label, TESKACCESS_LABEL_OBJECT));
  }
}

TEST_F(HostContract, AnswersOneForAnUnknownLabel) {
  EXPECT_EQ(access.LookupLabel("nothing", TESKACCESS_LABEL_OBJECT), kNoLabel);
  EXPECT_FALSE(access.IsPredefinedLabel("nothing", TESKACCESS_LABEL_OBJECT));
}

TEST_F(HostContract, RefusesToNameAnUnknownIdentifier) {
  for (const unsigned int id : {kNoLabel, 99999U}) {
    EXPECT_THAT(MessageOf([&] { access.GetLabel(id, TESKACCESS_LABEL_OBJECT); }),
                AllOf(HasSubstr("identifier"), EndsWith(" " + std::to_string(id))));
  }
}

TEST_F(HostContract, AddsLabelsThatAreMissing) {
  EXPECT_TRUE(access.AddLabels({"tool", "data", "tool"}, TESKACCESS_LABEL_OBJECT));
  const unsigned int tool = access.LookupLabel("tool", TESKACCESS_LABEL_OBJECT);
  const unsigned int data = access.LookupLabel("data", TESKACCESS_LABEL_OBJECT);
  EXPECT_GE(tool, 2U);
  EXPECT_GE(data, 2U);
  EXPECT_NE(tool, data);
  EXPECT_FALSE(access.IsPredefinedLabel("tool", TESKACCESS_LABEL_OBJECT));

  EXPECT_TRUE(access.AddLabels({"data", "more"}, TESKACCESS_LABEL_OBJECT));
  EXPECT_EQ(access.LookupLabel("data", TESKACCESS_LABEL_OBJECT), data);
  EXPECT_THAT(access.GetKeywordsMap(TESKACCESS_KEYWORD_LABEL),
              IsSupersetOf({std::pair<const std::string, long>("tool", tool),
                            std::pair<const std::string, long>("data", data)}));
}

TEST_F(HostContract, RemovesLabels) {
  access.AddLabels({"tool", "data"}, TESKACCESS_LABEL_OBJECT);
  EXPECT_TRUE(access.RemoveLabels({"tool", "nothing"}, TESKACCESS_LABEL_OBJECT));
  EXPECT_EQ(access.LookupLabel("tool", TESKACCESS_LABEL_OBJECT), kNoLabel);
  EXPECT_NE(access.LookupLabel("data", TESKACCESS_LABEL_OBJECT), kNoLabel);
}

TEST_F(HostContract, TellsLabelsByLetterCase) {
  access.AddLabels({"tool"}, TESKACCESS_LABEL_OBJECT);
  EXPECT_EQ(access.LookupLabel("Tool", TESKACCESS_LABEL_OBJECT), kNoLabel);
}

TEST_F(HostContract, HasNoInvalidLabelsByItself) {
  access.AddLabels({"tool"}, TESKACCESS_LABEL_OBJECT);
  access.RemoveLabels({"tool"}, TESKACCESS_LABEL_OBJECT);
  EXPECT_THAT(access.GetInvalidLabels(TESKACCESS_LABEL_OBJECT), IsEmpty());
  EXPECT_THAT(access.GetInvalidLabels(TESKACCESS_LABEL_DOMAIN), IsEmpty());
}

// ---- Rules: what the eight kinds have in common.

template <class Record>
struct Kind;

// Samples name two things, and say of the first also the opposite.
template <>
struct Kind<TeskAccess_SyscallRule> {
  static constexpr auto kSet = &TeskAccessInterfaceImpl::SetSyscallRule;
  static constexpr auto kGet = &TeskAccessInterfaceImpl::GetSyscallRules;
  static TeskAccess_SyscallRule First() { return {3, 0, "", "read", true}; }
  static TeskAccess_SyscallRule Second() { return {4, 0, "", "openat", false}; }
};
template <>
struct Kind<TeskAccess_CapabilityRule> {
  static constexpr auto kSet = &TeskAccessInterfaceImpl::SetCapabilityRule;
  static constexpr auto kGet = &TeskAccessInterfaceImpl::GetCapabilityRules;
  static TeskAccess_CapabilityRule First() { return {3, 0, "", "cap_kill", true}; }
  static TeskAccess_CapabilityRule Second() { return {4, 0, "", "cap_chown", false}; }
};
template <>
struct Kind<TeskAccess_CapabilityParamRule> {
  static constexpr auto kSet = &TeskAccessInterfaceImpl::SetCapabilityParamRule;
  static constexpr auto kGet = &TeskAccessInterfaceImpl::GetCapabilityParamRules;
  static TeskAccess_CapabilityParamRule First() {
    return {3, 0, "", "bind_port", "0x50", "443", true};
  }
  static TeskAccess_CapabilityParamRule Second() {
    return {4, 0, "", "socket_family", "1", "", false};
  }
};
template <>
struct Kind<TeskAccess_ObjectAccessRule> {
  static constexpr auto kSet = &TeskAccessInterfaceImpl::SetObjectAccessRule;
  static constexpr auto kGet = &TeskAccessInterfaceImpl::GetObjectAccessRules;
  static TeskAccess_ObjectAccessRule First() { return {3, 0, "", "tool", "read", true}; }
  static TeskAccess_ObjectAccessRule Second() { return {4, 0, "", "tool", "write", false}; }
};
template <>
struct Kind<TeskAccess_DomTransRule> {
  static constexpr auto kSet = &TeskAccessInterfaceImpl::SetDomTransRule;
  static constexpr auto kGet = &TeskAccessInterfaceImpl::GetDomTransRules;
  static TeskAccess_DomTransRule First() { return {3, 0, "", "tool", "hostDom", 0, "exec", true}; }
  static TeskAccess_DomTransRule Second() {
    return {4, 0, "", "tool", "hostDom", 0, "enter", false};
  }
};
template <>
struct Kind<TeskAccess_FileCreationRule> {
  static constexpr auto kSet = &TeskAccessInterfaceImpl::SetFileCreationRule;
  static constexpr auto kGet = &TeskAccessInterfaceImpl::GetFileCreationRules;
  static TeskAccess_FileCreationRule First() { return {3, 0, "", "tool", "data", "fifo", true}; }
  static TeskAccess_FileCreationRule Second() { return {4, 0, "", "data", "tool", "fifo", false}; }
};
template <>
struct Kind<TeskAccess_UnixSockCreationRule> {
  static constexpr auto kSet = &TeskAccessInterfaceImpl::SetUnixSockCreationRule;
  static constexpr auto kGet = &TeskAccessInterfaceImpl::GetUnixSockCreationRules;
  static TeskAccess_UnixSockCreationRule First() { return {3, 0, "", "tool", "stream", true}; }
  static TeskAccess_UnixSockCreationRule Second() { return {4, 0, "", "tool", "dgram", false}; }
};

template <class Record>
class HostRules : public HostContract {
 protected:
  HostRules() { access.AddLabels({"tool", "data"}, TESKACCESS_LABEL_OBJECT); }

  void Set(Record rule, unsigned int line = 0) {
    rule.domainId = domain;
    rule.domainName = "owner";
    if (line != 0) rule.line = line;
    (access.*Kind<Record>::kSet)(rule);
  }

  std::list<Record> Get(unsigned int id) {
    std::list<Record> rules;
    (access.*Kind<Record>::kGet)(id, rules);
    return rules;
  }

  std::vector<unsigned int> Lines() {
    std::vector<unsigned int> lines;
    for (const Record& rule : Get(domain)) lines.push_back(rule.line);
    return lines;
  }

  unsigned int domain = Create("owner");
};

// The words of a rule, as one text.
std::string WordsOf(const TeskAccess_SyscallRule& rule) { return rule.syscall; }
std::string WordsOf(const TeskAccess_CapabilityRule& rule) { return rule.capability; }
std::string WordsOf(const TeskAccess_CapabilityParamRule& rule) {
  return rule.paramCheck + " " + rule.firstParam + " " + rule.secondParam;
}
std::string WordsOf(const TeskAccess_ObjectAccessRule& rule) {
  return rule.label + " " + rule.accessKind;
}
std::string WordsOf(const TeskAccess_DomTransRule& rule) {
  return rule.label + " " + rule.targetDomain + " " + std::to_string(rule.targetDomainId) + " " +
         rule.transitionKind;
}
std::string WordsOf(const TeskAccess_FileCreationRule& rule) {
  return rule.label + " " + rule.secondLabel + " " + rule.creationKind;
}
std::string WordsOf(const TeskAccess_UnixSockCreationRule& rule) {
  return rule.label + " " + rule.sockKind;
}

using WordRecords = ::testing::Types<TeskAccess_SyscallRule, TeskAccess_CapabilityRule,
                                     TeskAccess_CapabilityParamRule, TeskAccess_ObjectAccessRule,
                                     TeskAccess_DomTransRule, TeskAccess_FileCreationRule,
                                     TeskAccess_UnixSockCreationRule>;
TYPED_TEST_SUITE(HostRules, WordRecords);

TYPED_TEST(HostRules, ReadsBackWhatWasInstalled) {
  this->Set(Kind<TypeParam>::First());
  const auto rules = this->Get(this->domain);

  ASSERT_EQ(rules.size(), 1U);
  EXPECT_EQ(rules.front().line, 3U);
  EXPECT_EQ(rules.front().domainId, this->domain);
  EXPECT_EQ(rules.front().domainName, "owner");
  EXPECT_EQ(WordsOf(rules.front()), WordsOf(Kind<TypeParam>::First()));
  EXPECT_TRUE(rules.front().grant);
}

TYPED_TEST(HostRules, KeepsTheOrderOfInstallation) {
  this->Set(Kind<TypeParam>::Second());
  this->Set(Kind<TypeParam>::First());
  EXPECT_THAT(this->Lines(), ElementsAre(4, 3));
}

TYPED_TEST(HostRules, LetsTheLaterRuleOfTheSameThingWin) {
  this->Set(Kind<TypeParam>::First());
  this->Set(Kind<TypeParam>::Second());
  auto opposite = Kind<TypeParam>::First();
  opposite.grant = false;
  this->Set(opposite, 9);

  EXPECT_THAT(this->Lines(), ElementsAre(4, 9));
  EXPECT_FALSE(this->Get(this->domain).back().grant);
}

TYPED_TEST(HostRules, DoesNotGrowWhenAllIsInstalledAgain) {
  for (int load = 0; load < 3; ++load) {
    this->Set(Kind<TypeParam>::First());
    this->Set(Kind<TypeParam>::Second());
  }
  EXPECT_THAT(this->Lines(), ElementsAre(3, 4));
}

TYPED_TEST(HostRules, AppendsToTheListItIsGiven) {
  this->Set(Kind<TypeParam>::First());
  std::list<TypeParam> rules(1);
  (this->access.*Kind<TypeParam>::kGet)(this->domain, rules);
  EXPECT_EQ(rules.size(), 2U);
}

TYPED_TEST(HostRules, KeepsDomainsApart) {
  this->Set(Kind<TypeParam>::First());
  EXPECT_THAT(this->Get(this->Create("other")), IsEmpty());
}

// ---- Rules: what single kinds have of their own.

class HostFilePaths : public HostContract {
 protected:
  TeskAccess_FilePathAccessRule Rule(unsigned int line, const std::string& path,
                                     const std::string& permissions) const {
    return {line, domain, "owner", path, permissions};
  }

  void Set(std::list<TeskAccess_FilePathAccessRule> rules) { access.SetFilePathAccessRules(rules); }

  std::vector<std::string> Get(unsigned int id) {
    std::list<TeskAccess_FilePathAccessRule> rules;
    access.GetFilePathAccessRules(id, rules);
    std::vector<std::string> texts;
    for (const auto& rule : rules) texts.push_back(rule.path + " " + rule.permissions);
    return texts;
  }

  unsigned int domain = Create("owner");
};

TEST_F(HostFilePaths, ReadsBackAWholeList) {
  Set({Rule(1, "/etc", "r"), Rule(2, "/bin/tool", "rx"), Rule(3, "/", "")});
  EXPECT_THAT(Get(domain), ElementsAre("/etc r", "/bin/tool rx", "/ "));
}

TEST_F(HostFilePaths, LetsTheLaterRuleOfAPathWin) {
  Set({Rule(1, "/etc", "r"), Rule(2, "/bin/tool", "rx")});
  Set({Rule(3, "/etc", "rw")});
  EXPECT_THAT(Get(domain), ElementsAre("/bin/tool rx", "/etc rw"));
}

TEST_F(HostFilePaths, KeepsDomainsApart) {
  Set({Rule(1, "/etc", "r")});
  EXPECT_THAT(Get(Create("other")), IsEmpty());
}

TEST_F(HostFilePaths, FillsInTheHeader) {
  Set({Rule(7, "/etc", "r")});
  std::list<TeskAccess_FilePathAccessRule> rules(1);
  access.GetFilePathAccessRules(domain, rules);
  ASSERT_EQ(rules.size(), 2U);
  EXPECT_EQ(rules.back().line, 7U);
  EXPECT_EQ(rules.back().domainId, domain);
  EXPECT_EQ(rules.back().domainName, "owner");
}

TEST_F(HostContract, AcceptsParameterChecksThatDoNotConflict) {
  Create("owner");
  std::list<TeskAccess_CapabilityParamRule> rules;
  EXPECT_TRUE(access.CheckCapabilityParamRuleConstraints("owner", rules));
  rules.push_back({1, 0, "owner", "bind_port", "80", "443", true});
  rules.push_back({2, 0, "owner", "bind_port", "444", "", false});
  EXPECT_TRUE(access.CheckCapabilityParamRuleConstraints("owner", rules));
}

// ---- Tardisks.

TEST_F(HostContract, NamesWhatTardisksNeed) {
  EXPECT_THAT(access.GetTardiskLaunchDomains(), ElementsAre("hostDom", "daemonFrameworkDom"));
  EXPECT_EQ(access.GetTardiskExecEventKeyword(), "tardisk_exec");
  EXPECT_TRUE(
      access.ValidateKeyword(TESKACCESS_KEYWORD_DOM_TRANS, access.GetTardiskExecEventKeyword()));
  EXPECT_EQ(access.GetDefaultTardiskLabel(), "tardiskDefault");
  EXPECT_EQ(access.GetDefaultTardiskDomain(), "appDom");
}

TEST_F(HostContract, RefusesAnInodeRecordOfAnotherSize) {
  TeskCtl::Util::Sysinfo inode(TeskCtl::Util::KSI_NODE_system_kelpfs_inodes_stats);
  inode.AddInstancePath(1);
  for (const unsigned int size : {547U, 549U}) {
    std::array<char, 549> record{};
    EXPECT_THAT(MessageOf([&] { inode.Get(record.data(), size); }), HasSubstr("record"));
    EXPECT_THAT(record, Each('\0'));
  }
}

TEST_F(HostContract, KnowsNoTardiskOfAnInodeThatCameFromNone) {
  TeskCtl::Util::Sysinfo inode(TeskCtl::Util::KSI_NODE_system_kelpfs_inodes_stats);
  inode.AddInstancePath(1);
  std::array<char, 548> record{};
  record.fill('x');
  inode.Get(record.data(), record.size());
  EXPECT_EQ(std::string(record.data() + 36), "");
}

// ---- The kernel.

TEST_F(HostContract, CallsLeaveErrnoAlone) {
  errno = E2BIG;
  Zorvan::Kernel::Call(0x405a, {300});
  EXPECT_EQ(errno, E2BIG);
}

TEST_F(HostContract, ReadsTheLabelThatItWrote) {
  const std::string& file = host.LabelledFile();
  std::uint32_t value = 0;
  if (Zorvan::Kernel::GetXattr(file.c_str(), "zorvan.security", &value, sizeof value) < 0) {
    GTEST_SKIP() << "no label can be put on files here";
  }
  EXPECT_EQ(value, 2U);

  constexpr int kReplace = 2;
  const std::uint32_t written = 0x12345678;
  EXPECT_EQ(
      Zorvan::Kernel::SetXattr(file.c_str(), "zorvan.security", &written, sizeof written, kReplace),
      0);
  EXPECT_EQ(Zorvan::Kernel::GetXattr(file.c_str(), "zorvan.security", &value, sizeof value), 4);
  EXPECT_EQ(value, written);
}

TEST_F(HostContract, FailsToLabelTheEmptyPath) {
  constexpr int kReplace = 2;
  std::uint32_t value = 2;
  errno = 0;
  EXPECT_EQ(Zorvan::Kernel::SetXattr("", "zorvan.security", &value, sizeof value, kReplace), -1);
  EXPECT_EQ(errno, ENOENT);
  errno = 0;
  EXPECT_EQ(Zorvan::Kernel::GetXattr("", "zorvan.security", &value, sizeof value), -1);
  EXPECT_EQ(errno, ENOENT);
}

TEST_F(HostContract, ResolvesPaths) {
  std::array<char, 1984> resolved{};
  EXPECT_EQ(Zorvan::Kernel::RealPath("/", resolved.data()), 0);
  EXPECT_STREQ(resolved.data(), "/");
  EXPECT_NE(Zorvan::Kernel::RealPath("", resolved.data()), 0);
}

// ---- Files and settings.

TEST_F(HostContract, TellsFilesAndDirectories) {
  const std::string& file = host.LabelledFile();
  EXPECT_TRUE(File_Exists(file.c_str()));
  EXPECT_FALSE(File_IsDirectory(file.c_str()));
  EXPECT_TRUE(File_Exists("/"));
  EXPECT_TRUE(File_IsDirectory("/"));
  EXPECT_FALSE(File_Exists((file + ".missing").c_str()));
  EXPECT_FALSE(File_IsDirectory((file + ".missing").c_str()));
}

TEST_F(HostContract, KnowsNothingOfASettingThatNobodyMade) {
  EXPECT_EQ(TeskCtl::Adv::AdvancedOptionImpl::FindOption("/UserVars/NobodySetThis"), nullptr);
  const OrinConfigStore::ConfigStoreObjectId id("domain_settings", "security", "orin",
                                                "nobodyConfiguredThis");
  EXPECT_EQ(OrinConfigStore::GetDesiredUserConfig(id, OrinConfigStore::FLAG_NONE), nullptr);
}

}  // namespace
}  // namespace HostContractTest
