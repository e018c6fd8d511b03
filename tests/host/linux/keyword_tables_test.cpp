// Words that the host knows: numbered as the system and the installed headers number them,
// compared whole.

#include "host/linux/state/keyword_tables.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/capability.h>

#include "host/linux/state/host_state.h"
#include "policy/call_set.h"
#include "secpolicyhost/values.h"
#include "state_directory.h"
#include "support/message_of.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::HostState;
using SecPolicyTest::MessageOf;
using TeskCtl::Security::TeskAccess_KeywordType;
using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::Pair;
using ::testing::UnorderedElementsAre;

class KeywordTables : public ::testing::Test {
 protected:
  std::string Refusal(TeskAccess_KeywordType type, const std::string& word) {
    const auto refusal = state.Keywords().Refusal(type, word);
    return refusal ? refusal->what() : "";
  }

  StateDirectory directory;
  HostState& state = HostState::Current();
};

TEST_F(KeywordTables, NumberTheCapabilities) {
  const char* words[] = {"cap_chown",
                         "cap_dac_override",
                         "cap_dac_read_search",
                         "cap_fowner",
                         "cap_fsetid",
                         "cap_kill",
                         "cap_setgid",
                         "cap_setuid",
                         "cap_setpcap",
                         "cap_net_bind_service",
                         "cap_net_admin",
                         "cap_net_raw",
                         "cap_ipc_lock",
                         "cap_sys_module",
                         "cap_sys_rawio",
                         "cap_sys_chroot",
                         "cap_sys_ptrace",
                         "cap_sys_admin",
                         "cap_sys_boot",
                         "cap_linux_immutable",
                         "cap_net_broadcast",
                         "cap_ipc_owner",
                         "cap_sys_pacct",
                         "cap_sys_nice",
                         "cap_sys_resource",
                         "cap_sys_time",
                         "cap_sys_tty_config",
                         "cap_mknod",
                         "cap_lease",
                         "cap_audit_write",
                         "cap_audit_control",
                         "cap_setfcap",
                         "cap_mac_override",
                         "cap_mac_admin",
                         "cap_syslog",
                         "cap_wake_alarm",
                         "cap_block_suspend",
                         "cap_audit_read",
                         "cap_perfmon",
                         "cap_bpf",
                         "cap_checkpoint_restore"};
  std::map<std::string, long> expected;
  for (const char* word : words) expected.emplace(word, static_cast<long>(expected.size()));
  EXPECT_EQ(state.Keywords().All(TeskCtl::Security::TESKACCESS_KEYWORD_CAPABILITY), expected);
  EXPECT_EQ(LinuxHost::CapabilityWord(18), "cap_sys_boot");
  EXPECT_EQ(MessageOf([] { LinuxHost::CapabilityWord(41); }), "unknown capability 41");
}

TEST_F(KeywordTables, NameTheCapabilitiesAsLinuxDoes) {
  for (const auto& [word, number] :
       state.Keywords().All(TeskCtl::Security::TESKACCESS_KEYWORD_CAPABILITY)) {
    cap_value_t capability = 0;
    EXPECT_EQ(cap_from_name(word.c_str(), &capability), 0) << word;
  }
}

TEST_F(KeywordTables, NumberTheParameterChecks) {
  EXPECT_THAT(
      state.Keywords().All(TeskCtl::Security::TESKACCESS_KEYWORD_PARAM_CHECK),
      UnorderedElementsAre(Pair("socket_family", 0), Pair("socket_type", 1), Pair("bind_port", 2),
                           Pair("connect_port", 3), Pair("ioctl_request", 4),
                           Pair("prctl_option", 5), Pair("clone_flags", 6), Pair("kill_signal", 7),
                           Pair("set_uid", 8), Pair("set_gid", 9)));
  EXPECT_EQ(LinuxHost::ParameterCheckWord(9), "set_gid");
  EXPECT_EQ(MessageOf([] { LinuxHost::ParameterCheckWord(10); }), "unknown parameter check 10");
}

