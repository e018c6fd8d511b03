// The four phases of loading a directory of domains: their order, what one bad file keeps from
// being installed, and what it does not.

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>

#include "secpolicy/secpolicy.h"
#include "support/fixed_roots.h"
#include "support/policy_tree.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

constexpr char kNamesDone[] = R"(syslog(LOG_INFO, "%s", "Parsed all domain names"))";
constexpr char kParseDone[] =
    R"(syslog(LOG_INFO, "%s", "Domain policies parsed and syntax validated"))";
constexpr char kCheckDone[] =
    R"(syslog(LOG_INFO, "%s", "Constraints check for domain policies succeeded"))";
constexpr char kSetDone[] = R"(syslog(LOG_INFO, "%s", "Domain policies set"))";

class LoadPolicyDomains : public testing::Test {
 protected:
  std::string Load() { return Load(tree.Root()); }
  std::string Load(const std::string& dir) {
    return Record([&] { SecPolicy::LoadPolicyDomains(dir, access); }).Text();
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
  PolicyTree tree;
};

TEST_F(LoadPolicyDomains, ReportsFourPhasesOfEmptyDirectory) {
  EXPECT_EQ(Load(), Lines({kNamesDone, kParseDone, kCheckDone, kSetDone, "returns"}));
}

// Every phase takes all domains, in byte order of the path, before the next phase begins.
TEST_F(LoadPolicyDomains, RunsEachPhaseOverAllDomainsInOrder) {
  tree.Write("b", "-s read grant\n");
  tree.Write("a", "-c cap_kill grant\n-s write revoke\n");
  tree.Write("Z", "-r /bin/ls rx\n");

  EXPECT_EQ(
      Load(),
      Lines(
          {R"(FindDomain("Z"))",
           R"(CreateDomain("Z", 0))",
           R"(FindDomain("a"))",
           R"(CreateDomain("a", 0))",
           R"(FindDomain("b"))",
           R"(CreateDomain("b", 0))",
           kNamesDone,
           R"(ValidateKeyword(CAPABILITY, "cap_kill"))",
           R"(ValidateKeyword(SYSCALL, "write"))",
           R"(ValidateKeyword(SYSCALL, "read"))",
           kParseDone,
           R"(CheckCapabilityParamRuleConstraints("Z", []))",
           R"(CheckCapabilityParamRuleConstraints("a", []))",
           R"(CheckCapabilityParamRuleConstraints("b", []))",
           kCheckDone,
           R"(RealPath("/bin/ls"))",
           R"(Call(0x405f, 0, 1, [{"/bin/ls", 17}, {"/bin/ls", 17}], 2, &out))",
           R"(SetCapabilityRule({line: 1, domainId: 2, domainName: "a", capability: "cap_kill", grant: true}))",
           R"(SetSyscallRule({line: 2, domainId: 2, domainName: "a", syscall: "write", grant: false}))",
           R"(SetSyscallRule({line: 1, domainId: 3, domainName: "b", syscall: "read", grant: true}))",
           kSetDone,
           "returns"}));
}

TEST_F(LoadPolicyDomains, ReusesDomainThatExists) {
  tree.Write("known", "-s read grant\n");
  for (int count = 0; count < 4; ++count) host.DeclareDomain("other" + std::to_string(count));
  const unsigned int id = host.DeclareDomain("known");
  ASSERT_EQ(id, 5u);

  EXPECT_EQ(
      Load(),
      Lines(
          {R"(FindDomain("known"))", kNamesDone, R"(ValidateKeyword(SYSCALL, "read"))", kParseDone,
           R"(CheckCapabilityParamRuleConstraints("known", []))", kCheckDone,
           R"(SetSyscallRule({line: 1, domainId: 5, domainName: "known", syscall: "read", grant: true}))",
           kSetDone, "returns"}));
}

TEST_F(LoadPolicyDomains, FindsDomainsOfOtherFilesAsTransitionTargets) {
  tree.Write("a", "-d toolLabel z exec grant\n");
  tree.Write("z", "");

  EXPECT_EQ(
      Load(),
      Lines(
          {R"(FindDomain("a"))", R"(CreateDomain("a", 0))", R"(FindDomain("z"))",
           R"(CreateDomain("z", 0))", kNamesDone, R"(FindDomain("z"))",
           R"(ValidateKeyword(LABEL, "toolLabel"))", R"(ValidateKeyword(DOM_TRANS, "exec"))",
           kParseDone, R"(CheckCapabilityParamRuleConstraints("a", []))",
           R"(CheckCapabilityParamRuleConstraints("z", []))", kCheckDone,
           R"(SetDomTransRule({line: 1, domainId: 1, domainName: "a", label: "toolLabel", targetDomain: "z", targetDomainId: 2, transitionKind: "exec", grant: true}))",
           kSetDone, "returns"}));
}

TEST_F(LoadPolicyDomains, TakesFilesOnly) {
  tree.Write("plugins/", "");
  tree.Write("plugins/ioFilter", "-s read grant\n");
  EXPECT_EQ(Load(), Lines({kNamesDone, kParseDone, kCheckDone, kSetDone, "returns"}));
}

TEST_F(LoadPolicyDomains, PassesOnUnreadableDirectory) {
  EXPECT_EQ(Load(tree / "missing"),
            "throws Braxo::Lib::BraxoException: Unable to open policy directory " +
                (tree / "missing") + "\n");
}

// ---- Names.

TEST_F(LoadPolicyDomains, StopsWithoutMessageWhenDomainCannotBeCreated) {
  tree.Write("a", "-s read grant\n");
  tree.Write("b", "-s read grant\n");
  tree.Write("c", "-s read grant\n");
  host.Fail("CreateDomain", Nth(2), "table full");

  EXPECT_EQ(Load(),
            Lines({R"(FindDomain("a"))", R"(CreateDomain("a", 0))", R"(FindDomain("b"))",
                   R"(CreateDomain("b", 0))", "throws Braxo::Lib::BraxoException: table full"}));
  EXPECT_EQ(host.domains.at(1).name, "a");
}

TEST_F(LoadPolicyDomains, KeepsTypeOfExceptionOfNames) {
  tree.Write("a", "");
  tree.Write("b", "");
  host.FailWith("CreateDomain", Nth(2), DerivedBraxoException("table full"));
  host.FailForeign("CreateDomain", Nth(3));
  host.FailWith("FindDomain", Nth(4), DerivedBraxoException("table unreadable"));
  host.FailForeign("FindDomain", Nth(6));

  EXPECT_EQ(Load(), Lines({R"(FindDomain("a"))", R"(CreateDomain("a", 0))", R"(FindDomain("b"))",
                           R"(CreateDomain("b", 0))",
                           "throws SecPolicyTest::DerivedBraxoException: table full"}));
  EXPECT_EQ(Load(), Lines({R"(FindDomain("a"))", R"(FindDomain("b"))",
                           "throws SecPolicyTest::DerivedBraxoException: table unreadable"}));
  EXPECT_EQ(Load(), Lines({R"(FindDomain("a"))", R"(FindDomain("b"))",
                           "throws SecPolicyTest::ForeignException: foreign"}));
  host.DeclareDomain("b");
  EXPECT_EQ(Load(), Lines({R"(FindDomain("a"))", R"(FindDomain("b"))", kNamesDone, kParseDone,
                           R"(CheckCapabilityParamRuleConstraints("a", []))",
                           R"(CheckCapabilityParamRuleConstraints("b", []))", kCheckDone, kSetDone,
                           "returns"}));
}

// ---- Parse.

TEST_F(LoadPolicyDomains, InstallsWhatPrecedesBadLineAndOtherDomains) {
  tree.Write("a", "-s one grant\n-x two\n-s three grant\n");
  tree.Write("b", "-s read grant\n");

  EXPECT_EQ(
      Load(),
      Lines(
          {R"(FindDomain("a"))", R"(CreateDomain("a", 0))", R"(FindDomain("b"))",
           R"(CreateDomain("b", 0))", kNamesDone, R"(ValidateKeyword(SYSCALL, "one"))",
           R"~(stderr "Error: Error in parsing policy for domain: a: 2 : invalid policy rule type (-x)\n")~",
           R"~(syslog(LOG_ERR, "Error: %s", "Error in parsing policy for domain: a: 2 : invalid policy rule type (-x)"))~",
           R"(ValidateKeyword(SYSCALL, "read"))",
           R"(stderr "Error: Error in parsing the policy for some domains\n")",
           R"(syslog(LOG_ERR, "Error: %s", "Error in parsing the policy for some domains"))",
           R"(CheckCapabilityParamRuleConstraints("a", []))",
           R"(CheckCapabilityParamRuleConstraints("b", []))", kCheckDone,
           R"(SetSyscallRule({line: 1, domainId: 1, domainName: "a", syscall: "one", grant: true}))",
           R"(SetSyscallRule({line: 1, domainId: 2, domainName: "b", syscall: "read", grant: true}))",
           kSetDone, "throws Braxo::Lib::BraxoException: Failure in domain policy"}));
}

// The superuser may open any file, so the test runs as somebody else.
class OrdinaryUser {
 public:
  OrdinaryUser() : active(geteuid() != 0 || seteuid(65534) == 0) {}
  OrdinaryUser(const OrdinaryUser&) = delete;
  OrdinaryUser& operator=(const OrdinaryUser&) = delete;
  ~OrdinaryUser() {
    if (seteuid(user) != 0) std::abort();
  }

