// What a display shows of domains, slot by slot, and what it leaves out or ends at when the host
// fails.

#include <climits>

#include "secpolicy/secpolicy.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

std::vector<std::string> operator+(std::vector<std::string> left,
                                   const std::vector<std::string>& right) {
  left.insert(left.end(), right.begin(), right.end());
  return left;
}

std::string Joined(const std::vector<std::string>& lines) {
  std::string text;
  for (const std::string& line : lines) text += line + "\n";
  return text;
}

// The trace of a header between two rules of `width` dashes.
std::vector<std::string> Header(std::size_t width, const std::vector<std::string>& titles) {
  const std::string rule = "stdout \"" + std::string(width, '-') + "\\n\"";
  std::vector<std::string> lines = {R"(stdout "\n")", R"(stdout "\n")", rule};
  for (const std::string& title : titles) lines.push_back("stdout \"" + title + "\\n\"");
  lines.push_back(rule);
  return lines;
}

std::vector<std::string> Title() { return Header(24, {"Policy set in the kernel"}); }

std::vector<std::string> Reading(const std::string& id) {
  return {"GetObjectAccessRules(" + id + ")",    "GetCapabilityRules(" + id + ")",
          "GetDomTransRules(" + id + ")",        "GetFileCreationRules(" + id + ")",
          "GetCapabilityParamRules(" + id + ")", "GetFilePathAccessRules(" + id + ")",
          "GetSyscallRules(" + id + ")",         "GetUnixSockCreationRules(" + id + ")"};
}

// A domain as DeclareDomain makes it, without rules.
std::vector<std::string> Slot(unsigned int id, const std::string& name, std::size_t width) {
  const std::string number = std::to_string(id);
  return std::vector<std::string>{"GetCompleteDomainInfo(" + number + ")"} +
         Header(width,
                {"Domain Name: " + name + " Domain ID :" + number + " Enforcement Level: enforcing",
                 "State: 0 RefCount: 0 WorldRefCount: 0 defaultDom: 0"}) +
         Reading(number) + std::vector<std::string>{R"(stdout "\n")"};
}

std::vector<std::string> HostDom() { return Slot(0, "hostDom", 62); }
std::vector<std::string> EmptySlot(const std::string& id) {
  return {"GetCompleteDomainInfo(" + id + ")"};
}

const std::vector<std::string> kReturns = {"returns"};

// ---- One domain.

