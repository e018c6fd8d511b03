// File policies at run time: arguments in the kernel's order, empty paths, and the one failure
// that asks to try again.

#include <gtest/gtest.h>

#include <cerrno>
#include <cstdint>
#include <cstring>
#include <limits>
#include <span>
#include <string>
#include <vector>

#include "secpolicy/secpolicy.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

using Zorvan::Kernel::CallResult;

using Arguments64 = std::span<const std::uint64_t>;

constexpr std::uint32_t kTryAgain = 0xbad011f;

TeskAccess_FileRule FileRule(const std::string& path, unsigned int permission) {
  TeskAccess_FileRule rule = {};
  path.copy(rule.path, sizeof rule.path - 1);
  rule.permission = permission;
  return rule;
}

class RuntimeFilePolicies : public testing::Test {
 protected:
  // Keeps the arguments of kernel call `number`.
  void Watch(std::uint32_t number) {
    host.OnKernelCall(number, [this](Arguments64 args) {
      passed.assign(args.begin(), args.end());
      return CallResult{0, 0};
    });
  }

  ScriptedHost host;
  std::vector<std::uint64_t> passed;
};

using AddFilePolicyBatch = RuntimeFilePolicies;
using RemoveFilePolicy = RuntimeFilePolicies;
using UpdateFilePolicy = RuntimeFilePolicies;
using RetrieveNumberOfFilePolicies = RuntimeFilePolicies;
using RetrieveFilePolicies = RuntimeFilePolicies;
using ReplaceFilePolicyVMs = RuntimeFilePolicies;

TEST_F(AddFilePolicyBatch, PassesItsParametersInOrder) {
  TeskAccess_FileRule rules[] = {FileRule("/vm/disk", 3), FileRule("/vm/log", 2)};
  unsigned int result = 5;
  EXPECT_EQ(
      Record([&] { SecPolicy::AddFilePolicyBatch(12, 4294967295, rules, 2, &result); }).Text(),
      Lines({
          R"(Call(0x405f, 12, 4294967295, [{"/vm/disk", 3}, {"/vm/log", 2}], 2, &out))",
          "returns",
      }));
  EXPECT_EQ(result, 5U);
}

TEST_F(AddFilePolicyBatch, PassesTheCallersAddressesAndWidensTheWorldWithItsSign) {
  Watch(0x405f);
  TeskAccess_FileRule rules[1] = {};
  unsigned int result = 0;
  SecPolicy::AddFilePolicyBatch(-1, 7, rules, 1, &result);
  EXPECT_EQ(passed, (std::vector<std::uint64_t>{0xffffffffffffffffU, 7,
                                                reinterpret_cast<std::uintptr_t>(rules), 1,
                                                reinterpret_cast<std::uintptr_t>(&result)}));
}

TEST_F(AddFilePolicyBatch, ChecksNothing) {
  EXPECT_EQ(Record([] { SecPolicy::AddFilePolicyBatch(0, 0, nullptr, 0, nullptr); }).Text(),
            Lines({"Call(0x405f, 0, 0, null, 0, null)", "returns"}));
}

TEST_F(AddFilePolicyBatch, WritesTheDomainUnsignedAndTheWorldSignedWhenItFails) {
  host.FailKernelCall(0x405f, 1, -ENOMEM);
  EXPECT_EQ(
      Record([] { SecPolicy::AddFilePolicyBatch(-3, 4294967295, nullptr, 0, nullptr); }).Text(),
      Lines({
          "Call(0x405f, -3, 4294967295, null, 0, null)",
          "throws Braxo::Lib::BraxoException: Failed to add file policies to domain "
          ":4294967295: world ID :-3:Cannot allocate memory",
      }));
}

TEST_F(RemoveFilePolicy, PassesItsParametersInOrder) {
  EXPECT_EQ(Record([] { SecPolicy::RemoveFilePolicy(12, 7, "/vm/disk"); }).Text(),
            Lines({R"(Call(0x405c, 12, 7, "/vm/disk"))", "returns"}));
}