  const uid_t user = geteuid();
  const bool active;
};

TEST_F(LoadPolicyDomains, ReportsFileThatCannotBeOpenedAndGoesOn) {
  tree.Write("a", "-s write grant\n");
  tree.Write("b", "-s read grant\n");
  ASSERT_EQ(chmod(tree.Root().c_str(), 0755), 0);
  ASSERT_EQ(chmod((tree / "a").c_str(), 0), 0);
  const OrdinaryUser user;
  if (!user.active) GTEST_SKIP() << "skipped: the user cannot be changed";

  EXPECT_EQ(
      Load(),
      Lines(
          {R"(FindDomain("a"))", R"(CreateDomain("a", 0))", R"(FindDomain("b"))",
           R"(CreateDomain("b", 0))", kNamesDone,
           "stderr \"Error: Unable to open policy file " + (tree / "a") + "\\n\"",
           "syslog(LOG_ERR, \"Error: %s\", \"Unable to open policy file " + (tree / "a") + "\")",
           R"(ValidateKeyword(SYSCALL, "read"))",
           R"(stderr "Error: Error in parsing the policy for some domains\n")",
           R"(syslog(LOG_ERR, "Error: %s", "Error in parsing the policy for some domains"))",
           R"(CheckCapabilityParamRuleConstraints("a", []))",
           R"(CheckCapabilityParamRuleConstraints("b", []))", kCheckDone,
           R"(SetSyscallRule({line: 1, domainId: 2, domainName: "b", syscall: "read", grant: true}))",
           kSetDone, "throws Braxo::Lib::BraxoException: Failure in domain policy"}));
}

// ---- Constraints.

TEST_F(LoadPolicyDomains, KeepsDomainWithConflictOutOfKernel) {
  tree.Write("a", "-p bind_port 80 grant\n");
  tree.Write("b", "-s read grant\n");
  host.Fail("CheckCapabilityParamRuleConstraints", Nth(1), "80 granted twice");

  EXPECT_EQ(
      Load(),
      Lines(
          {R"(FindDomain("a"))",
           R"(CreateDomain("a", 0))",
           R"(FindDomain("b"))",
           R"(CreateDomain("b", 0))",
           kNamesDone,
           R"(ValidateKeyword(PARAM_CHECK, "bind_port"))",
           R"(ValidateKeyword(SYSCALL, "read"))",
           kParseDone,
           R"(CheckCapabilityParamRuleConstraints("a", [{line: 1, domainId: 1, domainName: "a", paramCheck: "bind_port", firstParam: "80", secondParam: "", grant: true}]))",
           R"(stderr "Error: Policy constraint error for domain: a : 80 granted twice\n")",
           R"(syslog(LOG_ERR, "Error: %s", "Policy constraint error for domain: a : 80 granted twice"))",
           R"(CheckCapabilityParamRuleConstraints("b", []))",
           R"(stderr "Error: Error in policy constraints check for some domains\n")",
           R"(syslog(LOG_ERR, "Error: %s", "Error in policy constraints check for some domains"))",
           R"(stderr "Error: Skipping the policy for domain a due to errors in the policy\n")",
           R"(syslog(LOG_ERR, "Error: %s", "Skipping the policy for domain a due to errors in the policy"))",
           R"(SetSyscallRule({line: 1, domainId: 2, domainName: "b", syscall: "read", grant: true}))",
           R"(stderr "Error: Error in setting the policy for some domains\n")",
           R"(syslog(LOG_ERR, "Error: %s", "Error in setting the policy for some domains"))",
           "throws Braxo::Lib::BraxoException: Failure in domain policy"}));
}

// ---- Set.

TEST_F(LoadPolicyDomains, InstallsOtherDomainsWhenOneIsRefused) {
  tree.Write("a", "-s read grant\n-s write grant\n-u sockLabel stream grant\n");
  tree.Write("b", "-s read grant\n");
  host.Fail("SetSyscallRule", Nth(2), "no room");

  EXPECT_EQ(
      Load(),
      Lines(
          {R"(FindDomain("a"))",
           R"(CreateDomain("a", 0))",
           R"(FindDomain("b"))",
           R"(CreateDomain("b", 0))",
           kNamesDone,
           R"(ValidateKeyword(SYSCALL, "read"))",
           R"(ValidateKeyword(SYSCALL, "write"))",
           R"(ValidateKeyword(LABEL, "sockLabel"))",
           R"(ValidateKeyword(UNIX_SOCK_CREATION, "stream"))",
           R"(ValidateKeyword(SYSCALL, "read"))",
           kParseDone,
           R"(CheckCapabilityParamRuleConstraints("a", []))",
           R"(CheckCapabilityParamRuleConstraints("b", []))",
           kCheckDone,
           R"(SetSyscallRule({line: 1, domainId: 1, domainName: "a", syscall: "read", grant: true}))",
           R"(SetSyscallRule({line: 2, domainId: 1, domainName: "a", syscall: "write", grant: true}))",
           R"(stderr "Error: Error in setting policy for domain: a: 2 : no room\n")",
           R"(syslog(LOG_ERR, "Error: %s", "Error in setting policy for domain: a: 2 : no room"))",
           R"(SetSyscallRule({line: 1, domainId: 2, domainName: "b", syscall: "read", grant: true}))",
           R"(stderr "Error: Error in setting the policy for some domains\n")",
           R"(syslog(LOG_ERR, "Error: %s", "Error in setting the policy for some domains"))",
           "throws Braxo::Lib::BraxoException: Failure in domain policy"}));
}

TEST_F(LoadPolicyDomains, ReportsBadPermissionsBare) {
  tree.Write("a", "-r /bin/ls R\n");
  EXPECT_EQ(
      Record([&] { SecPolicy::LoadPolicyDomains(tree.Root(), access); }).Reports(),
      Lines({kNamesDone, kParseDone, kCheckDone,
             R"(stderr "Error: Unknown access privilege specified.\n")",
             R"(syslog(LOG_ERR, "Error: %s", "Unknown access privilege specified."))",
             R"(stderr "Error: Error in setting the policy for some domains\n")",
             R"(syslog(LOG_ERR, "Error: %s", "Error in setting the policy for some domains"))",
             "throws Braxo::Lib::BraxoException: Failure in domain policy"}));
}

TEST_F(LoadPolicyDomains, ReportsEveryPhaseThatFailed) {
  tree.Write("a", "-x\n");
  tree.Write("b", "-p bind_port 80 grant\n");
  tree.Write("c", "-s read grant\n");
  host.Fail("CheckCapabilityParamRuleConstraints", Nth(2), "conflict");
  host.Fail("SetSyscallRule", "no room");

  EXPECT_EQ(
      Record([&] { SecPolicy::LoadPolicyDomains(tree.Root(), access); }).Reports(),
      Lines(
          {kNamesDone,
           R"~(stderr "Error: Error in parsing policy for domain: a: 1 : invalid policy rule type (-x)\n")~",
           R"~(syslog(LOG_ERR, "Error: %s", "Error in parsing policy for domain: a: 1 : invalid policy rule type (-x)"))~",
           R"(stderr "Error: Error in parsing the policy for some domains\n")",
           R"(syslog(LOG_ERR, "Error: %s", "Error in parsing the policy for some domains"))",
           R"(stderr "Error: Policy constraint error for domain: b : conflict\n")",
           R"(syslog(LOG_ERR, "Error: %s", "Policy constraint error for domain: b : conflict"))",
           R"(stderr "Error: Error in policy constraints check for some domains\n")",
           R"(syslog(LOG_ERR, "Error: %s", "Error in policy constraints check for some domains"))",
           R"(stderr "Error: Skipping the policy for domain b due to errors in the policy\n")",
           R"(syslog(LOG_ERR, "Error: %s", "Skipping the policy for domain b due to errors in the policy"))",
           R"(stderr "Error: Error in setting policy for domain: c: 1 : no room\n")",
           R"(syslog(LOG_ERR, "Error: %s", "Error in setting policy for domain: c: 1 : no room"))",
           R"(stderr "Error: Error in setting the policy for some domains\n")",
           R"(syslog(LOG_ERR, "Error: %s", "Error in setting the policy for some domains"))",
           "throws Braxo::Lib::BraxoException: Failure in domain policy"}));
}

// ---- What leaves the load.

struct ForeignFailure {
  const char* call;
  std::vector<std::string> transcript;
};
void PrintTo(const ForeignFailure& row, std::ostream* stream) { *stream << row.call; }

class LoadPolicyDomainsForeign : public LoadPolicyDomains,
                                 public testing::WithParamInterface<ForeignFailure> {};

INSTANTIATE_TEST_SUITE_P(
    Phases, LoadPolicyDomainsForeign,
    testing::Values(
        ForeignFailure{
            "ValidateKeyword",
            {R"(FindDomain("a"))", R"(CreateDomain("a", 0))", R"(FindDomain("b"))",
             R"(CreateDomain("b", 0))", kNamesDone, R"(ValidateKeyword(SYSCALL, "read"))"}},
        ForeignFailure{
            "CheckCapabilityParamRuleConstraints",
            {R"(FindDomain("a"))", R"(CreateDomain("a", 0))", R"(FindDomain("b"))",
             R"(CreateDomain("b", 0))", kNamesDone, R"(ValidateKeyword(SYSCALL, "read"))",
             R"(ValidateKeyword(SYSCALL, "read"))", kParseDone,
             R"(CheckCapabilityParamRuleConstraints("a", []))"}},
        ForeignFailure{
            "SetSyscallRule",
            {R"(FindDomain("a"))", R"(CreateDomain("a", 0))", R"(FindDomain("b"))",
             R"(CreateDomain("b", 0))", kNamesDone, R"(ValidateKeyword(SYSCALL, "read"))",
             R"(ValidateKeyword(SYSCALL, "read"))", kParseDone,
             R"(CheckCapabilityParamRuleConstraints("a", []))",
             R"(CheckCapabilityParamRuleConstraints("b", []))", kCheckDone,
             R"(SetSyscallRule({line: 1, domainId: 1, domainName: "a", syscall: "read", grant: true}))"}}));

TEST_P(LoadPolicyDomainsForeign, ExceptionPassesThrough) {
  tree.Write("a", "-s read grant\n");
  tree.Write("b", "-s read grant\n");
  host.FailForeign(GetParam().call, Nth(1));

  const Transcript run = Record([&] { SecPolicy::LoadPolicyDomains(tree.Root(), access); });
  EXPECT_EQ(run.trace, GetParam().transcript);
  EXPECT_EQ(run.exceptionType, "SecPolicyTest::ForeignException");
  EXPECT_EQ(run.exceptionText, "foreign");
}

// A load without syslog, whose `failing`-th report (from 1; 0: none) throws.
Transcript LoadWithFailingReport(const std::string& dir, unsigned int failing) {
  ScriptedHost host;
  host.syslogRunning = false;
  host.Fail("CheckCapabilityParamRuleConstraints", With(R"("conflict", [])"), "conflict");
  if (failing != 0) host.FailWith("WriteToKlog", Nth(failing), DerivedBraxoException("log full"));
  TeskAccessInterfaceImpl access;
  return Record([&] { SecPolicy::LoadPolicyDomains(dir, access); });
}

// Whichever report fails, nothing is done after it.
void ExpectEndsAtEachReport(const std::string& dir, unsigned int reports) {
  const std::vector<std::string> whole = LoadWithFailingReport(dir, 0).trace;
  const auto isReport = [](const std::string& line) { return line.starts_with("WriteToKlog("); };
  ASSERT_EQ(std::count_if(whole.begin(), whole.end(), isReport), reports);

  auto end = whole.begin();
  for (unsigned int failing = 1; failing <= reports; ++failing) {
    end = std::find_if(end, whole.end(), isReport) + 1;
    const Transcript run = LoadWithFailingReport(dir, failing);
    EXPECT_EQ(run.trace, std::vector<std::string>(whole.begin(), end));
    EXPECT_EQ(run.exceptionType, "SecPolicyTest::DerivedBraxoException");
    EXPECT_EQ(run.exceptionText, "log full");
  }
}

TEST(LoadPolicyDomainsReports, EndGoodLoadWhenTheyFail) {
  const PolicyTree tree({{"good", "-s read grant\n"}});
  ExpectEndsAtEachReport(tree.Root(), 4);
}

// The names, three failures of a domain, the refusal of the one with the conflict, three summaries.
TEST(LoadPolicyDomainsReports, EndBadLoadWhenTheyFail) {
  const PolicyTree tree({{"bad", "-x\n"},
                         {"conflict", "-s read grant\n"},
                         {"good", "-s read grant\n"},
                         {"wrong", "-r /bin/ls R\n"}});
  ExpectEndsAtEachReport(tree.Root(), 8);
}

TEST_F(LoadPolicyDomains, PassesOnExceptionOfErrorReport) {
  host.syslogRunning = false;
  tree.Write("a", "-x\n");
  tree.Write("b", "-s read grant\n");
  host.Fail("WriteToKlog", Nth(2), "log full");

  EXPECT_EQ(
      Load(),
      Lines(
          {R"(FindDomain("a"))", R"(CreateDomain("a", 0))", R"(FindDomain("b"))",
           R"(CreateDomain("b", 0))", R"(WriteToKlog("Parsed all domain names", "[INFO]"))",
           R"~(stderr "Error: Error in parsing policy for domain: a: 1 : invalid policy rule type (-x)\n")~",
           R"~(WriteToKlog("Error in parsing policy for domain: a: 1 : invalid policy rule type (-x)", "[ERR]"))~",
           "throws Braxo::Lib::BraxoException: log full"}));
}

// ---- The fixed directory of partner domains.

constexpr char kPlugins[] = "/etc/zorvan/secpolicy/domains/plugins";

class FixedDomains : public FixedRootsTest {
 protected:
  ScriptedHost host;
};

TEST_F(FixedDomains, ArePrefixedInPluginsDirectory) {
  const FixedRoots roots({{"/etc/zorvan/secpolicy/domains/plugins/ioFilter", "-s read grant\n"}});
  TeskAccessInterfaceImpl access;

  EXPECT_EQ(
      Record([&] { SecPolicy::LoadPolicyDomains(kPlugins, access); }).Text(),
      Lines(
          {R"(FindDomain("plugin-ioFilter"))", R"(CreateDomain("plugin-ioFilter", 0))", kNamesDone,
           R"(ValidateKeyword(SYSCALL, "read"))", kParseDone,
           R"(CheckCapabilityParamRuleConstraints("plugin-ioFilter", []))", kCheckDone,
           R"(SetSyscallRule({line: 1, domainId: 1, domainName: "plugin-ioFilter", syscall: "read", grant: true}))",
           kSetDone, "returns"}));
}

TEST_F(FixedDomains, AreNotPrefixedInDomainsDirectory) {
  const FixedRoots roots({{"/etc/zorvan/secpolicy/domains/ioFilter", ""},
                          {"/etc/zorvan/secpolicy/domains/plugins/other", ""}});
  TeskAccessInterfaceImpl access;

  EXPECT_EQ(
      Record([&] { SecPolicy::LoadPolicyDomains("/etc/zorvan/secpolicy/domains", access); }).Text(),
      Lines({R"(FindDomain("ioFilter"))", R"(CreateDomain("ioFilter", 0))", kNamesDone, kParseDone,
             R"(CheckCapabilityParamRuleConstraints("ioFilter", []))", kCheckDone, kSetDone,
             "returns"}));
}

// The directory is compared byte for byte.
TEST_F(FixedDomains, AreNotPrefixedForOtherSpellingOfPluginsDirectory) {
  const FixedRoots roots({{"/etc/zorvan/secpolicy/domains/plugins/ioFilter", ""}});
  TeskAccessInterfaceImpl access;

  for (const std::string dir :
       {"/etc/zorvan/secpolicy/domains/plugins/", "/etc/zorvan/secpolicy//domains/plugins",
        "/etc/zorvan/secpolicy/domains/../domains/plugins"}) {
    host.domains.erase(1);
    EXPECT_EQ(Record([&] { SecPolicy::LoadPolicyDomains(dir, access); }).Text(),
              Lines({R"(FindDomain("ioFilter"))", R"(CreateDomain("ioFilter", 0))", kNamesDone,
                     kParseDone, R"(CheckCapabilityParamRuleConstraints("ioFilter", []))",
                     kCheckDone, kSetDone, "returns"}))
        << dir;
  }
}

class LoadPartnerPolicyDomains : public FixedRootsTest {
 protected:
  static std::string Load() {
    TeskAccessInterfaceImpl access;
    return Record([&] { SecPolicy::LoadPartnerPolicyDomains(access); }).Text();
  }