class DisplayDomainPolicy : public testing::Test {
 protected:
  std::string Display(unsigned int id) {
    return Record([&] { SecPolicy::DisplayDomainPolicy(access, id); }).Text();
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
};

TEST_F(DisplayDomainPolicy, PrintsHeaderAndNothingElseOfDomainWithoutRules) {
  host.domains[3] = {.name = "sys",
                     .level = "enforcing",
                     .state = 5,
                     .refCount = 6,
                     .worldRefCount = 7,
                     .dflt = TeskCtl::Security::TESKACCESS_DEFAULT_DOM_CHECK_ACCESS};
  EXPECT_EQ(Display(3),
            Joined(std::vector<std::string>{"GetCompleteDomainInfo(3)"} +
                   Header(58, {"Domain Name: sys Domain ID :3 Enforcement Level: enforcing",
                               "State: 5 RefCount: 6 WorldRefCount: 7 defaultDom: 3"}) +
                   Reading("3") + std::vector<std::string>{R"(stdout "\n")", "returns"}));
}

TEST_F(DisplayDomainPolicy, PrintsCountsUnsignedAndDefaultSigned) {
  host.domains[3] = {.name = "sys",
                     .level = "enforcing",
                     .state = 4294967295,
                     .refCount = 4294967294,
                     .worldRefCount = 4294967293,
                     .dflt = static_cast<TeskAccessKsi_DefaultDom>(-1)};
  EXPECT_EQ(Display(3),
            Joined(std::vector<std::string>{"GetCompleteDomainInfo(3)"} +
                   Header(79, {"Domain Name: sys Domain ID :3 Enforcement Level: enforcing",
                               "State: 4294967295 RefCount: 4294967294 WorldRefCount: 4294967293 "
                               "defaultDom: -1"}) +
                   Reading("3") + std::vector<std::string>{R"(stdout "\n")", "returns"}));
}

TEST_F(DisplayDomainPolicy, PrintsRulesAsPolicyLines) {
  host.domains[3].name = "sys";
  InstalledRules& rules = host.rules[3];
  rules.unixSockCreation = {{9, 3, "sys", "sockLabel", "stream", true}};
  rules.syscall = {{1, 3, "sys", "read", true}, {2, 3, "sys", "write", false}};
  rules.filePathAccess = {{0, 3, "sys", "/bin/ls", "rx"}, {0, 3, "sys", "/tmp", ""}};
  rules.capabilityParam = {{0, 3, "sys", "bind_port", "80", "443", true},
                           {0, 3, "sys", "set_uid", "0", "", false}};
  rules.fileCreation = {{0, 3, "sys", "dirLabel", "fileLabel", "regular", true}};
  rules.domTrans = {{0, 3, "sys", "toolLabel", "targetDom", 12, "exec", true}};
  rules.capability = {{0, 3, "sys", "cap_kill", false}};
  rules.objectAccess = {{0, 3, "sys", "toolLabel", "execute", true}};

  SecPolicy::DisplayDomainPolicy(access, 3);
  EXPECT_EQ(host.StandardOutput(),
            "\n"
            "\n"
            "----------------------------------------------------------\n"
            "Domain Name: sys Domain ID :3 Enforcement Level: enforcing\n"
            "State: 0 RefCount: 0 WorldRefCount: 0 defaultDom: 0\n"
            "----------------------------------------------------------\n"
            "-a toolLabel execute grant\n"
            "\n"
            "\n"
            "-c cap_kill revoke\n"
            "\n"
            "\n"
            "-d toolLabel targetDom exec grant\n"
            "\n"
            "\n"
            "-f dirLabel fileLabel regular grant\n"
            "\n"
            "\n"
            "-p bind_port 80 443 grant\n"
            "-p set_uid 0 revoke\n"
            "\n"
            "\n"
            "-r /bin/ls rx\n"
            "-r /tmp \n"
            "\n"
            "\n"
            "-s read grant\n"
            "-s write revoke\n"
            "\n"
            "\n"
            "-u sockLabel stream grant\n"
            "\n"
            "\n"
            "\n");
  EXPECT_EQ(host.StandardError(), "");
}

TEST_F(DisplayDomainPolicy, PrintsNothingForEmptySlot) {
  EXPECT_EQ(Display(3), Joined(EmptySlot("3") + kReturns));
}

TEST_F(DisplayDomainPolicy, ReportsDomainThatCannotBeRead) {
  host.domains[3].name = "sys";
  host.Fail("GetCompleteDomainInfo", Nth(1), "slot unreadable");
  host.FailWith("GetCompleteDomainInfo", Nth(2), DerivedBraxoException("slot locked"));

  EXPECT_EQ(
      Display(3),
      Lines({"GetCompleteDomainInfo(3)",
             R"(stderr "Error: Failed to get policy for domain :slot unreadable\n")",
             R"(syslog(LOG_ERR, "Error: %s", "Failed to get policy for domain :slot unreadable"))",
             "returns"}));
  EXPECT_EQ(
      Display(3),
      Lines({"GetCompleteDomainInfo(3)",
             R"(stderr "Error: Failed to get policy for domain :slot locked\n")",
             R"(syslog(LOG_ERR, "Error: %s", "Failed to get policy for domain :slot locked"))",
             "returns"}));
}

// Between the words, the name and the failure stands nothing.
TEST_F(DisplayDomainPolicy, ReportsNameThatWasReadBeforeTheFailure) {
  host.domains[3] = {.name = "sys", .namedBeforeFailure = true};
  host.Fail("GetCompleteDomainInfo", "slot unreadable");

  EXPECT_EQ(
      Display(3),
      Lines(
          {"GetCompleteDomainInfo(3)",
           R"(stderr "Error: Failed to get policy for domain :sysslot unreadable\n")",
           R"(syslog(LOG_ERR, "Error: %s", "Failed to get policy for domain :sysslot unreadable"))",
           "returns"}));
}

TEST_F(DisplayDomainPolicy, PassesOnForeignExceptionOfDomain) {
  host.FailForeign("GetCompleteDomainInfo");
  EXPECT_EQ(Display(3),
            Lines({"GetCompleteDomainInfo(3)", "throws SecPolicyTest::ForeignException: foreign"}));
}

TEST_F(DisplayDomainPolicy, PassesOnExceptionOfReport) {
  host.syslogRunning = false;
  host.Fail("GetCompleteDomainInfo", "slot unreadable");
  host.Fail("WriteToKlog", "log full");
  EXPECT_EQ(Display(3),
            Lines({"GetCompleteDomainInfo(3)",
                   R"(stderr "Error: Failed to get policy for domain :slot unreadable\n")",
                   R"(WriteToKlog("Failed to get policy for domain :slot unreadable", "[ERR]"))",
                   "throws Braxo::Lib::BraxoException: log full"}));
}

TEST_F(DisplayDomainPolicy, PrintsWhatCanBeReadOfRules) {
  host.Fail("GetDomTransRules", "table unreadable");
  host.rules[0].syscall = {{0, 0, "hostDom", "read", true}};

  EXPECT_EQ(
      Display(0),
      Joined(std::vector<std::string>{"GetCompleteDomainInfo(0)"} +
             Header(62, {"Domain Name: hostDom Domain ID :0 Enforcement Level: enforcing",
                         "State: 0 RefCount: 0 WorldRefCount: 0 defaultDom: 0"}) +
             std::vector<std::string>{
                 "GetObjectAccessRules(0)", "GetCapabilityRules(0)", "GetDomTransRules(0)",
                 R"(stderr "Error: table unreadable\n")",
                 R"(syslog(LOG_ERR, "Error: %s", "table unreadable"))", "GetFileCreationRules(0)",
                 "GetCapabilityParamRules(0)", "GetFilePathAccessRules(0)", "GetSyscallRules(0)",
                 "GetUnixSockCreationRules(0)", R"(stdout "-s read grant\n")", R"(stdout "\n")",
                 R"(stdout "\n")", R"(stdout "\n")", "returns"}));
}

TEST_F(DisplayDomainPolicy, PassesOnForeignExceptionOfRules) {
  host.FailForeign("GetCapabilityRules");
  EXPECT_EQ(Display(0),
            Joined(std::vector<std::string>{"GetCompleteDomainInfo(0)"} +
                   Header(62, {"Domain Name: hostDom Domain ID :0 Enforcement Level: enforcing",
                               "State: 0 RefCount: 0 WorldRefCount: 0 defaultDom: 0"}) +
                   std::vector<std::string>{"GetObjectAccessRules(0)", "GetCapabilityRules(0)",
                                            "throws SecPolicyTest::ForeignException: foreign"}));
}

// ---- All domains, or one.

class DisplayPolicyDomains : public testing::Test {
 protected:
  std::string Display(const std::string& domain) {
    return Record([&] { SecPolicy::DisplayPolicyDomains(access, domain); }).Text();
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
};

TEST_F(DisplayPolicyDomains, WalksAllSlots) {
  host.domains[2].name = "x";
  EXPECT_EQ(Display(""), Joined(Title() + std::vector<std::string>{"GetMaxDomains()"} + HostDom() +
                                EmptySlot("1") + Slot(2, "x", 56) + kReturns));
}

TEST_F(DisplayPolicyDomains, PrintsHeaderOnlyWithoutSlots) {
  host.maxDomains = 0;
  EXPECT_EQ(Display(""), Joined(Title() + std::vector<std::string>{"GetMaxDomains()"} + kReturns));
}

TEST_F(DisplayPolicyDomains, ShowsOnlyTheSlotThatIsAskedFor) {
  host.domains[7].name = "x";
  EXPECT_EQ(Display("7"), Joined(Title() + Slot(7, "x", 56) + kReturns));
}

TEST_F(DisplayPolicyDomains, ShowsSlotZeroForTextThatIsNoNumber) {
  for (const char* domain : {"x", "hostDom", "-", "0", "0x10", " ", "+", "- 1"}) {
    EXPECT_EQ(Display(domain), Joined(Title() + HostDom() + kReturns)) << domain;
  }
}

TEST_F(DisplayPolicyDomains, PrintsHeaderOnlyForEmptySlot) {
  EXPECT_EQ(Display("7"), Joined(Title() + EmptySlot("7") + kReturns));
  EXPECT_EQ(host.StandardOutput(),
            "\n"
            "\n"
            "------------------------\n"
            "Policy set in the kernel\n"
            "------------------------\n");
}

struct SlotText {
  const char* text;
  const char* slot;
};

// What the C library makes of the text, narrowed to the kernel's 32 bits.
TEST_F(DisplayPolicyDomains, ConvertsAndNarrowsTheNumber) {
  static_assert(sizeof(long) == 8);
  for (const SlotText& row :
       {SlotText{"12abc", "12"}, SlotText{" 12", "12"}, SlotText{"+12", "12"},
        SlotText{"010", "10"}, SlotText{"-1", "4294967295"}, SlotText{"4294967295", "4294967295"},
        SlotText{"4294967301", "5"}, SlotText{"99999999999999999999", "4294967295"}}) {
    EXPECT_EQ(Display(row.text), Joined(Title() + EmptySlot(row.slot) + kReturns)) << row.text;
  }
}

TEST_F(DisplayPolicyDomains, PassesOnExceptionsOfOneDomain) {
  host.syslogRunning = false;
  host.Fail("GetCompleteDomainInfo", Nth(1), "slot unreadable");
  host.FailForeign("GetCompleteDomainInfo", Nth(2));
  host.FailWith("WriteToKlog", Every(), DerivedBraxoException("log full"));

  EXPECT_EQ(
      Display("7"),
      Joined(Title() +
             std::vector<std::string>{
                 "GetCompleteDomainInfo(7)",
                 R"(stderr "Error: Failed to get policy for domain :slot unreadable\n")",
                 R"(WriteToKlog("Failed to get policy for domain :slot unreadable", "[ERR]"))",
                 "throws SecPolicyTest::DerivedBraxoException: log full"}));
  EXPECT_EQ(Display("7"),
            Joined(Title() + EmptySlot("7") +
                   std::vector<std::string>{"throws SecPolicyTest::ForeignException: foreign"}));
}

TEST_F(DisplayPolicyDomains, PassesOnFailureToCountSlots) {
  host.FailWith("GetMaxDomains", Nth(1), DerivedBraxoException("no table"));
  host.FailForeign("GetMaxDomains", Nth(2));
  EXPECT_EQ(Display(""),
            Joined(Title() + std::vector<std::string>{
                                 "GetMaxDomains()",
                                 "throws SecPolicyTest::DerivedBraxoException: no table"}));
  EXPECT_EQ(Display(""), Joined(Title() + std::vector<std::string>{
                                              "GetMaxDomains()",
                                              "throws SecPolicyTest::ForeignException: foreign"}));
}

// Reported is not failed: the display of such a slot ends normally.
TEST_F(DisplayPolicyDomains, DoesNotCountSlotThatCouldBeReported) {
  host.domains[1].name = "x";
  host.Fail("GetCompleteDomainInfo", With("0"), "slot unreadable");

  EXPECT_EQ(
      Display(""),
      Joined(
          Title() +
          std::vector<std::string>{
              "GetMaxDomains()", "GetCompleteDomainInfo(0)",
              R"(stderr "Error: Failed to get policy for domain :slot unreadable\n")",
              R"(syslog(LOG_ERR, "Error: %s", "Failed to get policy for domain :slot unreadable"))"} +
          Slot(1, "x", 56) + kReturns));
}

TEST_F(DisplayPolicyDomains, ShowsOtherSlotsWhenOneFails) {
  host.domains[1].name = "x";
  host.syslogRunning = false;
  host.Fail("GetCompleteDomainInfo", With("0"), "slot unreadable");
  host.FailWith("WriteToKlog", Every(), DerivedBraxoException("log full"));

  EXPECT_EQ(
      Display(""),
      Joined(Title() +
             std::vector<std::string>{
                 "GetMaxDomains()", "GetCompleteDomainInfo(0)",
                 R"(stderr "Error: Failed to get policy for domain :slot unreadable\n")",
                 R"(WriteToKlog("Failed to get policy for domain :slot unreadable", "[ERR]"))"} +
             Slot(1, "x", 56) +
             std::vector<std::string>{"throws Braxo::Lib::BraxoException: Error in displaying the "
                                      "policy for some domains"}));
}

TEST_F(DisplayPolicyDomains, PassesOnForeignExceptionOfSlot) {
  host.domains[1].name = "x";
  host.FailForeign("GetCompleteDomainInfo", With("0"));
  EXPECT_EQ(Display(""), Joined(Title() + std::vector<std::string>{
                                              "GetMaxDomains()", "GetCompleteDomainInfo(0)",
                                              "throws SecPolicyTest::ForeignException: foreign"}));
}

}  // namespace
}  // namespace SecPolicyTest