TEST_F(RemoveFilePolicy, WidensTheWorldWithItsSign) {
  Watch(0x405c);
  SecPolicy::RemoveFilePolicy(std::numeric_limits<int>::min(), 7, "/vm/disk");
  ASSERT_EQ(passed.size(), 3U);
  EXPECT_EQ(passed[0], 0xffffffff80000000U);
}

TEST_F(RemoveFilePolicy, RefusesAnEmptyPath) {
  EXPECT_EQ(Record([] { SecPolicy::RemoveFilePolicy(12, 7, ""); }).Text(),
            Lines({"throws Braxo::Lib::BraxoException: file path is empty"}));
}

TEST_F(RemoveFilePolicy, WritesTheDomainUnsignedAndTheWorldSignedWhenItFails) {
  host.FailKernelCall(0x405c, 1, -ENOENT);
  EXPECT_EQ(Record([] { SecPolicy::RemoveFilePolicy(-3, 4294967295, "/vm/disk"); }).Text(),
            Lines({
                R"(Call(0x405c, -3, 4294967295, "/vm/disk"))",
                "throws Braxo::Lib::BraxoException: Failed to remove file policy from domain "
                ":4294967295 : world id :-3:No such file or directory",
            }));
}

TEST_F(UpdateFilePolicy, PassesItsParametersInOrder) {
  EXPECT_EQ(Record([] { SecPolicy::UpdateFilePolicy(7, "/vm/disk", 4294967295); }).Text(),
            Lines({R"(Call(0x405b, 7, "/vm/disk", 4294967295))", "returns"}));
}

TEST_F(UpdateFilePolicy, RefusesAnEmptyPath) {
  EXPECT_EQ(Record([] { SecPolicy::UpdateFilePolicy(7, "", 3); }).Text(),
            Lines({"throws Braxo::Lib::BraxoException: File path is empty"}));
}

TEST_F(RetrieveNumberOfFilePolicies, ReturnsTheStoredNumber) {
  host.OnKernelCall(0x405e, [](Arguments64 args) {
    auto* number = reinterpret_cast<std::uint32_t*>(static_cast<std::uintptr_t>(args[1]));
    EXPECT_EQ(*number, 0U);
    *number = 4294967295;
    return CallResult{0, 0};
  });
  unsigned int number = 0;
  EXPECT_EQ(Record([&] { number = SecPolicy::RetrieveNumberOfFilePolicies(7); }).Text(),
            Lines({"Call(0x405e, 7, &out)", "returns"}));
  EXPECT_EQ(number, 4294967295);
}

TEST_F(RetrieveNumberOfFilePolicies, ReturnsZeroWhenTheKernelStoresNothing) {
  EXPECT_EQ(SecPolicy::RetrieveNumberOfFilePolicies(7), 0U);
}

TEST_F(RetrieveNumberOfFilePolicies, WritesTheDomainUnsignedWhenItFails) {
  host.FailKernelCall(0x405e, 1, -EINVAL);
  EXPECT_EQ(Record([] { SecPolicy::RetrieveNumberOfFilePolicies(4294967295); }).Text(),
            Lines({
                "Call(0x405e, 4294967295, &out)",
                "throws Braxo::Lib::BraxoException: Failed to get number of file policies for "
                "domain :: 4294967295:Invalid argument",
            }));
}

TEST_F(RetrieveFilePolicies, LetsTheKernelFillTheCallersBuffer) {
  const TeskAccess_FileRule installed = FileRule("/vm/disk", 3);
  TeskAccess_FileRule buffer[2] = {FileRule("kept", 1), FileRule("kept", 1)};
  host.OnKernelCall(0x405d, [&](Arguments64 args) {
    EXPECT_EQ(args[1], reinterpret_cast<std::uintptr_t>(buffer));
    EXPECT_STREQ(buffer[0].path, "kept");
    std::memcpy(buffer, &installed, sizeof installed);
    return CallResult{0, 0};
  });
  EXPECT_EQ(Record([&] { SecPolicy::RetrieveFilePolicies(7, buffer, 2); }).Text(),
            Lines({"Call(0x405d, 7, &buffer, 2)", "returns"}));
  EXPECT_STREQ(buffer[0].path, "/vm/disk");
  EXPECT_EQ(buffer[0].permission, 3U);
  EXPECT_STREQ(buffer[1].path, "kept");
}