TEST_F(KeywordTables, NumberCapabilitiesAsTheInstalledHeaderDoes) {
  const std::map<std::string, long> expected = {
      {"cap_chown", LinuxHost::kCapChown},
      {"cap_dac_override", LinuxHost::kCapDacOverride},
      {"cap_dac_read_search", LinuxHost::kCapDacReadSearch},
      {"cap_fowner", LinuxHost::kCapFowner},
      {"cap_fsetid", LinuxHost::kCapFsetid},
      {"cap_kill", LinuxHost::kCapKill},
      {"cap_setgid", LinuxHost::kCapSetgid},
      {"cap_setuid", LinuxHost::kCapSetuid},
      {"cap_setpcap", LinuxHost::kCapSetpcap},
      {"cap_net_bind_service", LinuxHost::kCapNetBindService},
      {"cap_net_admin", LinuxHost::kCapNetAdmin},
      {"cap_net_raw", LinuxHost::kCapNetRaw},
      {"cap_ipc_lock", LinuxHost::kCapIpcLock},
      {"cap_sys_module", LinuxHost::kCapSysModule},
      {"cap_sys_rawio", LinuxHost::kCapSysRawio},
      {"cap_sys_chroot", LinuxHost::kCapSysChroot},
      {"cap_sys_ptrace", LinuxHost::kCapSysPtrace},
      {"cap_sys_admin", LinuxHost::kCapSysAdmin},
      {"cap_sys_boot", LinuxHost::kCapSysBoot},
  };
  EXPECT_THAT(state.Keywords().All(TeskCtl::Security::TESKACCESS_KEYWORD_CAPABILITY),
              ::testing::IsSupersetOf(expected));
}

TEST_F(KeywordTables, NumberParameterChecksAsTheInstalledHeaderDoes) {
  const std::map<std::string, long> expected = {
      {"socket_family", LinuxHost::kCheckSocketFamily},
      {"socket_type", LinuxHost::kCheckSocketType},
      {"bind_port", LinuxHost::kCheckBindPort},
      {"connect_port", LinuxHost::kCheckConnectPort},
      {"ioctl_request", LinuxHost::kCheckIoctlRequest},
      {"prctl_option", LinuxHost::kCheckPrctlOption},
      {"clone_flags", LinuxHost::kCheckCloneFlags},
      {"kill_signal", LinuxHost::kCheckKillSignal},
      {"set_uid", LinuxHost::kCheckSetUid},
      {"set_gid", LinuxHost::kCheckSetGid},
  };
  EXPECT_EQ(state.Keywords().All(TeskCtl::Security::TESKACCESS_KEYWORD_PARAM_CHECK), expected);
}

TEST_F(KeywordTables, NumberTheKinds) {
  EXPECT_THAT(state.Keywords().All(TeskCtl::Security::TESKACCESS_KEYWORD_OBJECT_ACCESS),
              ElementsAre(Pair("execute", 2), Pair("list", 3), Pair("read", 0), Pair("remove", 4),
                          Pair("truncate", 5), Pair("write", 1)));
  EXPECT_THAT(state.Keywords().All(TeskCtl::Security::TESKACCESS_KEYWORD_DOM_TRANS),
              ElementsAre(Pair("enter", 2), Pair("exec", 0), Pair("tardisk_exec", 1)));
  EXPECT_THAT(state.Keywords().All(TeskCtl::Security::TESKACCESS_KEYWORD_FILE_CREATION),
              ElementsAre(Pair("block_device", 5), Pair("char_device", 4), Pair("directory", 1),
                          Pair("fifo", 3), Pair("regular", 0), Pair("symlink", 2)));
  EXPECT_THAT(state.Keywords().All(TeskCtl::Security::TESKACCESS_KEYWORD_UNIX_SOCK_CREATION),
              ElementsAre(Pair("dgram", 1), Pair("seqpacket", 2), Pair("stream", 0)));
}

