// The host's interface where it has more to say than the contract: slots, roles, the two spaces of
// labels, lists installed all or none, conflicts of parameter checks.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>

#include "child_process.h"
#include "host/linux/state/domain_table.h"
#include "host/linux/state/host_state.h"
#include "state_directory.h"
#include "support/message_of.h"
#include "teskctl/security.h"
#include "zorvan/kernel.h"

namespace LinuxHostTest {
namespace {

using SecPolicyTest::MessageOf;
using TeskCtl::Security::TeskAccess_CapabilityParamRule;
using TeskCtl::Security::TeskAccess_CapabilityRule;
using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
using TeskCtl::Security::TeskAccess_DomTransRule;
using TeskCtl::Security::TeskAccess_FileCreationRule;
using TeskCtl::Security::TeskAccess_FilePathAccessRule;
using TeskCtl::Security::TeskAccess_FileRule;
using TeskCtl::Security::TESKACCESS_LABEL_DOMAIN;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;
using TeskCtl::Security::TeskAccess_ObjectAccessRule;
using TeskCtl::Security::TeskAccess_SyscallRule;
using TeskCtl::Security::TeskAccess_UnixSockCreationRule;
using TeskCtl::Security::TeskAccessInterfaceImpl;
using TeskCtl::Security::TeskAccessKsi_DefaultDom;
using TeskCtl::Security::TeskAccessLabelType;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class AccessInterface : public ::testing::Test {
 protected:
  unsigned int Create(const std::string& name) {
    return access.CreateDomain(name, TESKACCESS_DEFAULT_DOM_NONE);
  }

  StateDirectory directory;
  TeskAccessInterfaceImpl access;
};

TEST_F(AccessInterface, KeepsGuestServices) {
  const unsigned int guest = Create("guest");
  access.AddGcomService(guest, "clipboard");
  EXPECT_THAT(LinuxHost::HostState::Current().Domains().GuestServices(guest),
              ElementsAre("clipboard"));
}

TEST_F(AccessInterface, CannotBeMadeOnAForeignState) {
  const std::string other = directory.Path() + "/other.db";
  std::filesystem::create_directory(other);
  const LinuxHost::UsedState used(other);
  EXPECT_EQ(MessageOf([] { const TeskAccessInterfaceImpl refused; }),
            "Refusing the host state: " + other +
                " is not a regular file. Remove it, or choose another place");
}

TEST_F(AccessInterface, KeepsItsStateWhenAnotherIsUsed) {
  const LinuxHost::UsedState used(directory.Path() + "/other.db");
  TeskAccessInterfaceImpl other;
  other.CreateDomain("elsewhere", TESKACCESS_DEFAULT_DOM_NONE);
  unsigned int id = 0;
  EXPECT_FALSE(access.FindDomain("elsewhere", &id));
  EXPECT_TRUE(other.FindDomain("elsewhere", &id));
}

TEST_F(AccessInterface, TellsAChildThatItIsNotItsOwn) {
  EXPECT_EQ(RunInChild([&] { access.CreateDomain("child", TESKACCESS_DEFAULT_DOM_NONE); }),
            "The host state was opened before this process was forked: open it again");
}

TEST_F(AccessInterface, Has512Slots) {
  EXPECT_EQ(access.GetMaxDomains(), 512U);
  std::string text;
  unsigned int number = 0;
  TeskAccessKsi_DefaultDom dflt = TESKACCESS_DEFAULT_DOM_NONE;
  EXPECT_FALSE(access.GetCompleteDomainInfo(511, text, text, number, number, number, dflt));
  EXPECT_EQ(MessageOf([&] {
              access.GetCompleteDomainInfo(512, text, text, number, number, number, dflt);
            }),
            "domain 512 is beyond the last slot 511");
}

TEST_F(AccessInterface, ShowsReferencesAndTheStateWord) {
  const unsigned int id = Create("globalVMDom");
  access.SetGlobalVMDomain(id);
  access.SetDomTransRule({1, 0, "hostDom", "unlabeled", "globalVMDom", id, "exec", true});

  std::string name;
  std::string level;
  unsigned int state = 0;
  unsigned int refCount = 0;
  unsigned int worldRefCount = 0;
  TeskAccessKsi_DefaultDom dflt = TESKACCESS_DEFAULT_DOM_NONE;
  access.GetCompleteDomainInfo(id, name, level, state, refCount, worldRefCount, dflt);
  EXPECT_EQ(state, 1U);
  EXPECT_EQ(refCount, 2U);
  EXPECT_EQ(worldRefCount, 0U);
}

TEST_F(AccessInterface, KnowsTheGlobalMachineForPrivileged) {
  access.SetGlobalVMDomain(Create("globalVMDom"));
  access.SetIoFilterDomain(Create("ioFilterDom"));
  EXPECT_TRUE(access.IsPrivilegedVm("globalVMDom"));
  EXPECT_FALSE(access.IsPrivilegedVm("ioFilterDom"));
  EXPECT_FALSE(access.IsPrivilegedVm("unlabeled"));
}

TEST_F(AccessInterface, HasALabelForEachDomain) {
  const unsigned int id = Create("tool");
  EXPECT_EQ(access.LookupLabel("tool", TESKACCESS_LABEL_DOMAIN), id);
  EXPECT_EQ(access.LookupLabel("tool", TESKACCESS_LABEL_OBJECT), 1U);
  EXPECT_EQ(access.LookupLabel("nobody", TESKACCESS_LABEL_DOMAIN), 1U);
  EXPECT_EQ(access.GetLabel(id, TESKACCESS_LABEL_DOMAIN), "tool");
  EXPECT_TRUE(access.IsPredefinedLabel("hostDom", TESKACCESS_LABEL_DOMAIN));
  EXPECT_FALSE(access.IsPredefinedLabel("tool", TESKACCESS_LABEL_DOMAIN));
  EXPECT_FALSE(access.IsPredefinedLabel("unlabeled", TESKACCESS_LABEL_DOMAIN));
  EXPECT_EQ(MessageOf([&] { access.GetLabel(77, TESKACCESS_LABEL_DOMAIN); }), "unknown domain 77");
}

TEST_F(AccessInterface, AddsAndRemovesDomainsAsLabels) {
  access.AddLabels({"tool"}, TESKACCESS_LABEL_DOMAIN);
  unsigned int id = 0;
  EXPECT_TRUE(access.FindDomain("tool", &id));
  access.RemoveLabels({"tool", "hostDom"}, TESKACCESS_LABEL_DOMAIN);
  EXPECT_FALSE(access.FindDomain("tool", &id));
  EXPECT_TRUE(access.FindDomain("hostDom", &id));
}

TEST_F(AccessInterface, HasTwoLabelSpaces) {
  const auto third = static_cast<TeskAccessLabelType>(2);
  const std::string message = "unknown label type 2";
  EXPECT_EQ(MessageOf([&] { access.LookupLabel("x", third); }), message);
  EXPECT_EQ(MessageOf([&] { access.GetLabel(2, third); }), message);
  EXPECT_EQ(MessageOf([&] { access.IsPredefinedLabel("x", third); }), message);
  EXPECT_EQ(MessageOf([&] { access.GetInvalidLabels(third); }), message);
  EXPECT_EQ(MessageOf([&] { access.AddLabels({"x"}, third); }), message);
  EXPECT_EQ(MessageOf([&] { access.RemoveLabels({"x"}, third); }), message);
}

TEST_F(AccessInterface, HasNoRulesOfUnknownDomains) {
  const std::string message = "unknown domain 77";
  const auto refuses = [&](auto get, auto rules) {
    EXPECT_EQ(MessageOf([&] { (access.*get)(77, rules); }), message);
  };
  using Access = TeskAccessInterfaceImpl;
  refuses(&Access::GetSyscallRules, std::list<TeskAccess_SyscallRule>());
  refuses(&Access::GetCapabilityRules, std::list<TeskAccess_CapabilityRule>());
  refuses(&Access::GetCapabilityParamRules, std::list<TeskAccess_CapabilityParamRule>());
  refuses(&Access::GetObjectAccessRules, std::list<TeskAccess_ObjectAccessRule>());
  refuses(&Access::GetDomTransRules, std::list<TeskAccess_DomTransRule>());
  refuses(&Access::GetFileCreationRules, std::list<TeskAccess_FileCreationRule>());
  refuses(&Access::GetUnixSockCreationRules, std::list<TeskAccess_UnixSockCreationRule>());
  refuses(&Access::GetFilePathAccessRules, std::list<TeskAccess_FilePathAccessRule>());
}

TEST_F(AccessInterface, ReadsTheTargetOfATransitionAsItIsNow) {
  const unsigned int id = Create("tool");
  access.SetDomTransRule({1, 0, "hostDom", "unlabeled", "tool", id, "exec", true});
  std::list<TeskAccess_DomTransRule> rules;
  access.GetDomTransRules(0, rules);
  ASSERT_EQ(rules.size(), 1U);
  EXPECT_EQ(rules.front().targetDomainId, id);
  EXPECT_EQ(rules.front().targetDomain, "tool");
}

TEST_F(AccessInterface, InstallsAListOfPathsAllOrNone) {
  std::list<TeskAccess_FilePathAccessRule> rules = {{1, 0, "hostDom", "/etc", "r"},
                                                    {2, 0, "hostDom", "/bin", "rq"}};
  EXPECT_EQ(MessageOf([&] { access.SetFilePathAccessRules(rules); }),
            "permissions 'rq' must be letters of \"rwx\", each at most once");
  std::list<TeskAccess_FilePathAccessRule> read;
  access.GetFilePathAccessRules(0, read);
  EXPECT_THAT(read, IsEmpty());
}

TEST_F(AccessInterface, ReadsBackThePoliciesOfTheKernelCall) {
  TeskAccess_FileRule rule{"/bin/tool", 0x13};
  unsigned int installed = 0;
  const auto result =
      Zorvan::Kernel::Call(0x405f, {0, 0, reinterpret_cast<std::uintptr_t>(&rule), 1,
                                    reinterpret_cast<std::uintptr_t>(&installed)});
  ASSERT_EQ(result.status, 0U);
  std::list<TeskAccess_FilePathAccessRule> read;
  access.GetFilePathAccessRules(0, read);
  ASSERT_EQ(read.size(), 1U);
  EXPECT_EQ(read.front().path, "/bin/tool");
  EXPECT_EQ(read.front().permissions, "rwx");
  EXPECT_EQ(read.front().domainName, "hostDom");
}

TEST_F(AccessInterface, RefusesParametersThatAreNoNumbers) {
  EXPECT_EQ(MessageOf([&] {
              access.SetCapabilityParamRule({1, 0, "hostDom", "bind_port", "http", "", true});
            }),
            "parameter 'http' is not an unsigned number");
}

TEST_F(AccessInterface, FindsConflictingParameterChecks) {
  std::list<TeskAccess_CapabilityParamRule> rules = {
      {3, 0, "hostDom", "bind_port", "80", "443", true},
      {5, 0, "hostDom", "bind_port", "443", "", false}};
  EXPECT_EQ(
      MessageOf([&] { access.CheckCapabilityParamRuleConstraints("hostDom", rules); }),
      "parameter check 'bind_port': grant of 80 to 443 in line 3 conflicts with revoke of 443 in "
      "line 5");
  EXPECT_EQ(MessageOf([&] { access.CheckCapabilityParamRuleConstraints("nobody", rules); }),
            "unknown domain 'nobody'");
}

}  // namespace
}  // namespace LinuxHostTest