TEST_F(RetrieveFilePolicies, AsksToTryAgainForOneStatusOnly) {
  const auto retrieve = [] { SecPolicy::RetrieveFilePolicies(4294967295, nullptr, 0); };
  const std::string call = "Call(0x405d, 4294967295, null, 0)";
  const std::string message =
      "Failed to retrieve policies from domain:: 4294967295 : No buffer space available";

  host.FailKernelCall(0x405d, kTryAgain, -ENOBUFS);
  EXPECT_EQ(Record(retrieve).Text(),
            Lines({call, "throws SecPolicy::SecPolicyRetryException: " + message}));

  for (const std::uint32_t status : {1U, kTryAgain - 1, kTryAgain + 1, 0xffffffffU}) {
    host.FailKernelCall(0x405d, status, -ENOBUFS);
    EXPECT_EQ(Record(retrieve).Text(),
              Lines({call, "throws Braxo::Lib::BraxoException: " + message}))
        << status;
  }
}

TEST_F(RetrieveFilePolicies, AsksToTryAgainWithTheTextOfErrnoWithoutAnErrorValue) {
  host.FailKernelCall(0x405d, kTryAgain, 0);
  EXPECT_EQ(Record([] {
              errno = EPERM;
              SecPolicy::RetrieveFilePolicies(7, nullptr, 0);
            }).Text(),
            Lines({
                "Call(0x405d, 7, null, 0)",
                "throws SecPolicy::SecPolicyRetryException: Failed to retrieve policies from "
                "domain:: 7 : Operation not permitted",
            }));
}

TEST_F(RetrieveFilePolicies, IsTheOnlyOneThatAsksToTryAgain) {
  for (const std::uint32_t number : {0x405bU, 0x405cU, 0x405eU, 0x405fU, 0x4067U}) {
    host.FailKernelCall(number, kTryAgain, -EINVAL);
  }
  const std::string plain = "Braxo::Lib::BraxoException";
  EXPECT_EQ(Record([] { SecPolicy::UpdateFilePolicy(7, "/a", 3); }).exceptionType, plain);
  EXPECT_EQ(Record([] { SecPolicy::RemoveFilePolicy(12, 7, "/a"); }).exceptionType, plain);
  EXPECT_EQ(Record([] { SecPolicy::RetrieveNumberOfFilePolicies(7); }).exceptionType, plain);
  EXPECT_EQ(Record([] { SecPolicy::AddFilePolicyBatch(0, 7, nullptr, 0, nullptr); }).exceptionType,
            plain);
  EXPECT_EQ(Record([] { SecPolicy::ReplaceFilePolicyVMs("/a", "/b"); }).exceptionType, plain);
}

TEST_F(ReplaceFilePolicyVMs, PassesTheOldThenTheNewPath) {
  EXPECT_EQ(Record([] { SecPolicy::ReplaceFilePolicyVMs("/vm/old", "/vm/new"); }).Text(),
            Lines({R"(Call(0x4067, "/vm/old", "/vm/new"))", "returns"}));
}

TEST_F(ReplaceFilePolicyVMs, RefusesAnEmptyOldPathFirst) {
  EXPECT_EQ(Record([] { SecPolicy::ReplaceFilePolicyVMs("", "/vm/new"); }).Text(),
            Lines({"throws Braxo::Lib::BraxoException: Old path is empty"}));
  EXPECT_EQ(Record([] { SecPolicy::ReplaceFilePolicyVMs("", ""); }).Text(),
            Lines({"throws Braxo::Lib::BraxoException: Old path is empty"}));
}

TEST_F(ReplaceFilePolicyVMs, RefusesAnEmptyNewPath) {
  EXPECT_EQ(Record([] { SecPolicy::ReplaceFilePolicyVMs("/vm/old", ""); }).Text(),
            Lines({"throws Braxo::Lib::BraxoException: New path is empty"}));
}

}  // namespace
}  // namespace SecPolicyTest
