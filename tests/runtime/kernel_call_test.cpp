// What all operations of one kernel call share: how they fail, and what becomes of errno.

#include <gtest/gtest.h>

#include <cerrno>
#include <cstdint>
#include <functional>
#include <string>

#include "secpolicy/secpolicy.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

struct Operation {
  std::string name;
  std::uint32_t number;
  std::function<void()> invoke;
  std::string message;  // what precedes the system's text
};

// Made beforehand: an allocation inside the call would spoil errno.
const std::string kName = "toolDom";
const std::string kPath = "/vm/disk";
const std::string kNewPath = "/vm/moved";

TeskAccess_FileRule fileRules[1] = {};
unsigned int stored[2] = {};
const std::uint64_t parameters[2] = {};

const SecPolicy::TeskAccess_ModeParam* Mode() {
  return reinterpret_cast<const SecPolicy::TeskAccess_ModeParam*>(parameters);
}

std::vector<Operation> Operations() {
  return {
      {"CreateDomain", 0x4059,
       [] { SecPolicy::CreateDomain(kName, TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE); },
       "Failed to create domain:toolDom :"},
      {"DestroyDomain", 0x405a, [] { SecPolicy::DestroyDomain(7); }, "Failed to destroy domain: "},
      {"UpdateFilePolicy", 0x405b, [] { SecPolicy::UpdateFilePolicy(7, kPath, 3); },
       "Failed to update file policy: /vm/disk:"},
      {"RemoveFilePolicy", 0x405c, [] { SecPolicy::RemoveFilePolicy(-12, 7, kPath); },
       "Failed to remove file policy from domain :7 : world id :-12:"},
      {"RetrieveFilePolicies", 0x405d, [] { SecPolicy::RetrieveFilePolicies(7, fileRules, 1); },
       "Failed to retrieve policies from domain:: 7 : "},
      {"RetrieveNumberOfFilePolicies", 0x405e, [] { SecPolicy::RetrieveNumberOfFilePolicies(7); },
       "Failed to get number of file policies for domain :: 7:"},
      {"AddFilePolicyBatch", 0x405f,
       [] { SecPolicy::AddFilePolicyBatch(-12, 7, fileRules, 1, stored); },
       "Failed to add file policies to domain :7: world ID :-12:"},
      {"SetCapRule", 0x4061,
       [] { SecPolicy::SetCapRule(7, static_cast<SecPolicy::TeskAccess_Capability>(2), 1); },
       "Failed to set capability rule for domain :: 7:"},
      {"SetParamCheckRule", 0x4062,
       [] {
         SecPolicy::SetParamCheckRule(7, static_cast<SecPolicy::TeskAccess_ParamCheck>(2), Mode(),
                                      1);
       },
       "Failed to set parameter check rule for domain :: 7:"},
      {"RetrieveLeakedDomains", 0x4064,
       [] { SecPolicy::RetrieveLeakedDomains(1, &stored[0], &stored[1]); },
       "Failed to retrieve leaked domain list:"},
      {"GetDomainIDForWorld", 0x4065, [] { SecPolicy::GetDomainIDForWorld(12); },
       "Unable to get domain ID: "},
      {"GetDomainNameForID", 0x4066, [] { SecPolicy::GetDomainNameForID(7); },
       "Unable to get domain name: "},
      {"ReplaceFilePolicyVMs", 0x4067, [] { SecPolicy::ReplaceFilePolicyVMs(kPath, kNewPath); },
       "Failed to replace file policy: /vm/disk to: /vm/moved: "},
      {"RemoveParamCheckRule", 0x413e,
       [] {
         SecPolicy::RemoveParamCheckRule(7, static_cast<SecPolicy::TeskAccess_ParamCheck>(2),
                                         Mode());
       },
       "Failed to remove parameter check rule for domain :: 7:"},
  };
}

// Keeps test listings readable.
void PrintTo(const Operation& operation, std::ostream* stream) { *stream << operation.name; }

class KernelCall : public testing::TestWithParam<Operation> {
 protected:
  // Runs the operation with `error` in errno.
  Transcript Run(int error) {
    return Record([&] {
      errno = error;
      GetParam().invoke();
      errnoAfter = errno;
    });
  }
  static std::string Failure(const std::string& systemText) {
    return "throws Braxo::Lib::BraxoException: " + GetParam().message + systemText;
  }
  static std::string End(const Transcript& run) {
    const std::string text = "\n" + run.Text();
    return text.substr(text.rfind('\n', text.size() - 2) + 1);
  }

  ScriptedHost host;
  int errnoAfter = -1;
};

TEST_P(KernelCall, IsMadeOnceUnderItsNumber) {
  unsigned int calls = 0;
  host.OnKernelCall(GetParam().number, [&](auto) {
    ++calls;
    return Zorvan::Kernel::CallResult{0, 0};
  });
  EXPECT_EQ(End(Run(0)), "returns\n");
  EXPECT_EQ(calls, 1U);
}

TEST_P(KernelCall, FailsWithTheSystemsTextForItsErrorValue) {
  host.FailKernelCall(GetParam().number, 1, -ENOENT);
  EXPECT_EQ(End(Run(EPERM)), Failure("No such file or directory") + "\n");
  host.FailKernelCall(GetParam().number, 1, -ESRCH);
  EXPECT_EQ(End(Run(EPERM)), Failure("No such process") + "\n");
}

TEST_P(KernelCall, FailsForEveryStatusButZero) {
  for (const std::uint32_t status : {1U, 0x7fffffffU, 0x80000000U, 0xbad011eU, 0xffffffffU}) {
    host.FailKernelCall(GetParam().number, status, -EINVAL);
    EXPECT_EQ(End(Run(0)), Failure("Invalid argument") + "\n") << status;
  }
}

TEST_P(KernelCall, FailsWithTheTextOfWhateverErrnoWasWhenItHasNoErrorValue) {
  host.FailKernelCall(GetParam().number, 1, 0);
  EXPECT_EQ(End(Run(EPERM)), Failure("Operation not permitted") + "\n");
  EXPECT_EQ(End(Run(0)), Failure("Success") + "\n");
}

TEST_P(KernelCall, SucceedsWithZeroStatusAndKeepsItsErrorValueInErrno) {
  host.FailKernelCall(GetParam().number, 0, -EAGAIN);
  EXPECT_EQ(End(Run(EPERM)), "returns\n");
  EXPECT_EQ(errnoAfter, EAGAIN);
}

TEST_P(KernelCall, LeavesErrnoAloneWithoutAnErrorValue) {
  EXPECT_EQ(End(Run(EPERM)), "returns\n");
  EXPECT_EQ(errnoAfter, EPERM);
}

TEST_P(KernelCall, ReportsNothing) {
  EXPECT_EQ(Run(0).Reports(), "returns\n");
  host.FailKernelCall(GetParam().number, 1, -EINVAL);
  EXPECT_EQ(Run(0).Reports(), Failure("Invalid argument") + "\n");
}

INSTANTIATE_TEST_SUITE_P(All, KernelCall, testing::ValuesIn(Operations()),
                         [](const auto& operation) { return operation.param.name; });

}  // namespace
}  // namespace SecPolicyTest
