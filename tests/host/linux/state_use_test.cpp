// One process that serves two states one after the other, as an agent does: nothing of the one may
// be taken for the other's.
#include "host/linux/operation/state_use.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <string>

#include "host/linux/files/security_attribute.h"
#include "host/linux/operation/load_record.h"
#include "host/linux/operation/policy_count.h"
#include "host/linux/operation/policy_load.h"
#include "host/linux/state/host_state.h"
#include "state_directory.h"
#include "support/message_of.h"
#include "teskctl/security.h"
#include "zorvan/kernel.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::HostState;
using SecPolicyTest::MessageOf;
using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
using TeskCtl::Security::TeskAccessInterfaceImpl;

// What a state is told by: each part by another way to it.
std::string Portrait() {
  std::string portrait;
  unsigned int id = 0;
  for (const char* name : {"one", "two"}) {
    if (TeskAccessInterfaceImpl().FindDomain(name, &id)) portrait += name;
  }
  char name[64] = {};
  Zorvan::Kernel::Call(0x4066, {2, reinterpret_cast<std::uintptr_t>(name), sizeof name});
  const auto load = LinuxHost::LatestLoad(HostState::Current());
  return portrait + " " + name + " " +
         std::to_string(LinuxHost::CountPolicy(HostState::Current()).objects) + " " +
         (load ? load->directory : "-") + " " + LinuxHost::LabelAttribute();
}

void Fill(const std::string& name, const std::string& attribute, std::size_t labels) {
  HostState& state = HostState::Current();
  state.Domains().Create(name, TESKACCESS_DEFAULT_DOM_NONE, false);
  for (std::size_t number = 0; number < labels; ++number) {
    state.Labels().Add({name + std::to_string(number)});
  }
  state.ChooseLabelAttribute(attribute);
  LinuxHost::RecordLoad(HostState::Current(),
                        {.verb = "load", .directory = "/" + name, .ending = "done", .errors = {}});
}

TEST(StateUse, ServesTwoStatesOneAfterTheOther) {
  const StateDirectory first;
  Fill("one", "user.zorvan.security", 1);
  const std::string portrait = Portrait();
  EXPECT_EQ(portrait, "one one 3 /one user.zorvan.security");
  {
    const StateDirectory second;
    Fill("two", "security.bpf.zorvan", 2);
    EXPECT_EQ(Portrait(), "two two 4 /two security.bpf.zorvan");
  }
  EXPECT_EQ(Portrait(), portrait);
}

TEST(StateUse, SeesTheAttributeOfTheNextBoot) {
  const StateDirectory directory;
  Fill("one", "user.zorvan.security", 0);
  EXPECT_EQ(LinuxHost::LabelAttribute(), "user.zorvan.security");
  HostState::Current().Reset();
  HostState::Current().ChooseLabelAttribute("security.bpf.zorvan");
  EXPECT_EQ(LinuxHost::LabelAttribute(), "security.bpf.zorvan");
}

TEST(StateUse, RefusesACopyWhileALoadKeepsToItsState) {
  const StateDirectory directory;
  LinuxHost::PolicyTransaction load(HostState::Current());
  load.BeginLoad({.directory = "/policy", .domains = {}});
  const std::string copy = directory.Path() + "/copy.db";
  EXPECT_EQ(MessageOf([&] { LinuxHost::UsedCopy used(copy, copy); }),
            "A load is installing its policy in " + directory.Database());
  EXPECT_EQ(LinuxHost::StatePath(), directory.Database());
}

TEST(StateUse, CopiesWhatIsThere) {
  const StateDirectory directory;
  const std::string copy = directory.Path() + "/copy.db";
  EXPECT_TRUE(LinuxHost::IsStateMissing());
  EXPECT_EQ(LinuxHost::CopyUsedState(copy), LinuxHost::StateCopy::kMissing);
  Fill("one", "user.zorvan.security", 0);
  EXPECT_FALSE(LinuxHost::IsStateMissing());
  EXPECT_EQ(LinuxHost::CopyUsedState(copy), LinuxHost::StateCopy::kMade);
  const LinuxHost::UsedCopy used(copy, directory.Database());
  EXPECT_NE(HostState::Current().Domains().Find("one"), nullptr);
}

TEST(StateUse, NamesACopyAsWhatItWasMadeOf) {
  const StateDirectory directory;
  const std::string copy = directory.Path() + "/copy.db";
  Fill("one", "user.zorvan.security", 0);
  ASSERT_EQ(LinuxHost::CopyUsedState(copy), LinuxHost::StateCopy::kMade);
  std::filesystem::resize_file(copy, 8192);
  EXPECT_EQ(LinuxHost::ShownStatePath(), directory.Database());
  const std::string told = MessageOf([&] { LinuxHost::UsedCopy used(copy, "/the/original.db"); });
  EXPECT_TRUE(told.starts_with("Unable to use the host state /the/original.db: it is damaged"))
      << told;
  EXPECT_EQ(LinuxHost::ShownStatePath(), directory.Database());
}

}  // namespace
}  // namespace LinuxHostTest