TEST_F(KeywordTables, KnowEverySystemCallThatTheyList) {
  const auto calls = state.Keywords().All(TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL);
  EXPECT_GT(calls.size(), 300U);
  for (const auto& [word, number] : calls) {
    EXPECT_EQ(Refusal(TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL, word), "");
  }
  // One that only other architectures have is a Linux system call, too.
  EXPECT_EQ(Refusal(TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL, "_newselect"), "");
  EXPECT_TRUE(calls.contains("_newselect"));
}

TEST_F(KeywordTables, HaveSystemCallsThatAreNewerThanTheLibrary) {
  const auto calls = state.Keywords().All(TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL);
  EXPECT_THAT(calls, Contains(Pair("fchmodat2", 452)));
  EXPECT_THAT(calls, Contains(Pair("statmount", 457)));
  EXPECT_THAT(calls, Contains(Pair("listns", 470)));
}

TEST_F(KeywordTables, KnowEveryCallOfTheirSets) {
  for (const Policy::CallSet& set : Policy::CallSets()) {
    for (const std::string_view call : set.members) {
      EXPECT_EQ(Refusal(TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL, std::string(call)), "");
    }
  }
}

TEST_F(KeywordTables, HaveSetsOfSystemCalls) {
  const auto calls = state.Keywords().All(TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL);
  EXPECT_TRUE(calls.contains("@start"));
  EXPECT_EQ(Refusal(TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL, "@start"), "");
  EXPECT_EQ(Refusal(TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL, "@none"),
            "unknown system call '@none'");
}

TEST_F(KeywordTables, NameWhatTheyDoNotKnow) {
  const std::pair<TeskAccess_KeywordType, const char*> refusals[] = {
      {TeskCtl::Security::TESKACCESS_KEYWORD_LABEL, "unknown label 'x'"},
      {TeskCtl::Security::TESKACCESS_KEYWORD_CAPABILITY, "unknown capability 'x'"},
      {TeskCtl::Security::TESKACCESS_KEYWORD_PARAM_CHECK, "unknown parameter check 'x'"},
      {TeskCtl::Security::TESKACCESS_KEYWORD_OBJECT_ACCESS, "unknown object access kind 'x'"},
      {TeskCtl::Security::TESKACCESS_KEYWORD_DOM_TRANS, "unknown domain transition kind 'x'"},
      {TeskCtl::Security::TESKACCESS_KEYWORD_FILE_CREATION, "unknown file creation kind 'x'"},
      {TeskCtl::Security::TESKACCESS_KEYWORD_UNIX_SOCK_CREATION,
       "unknown unix socket creation kind 'x'"},
      {TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL, "unknown system call 'x'"},
  };
  for (const auto& [type, message] : refusals) EXPECT_EQ(Refusal(type, "x"), message);
}

TEST_F(KeywordTables, CompareWholeWords) {
  EXPECT_EQ(Refusal(TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL, std::string("read\0x", 6)),
            std::string("unknown system call 'read\0x'", 28).c_str());
  EXPECT_EQ(Refusal(TeskCtl::Security::TESKACCESS_KEYWORD_CAPABILITY, "cap_kil"),
            "unknown capability 'cap_kil'");
  EXPECT_EQ(Refusal(TeskCtl::Security::TESKACCESS_KEYWORD_CAPABILITY, "CAP_KILL"),
            "unknown capability 'CAP_KILL'");
}

TEST_F(KeywordTables, AreEight) {
  for (const int type : {0, 9, -1}) {
    const auto noTable = static_cast<TeskAccess_KeywordType>(type);
    const std::string message = "unknown keyword table " + std::to_string(type);
    EXPECT_EQ(MessageOf([&] { state.Keywords().All(noTable); }), message);
    EXPECT_EQ(MessageOf([&] { state.Keywords().Refusal(noTable, "x"); }), message);
  }
}

}  // namespace
}  // namespace LinuxHostTest