  ScriptedHost host;
};

TEST_F(LoadPartnerPolicyDomains, LoadsPluginsDirectory) {
  const FixedRoots roots({{"/etc/zorvan/secpolicy/domains/plugins/ioFilter", ""}});
  EXPECT_EQ(Load(), Lines({R"(File_Exists("/etc/zorvan/secpolicy/domains/plugins"))",
                           R"(File_IsDirectory("/etc/zorvan/secpolicy/domains/plugins"))",
                           R"(FindDomain("plugin-ioFilter"))",
                           R"(CreateDomain("plugin-ioFilter", 0))", kNamesDone, kParseDone,
                           R"(CheckCapabilityParamRuleConstraints("plugin-ioFilter", []))",
                           kCheckDone, kSetDone, "returns"}));
}

TEST_F(LoadPartnerPolicyDomains, DoesNothingWithoutPluginsDirectory) {
  const FixedRoots roots;
  EXPECT_EQ(Load(), Lines({R"(File_Exists("/etc/zorvan/secpolicy/domains/plugins"))", "returns"}));
}

TEST_F(LoadPartnerPolicyDomains, DoesNothingWhenPluginsIsFile) {
  const FixedRoots roots({{"/etc/zorvan/secpolicy/domains/plugins", "-s read grant\n"}});
  EXPECT_EQ(Load(),
            Lines({R"(File_Exists("/etc/zorvan/secpolicy/domains/plugins"))",
                   R"(File_IsDirectory("/etc/zorvan/secpolicy/domains/plugins"))", "returns"}));
}

TEST_F(LoadPartnerPolicyDomains, PassesOnExceptionOfLoad) {
  const FixedRoots roots({{"/etc/zorvan/secpolicy/domains/plugins/ioFilter", ""}});
  host.FailWith("FindDomain", Every(), DerivedBraxoException("table unreadable"));
  EXPECT_EQ(Load(), Lines({R"(File_Exists("/etc/zorvan/secpolicy/domains/plugins"))",
                           R"(File_IsDirectory("/etc/zorvan/secpolicy/domains/plugins"))",
                           R"(FindDomain("plugin-ioFilter"))",
                           "throws SecPolicyTest::DerivedBraxoException: table unreadable"}));
}

TEST_F(LoadPartnerPolicyDomains, PassesOnDirectoryThatWentAway) {
  const FixedRoots roots;
  host.fileKinds[kPlugins] = ScriptedHost::FileKind::kDirectory;
  EXPECT_EQ(Load(), Lines({R"(File_Exists("/etc/zorvan/secpolicy/domains/plugins"))",
                           R"(File_IsDirectory("/etc/zorvan/secpolicy/domains/plugins"))",
                           "throws Braxo::Lib::BraxoException: Unable to open policy directory "
                           "/etc/zorvan/secpolicy/domains/plugins"}));
}

}  // namespace
}  // namespace SecPolicyTest
