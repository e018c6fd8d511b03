// Rules for file paths: both the path as written and as it resolves, paths too long for the
// kernel's record, every wrong set of permission letters.

#include "secpolicy/domain/file_path_access_rules.h"

#include <cerrno>

#include "domain/rule_families.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicyTest {
namespace {

constexpr std::uint32_t kAddFilePolicyBatch = 0x405f;

class FilePathAccessRules : public testing::Test {
 protected:
  FilePathAccessRules() { rules.keyword = "-r"; }

  Transcript Add(const std::string& line, unsigned int number = 7) {
    return Record([&] { rules.AddRule(number, "appDom", 42, Words(line), access); });
  }
  std::string Set() {
    return Record([&] { rules.Set(access); }).Text();
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
  SecPolicy::FilePathAccessRules rules;
};

TEST_F(FilePathAccessRules, TakesPathThatDoesNotExistAndAnyPermissions) {
  EXPECT_EQ(Add("/no/such/file nonsense").Text(), "returns\n");

  ASSERT_EQ(rules.rules.size(), 1u);
  EXPECT_EQ(rules.rules.front().line, 7u);
  EXPECT_EQ(rules.rules.front().domainId, 42u);
  EXPECT_EQ(rules.rules.front().domainName, "appDom");
  EXPECT_EQ(rules.rules.front().path, "/no/such/file");
  EXPECT_EQ(rules.rules.front().permissions, "nonsense");
}

TEST_F(FilePathAccessRules, SetsRuleWithoutPermissionsWithEmptyMask) {
  EXPECT_EQ(Add("/bin/ls").Text(), "returns\n");
  EXPECT_EQ(rules.rules.front().permissions, "");
  EXPECT_EQ(Set(), Lines({R"(RealPath("/bin/ls"))",
                          R"(Call(0x405f, 0, 42, [{"/bin/ls", 0}, {"/bin/ls", 0}], 2, &out))",
                          "returns"}));
}

// The duplicate is meant: the kernel is told the written path and the real one, equal or not.
TEST_F(FilePathAccessRules, SetsCanonicalPathTwice) {
  Add("/bin/ls rx");
  EXPECT_EQ(Set(), Lines({R"(RealPath("/bin/ls"))",
                          R"(Call(0x405f, 0, 42, [{"/bin/ls", 17}, {"/bin/ls", 17}], 2, &out))",
                          "returns"}));
}

TEST_F(FilePathAccessRules, SetsLinkAsWrittenAndResolvedInOneBatch) {
  host.realPaths["/bin/link"] = "/usr/bin/tool";
  Add("/bin/link rw");
  EXPECT_EQ(Set(),
            Lines({R"(RealPath("/bin/link"))",
                   R"(Call(0x405f, 0, 42, [{"/bin/link", 3}, {"/usr/bin/tool", 3}], 2, &out))",
                   "returns"}));
}

TEST_F(FilePathAccessRules, SetsUnresolvablePathOnceAfterInformation) {
  host.FailErrno("RealPath", "/no/such/file", ENOENT);
  Add("/no/such/file w");
  EXPECT_EQ(Set(), Lines({R"(RealPath("/no/such/file"))",
                          R"(syslog(LOG_INFO, "%s", "Getting realpath failed: /no/such/file"))",
                          R"(Call(0x405f, 0, 42, [{"/no/such/file", 2}], 1, &out))", "returns"}));
  EXPECT_EQ(host.StandardError(), "");
  EXPECT_EQ(host.StandardOutput(), "");
}

TEST_F(FilePathAccessRules, TakesPathWithPercentSignsAsItIs) {
  Add("/tmp/%s%n r");
  EXPECT_EQ(Set(), Lines({R"(RealPath("/tmp/%s%n"))",
                          R"(Call(0x405f, 0, 42, [{"/tmp/%s%n", 1}, {"/tmp/%s%n", 1}], 2, &out))",
                          "returns"}));
}

TEST_F(FilePathAccessRules, SetsEachRuleInBatchOfItsOwn) {
  host.FailErrno("RealPath", "/second", ENOENT);
  Add("/first r", 1);
  Add("/second w", 2);
  Add("/third x", 3);
  EXPECT_EQ(
      Set(),
      Lines({R"(RealPath("/first"))",
             R"(Call(0x405f, 0, 42, [{"/first", 1}, {"/first", 1}], 2, &out))",
             R"(RealPath("/second"))",
             R"(syslog(LOG_INFO, "%s", "Getting realpath failed: /second"))",
             R"(Call(0x405f, 0, 42, [{"/second", 2}], 1, &out))", R"(RealPath("/third"))",
             R"(Call(0x405f, 0, 42, [{"/third", 16}, {"/third", 16}], 2, &out))", "returns"}));
}

TEST_F(FilePathAccessRules, HandsKernelResultWordThatIsZero) {
  std::vector<unsigned int> results;
  host.OnKernelCall(kAddFilePolicyBatch, [&](std::span<const std::uint64_t> args) {
    auto* result = reinterpret_cast<unsigned int*>(static_cast<std::uintptr_t>(args[4]));
    results.push_back(*result);
    *result = 99;
    return Zorvan::Kernel::CallResult{0, 0};
  });
  Add("/first r", 1);
  Add("/second r", 2);

  EXPECT_EQ(Record([&] { rules.Set(access); }).exceptionType, "");
  EXPECT_EQ(results, (std::vector<unsigned int>{0, 0}));
}

TEST_F(FilePathAccessRules, CutsPathOf2000CharactersTo1983) {
  const std::string path = "/" + std::string(1999, 'a');
  const std::string cut = "/" + std::string(1982, 'a');
  Add(path + " r");

  EXPECT_EQ(Set(),
            Lines({"RealPath(\"" + cut + "\")",
                   "Call(0x405f, 0, 42, [{\"" + cut + "\", 1}, {\"" + cut + "\", 1}], 2, &out)",
                   "returns"}));
}

TEST_F(FilePathAccessRules, SendsPathOf1983CharactersWhole) {
  const std::string path = "/" + std::string(1982, 'b');
  Add(path + " r");

  EXPECT_EQ(Set(),
            Lines({"RealPath(\"" + path + "\")",
                   "Call(0x405f, 0, 42, [{\"" + path + "\", 1}, {\"" + path + "\", 1}], 2, &out)",
                   "returns"}));
}

TEST_F(FilePathAccessRules, QuotesLongUnresolvablePathWhole) {
  const std::string path = "/" + std::string(1999, 'a');
  const std::string cut = "/" + std::string(1982, 'a');
  host.FailErrno("RealPath", cut, ENOENT);
  Add(path + " r");

  EXPECT_EQ(Set(), Lines({"RealPath(\"" + cut + "\")",
                          "syslog(LOG_INFO, \"%s\", \"Getting realpath failed: " + path + "\")",
                          "Call(0x405f, 0, 42, [{\"" + cut + "\", 1}], 1, &out)", "returns"}));
}

TEST_F(FilePathAccessRules, PrintsLongPathWhole) {
  const std::string path = "/" + std::string(1999, 'a');
  Add(path + " r");
  EXPECT_EQ(
      Record([&] { rules.PrintRules(); }).Text(),
      Lines({"stdout \"-r " + path + " r\\n\"", R"(stdout "\n")", R"(stdout "\n")", "returns"}));
}

// ---- Refusals.

TEST_F(FilePathAccessRules, NamesLineOfBatchThatKernelRefuses) {
  host.FailKernelCall(kAddFilePolicyBatch, 1, -EPERM);
  Add("/bin/ls r", 12);
  Add("/bin/cp r", 13);

  EXPECT_EQ(Set(),
            Lines({R"(RealPath("/bin/ls"))",
                   R"(Call(0x405f, 0, 42, [{"/bin/ls", 1}, {"/bin/ls", 1}], 2, &out))",
                   "throws SecPolicy::LineFailure: Error in setting policy for domain: appDom: "
                   "12 : Failed to add file policies to domain :42: world ID :0:Operation not "
                   "permitted"}));
}

TEST_F(FilePathAccessRules, KeepsRulesBeforeRefusedBatch) {
  unsigned int calls = 0;
  host.OnKernelCall(kAddFilePolicyBatch, [&](auto) {
    ++calls;
    return calls == 2 ? Zorvan::Kernel::CallResult{7, -ENOSPC} : Zorvan::Kernel::CallResult{0, 0};
  });
  Add("/first r", 1);
  Add("/second r", 2);
  Add("/third r", 3);

  EXPECT_EQ(Set(),
            Lines({R"(RealPath("/first"))",
                   R"(Call(0x405f, 0, 42, [{"/first", 1}, {"/first", 1}], 2, &out))",
                   R"(RealPath("/second"))",
                   R"(Call(0x405f, 0, 42, [{"/second", 1}, {"/second", 1}], 2, &out))",
                   "throws SecPolicy::LineFailure: Error in setting policy for domain: appDom: "
                   "2 : Failed to add file policies to domain :42: world ID :0:No space left on "
                   "device"}));
}

TEST_F(FilePathAccessRules, PassesOnForeignExceptionOfKernelCall) {
  host.OnKernelCall(kAddFilePolicyBatch,
                    [](auto) -> Zorvan::Kernel::CallResult { throw ForeignException("foreign"); });
  Add("/bin/ls r");

  EXPECT_EQ(Set(), Lines({R"(RealPath("/bin/ls"))",
                          R"(Call(0x405f, 0, 42, [{"/bin/ls", 1}, {"/bin/ls", 1}], 2, &out))",
                          "throws SecPolicyTest::ForeignException: foreign"}));
}

TEST_F(FilePathAccessRules, DoesNotWrapExceptionOfInformation) {
  host.syslogRunning = false;
  host.Fail("WriteToKlog", "log full");
  host.FailErrno("RealPath", "/gone", ENOENT);
  Add("/gone r");
  Add("/bin/ls r", 8);

  EXPECT_EQ(Set(), Lines({R"(RealPath("/gone"))",
                          R"(WriteToKlog("Getting realpath failed: /gone", "[INFO]"))",
                          "throws Braxo::Lib::BraxoException: log full"}));
}

TEST_F(FilePathAccessRules, WritesInformationToKernelLogWithoutSyslog) {
  host.syslogRunning = false;
  host.FailErrno("RealPath", "/gone", ENOENT);
  Add("/gone r");

  EXPECT_EQ(Set(), Lines({R"(RealPath("/gone"))",
                          R"(WriteToKlog("Getting realpath failed: /gone", "[INFO]"))",
                          R"(Call(0x405f, 0, 42, [{"/gone", 1}], 1, &out))", "returns"}));
}

// ---- Permissions.

struct Mask {
  const char* permissions;
  unsigned int mask;
};

TEST_F(FilePathAccessRules, TurnsPermissionsIntoMask) {
  for (const Mask& row : {Mask{"", 0x0},
                          {"r", 0x1},
                          {"w", 0x2},
                          {"x", 0x10},
                          {"rw", 0x3},
                          {"wr", 0x3},
                          {"rx", 0x11},
                          {"xr", 0x11},
                          {"wx", 0x12},
                          {"xw", 0x12},
                          {"rwx", 0x13},
                          {"wxr", 0x13},
                          {"xwr", 0x13}}) {
    EXPECT_EQ(rules.GetPermission(row.permissions), row.mask) << row.permissions;
  }
}

struct BadPermissions {
  const char* permissions;
  const char* message;
};
void PrintTo(const BadPermissions& row, std::ostream* stream) { *stream << row.permissions; }

class FilePathAccessRulesPermissions : public FilePathAccessRules,
                                       public testing::WithParamInterface<BadPermissions> {};

INSTANTIATE_TEST_SUITE_P(
    Refused, FilePathAccessRulesPermissions,
    testing::Values(BadPermissions{"rwxr", "Please enter the permissions from [rwx]."},
                    BadPermissions{"rrrr", "Please enter the permissions from [rwx]."},
                    BadPermissions{"????", "Please enter the permissions from [rwx]."},
                    BadPermissions{"rr", "Read access already specified."},
                    BadPermissions{"rwr", "Read access already specified."},
                    BadPermissions{"ww", "Write access already specified."},
                    BadPermissions{"wxw", "Write access already specified."},
                    BadPermissions{"xx", "Exec access already specified."},
                    BadPermissions{"xrx", "Exec access already specified."},
                    BadPermissions{"R", "Unknown access privilege specified."},
                    BadPermissions{"W", "Unknown access privilege specified."},
                    BadPermissions{"X", "Unknown access privilege specified."},
                    BadPermissions{"-", "Unknown access privilege specified."},
                    BadPermissions{"rwe", "Unknown access privilege specified."},
                    BadPermissions{"r?r", "Unknown access privilege specified."},
                    BadPermissions{"rr?", "Read access already specified."}));

// The line is taken, and the failure names neither the domain nor the line. Rules before it stay.
TEST_P(FilePathAccessRulesPermissions, AreRefusedOnlyWhenSet) {
  EXPECT_EQ(Add("/first rwx", 1).Text(), "returns\n");
  EXPECT_EQ(Add(std::string("/second ") + GetParam().permissions, 2).Text(), "returns\n");
  EXPECT_EQ(Add("/third rwx", 3).Text(), "returns\n");

  EXPECT_EQ(Set(), Lines({R"(RealPath("/first"))",
                          R"(Call(0x405f, 0, 42, [{"/first", 19}, {"/first", 19}], 2, &out))",
                          R"(RealPath("/second"))",
                          std::string("throws SecPolicy::LineFailure: ") + GetParam().message}));
}

// The real path comes first, so its information is written for a rule that fails afterwards.
TEST_F(FilePathAccessRules, ReportsUnresolvablePathBeforeBadPermissions) {
  host.FailErrno("RealPath", "/gone", ENOENT);
  Add("/gone R");
  EXPECT_EQ(Set(), Lines({R"(RealPath("/gone"))",
                          R"(syslog(LOG_INFO, "%s", "Getting realpath failed: /gone"))",
                          "throws SecPolicy::LineFailure: Unknown access privilege "
                          "specified."}));
}

}  // namespace
}  // namespace SecPolicyTest
