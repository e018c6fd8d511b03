// Capabilities and parameter checks at run time: the range of each, the widening of signed
// numbers, and which refusal comes first.

#include <gtest/gtest.h>

#include <cerrno>
#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "secpolicy/secpolicy.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

using SecPolicy::TeskAccess_Capability;
using SecPolicy::TeskAccess_ModeParam;
using SecPolicy::TeskAccess_ParamCheck;
using Zorvan::Kernel::CallResult;

using Arguments64 = std::span<const std::uint64_t>;

TeskAccess_Capability Capability(unsigned int number) {
  return static_cast<TeskAccess_Capability>(number);
}
TeskAccess_ParamCheck ParamCheck(unsigned int number) {
  return static_cast<TeskAccess_ParamCheck>(number);
}

class RuntimeCapabilityRules : public testing::Test {
 protected:
  // Keeps the arguments of kernel call `number`.
  void Watch(std::uint32_t number) {
    host.OnKernelCall(number, [this](Arguments64 args) {
      passed.assign(args.begin(), args.end());
      return CallResult{0, 0};
    });
  }
  // The library only passes the address on.
  const TeskAccess_ModeParam* Mode() const {
    return reinterpret_cast<const TeskAccess_ModeParam*>(&parameters);
  }

  ScriptedHost host;
  std::vector<std::uint64_t> passed;
  std::uint64_t parameters[2] = {};
};

using SetCapRule = RuntimeCapabilityRules;
using SetParamCheckRule = RuntimeCapabilityRules;
using RemoveParamCheckRule = RuntimeCapabilityRules;

// What a char holds that is negative where char is signed and where it is not.
constexpr char kNegative = static_cast<char>(-2);

TEST_F(SetCapRule, PassesItsParametersInOrder) {
  EXPECT_EQ(Record([] { SecPolicy::SetCapRule(4294967295, Capability(5), 1); }).Text(),
            Lines({"Call(0x4061, 4294967295, 5, 1)", "returns"}));
  EXPECT_EQ(Record([] { SecPolicy::SetCapRule(7, Capability(0), 0); }).Text(),
            Lines({"Call(0x4061, 7, 0, 0)", "returns"}));
}

TEST_F(SetCapRule, AcceptsTheLastCapability) {
  EXPECT_EQ(Record([] { SecPolicy::SetCapRule(7, Capability(18), 1); }).Text(),
            Lines({"Call(0x4061, 7, 18, 1)", "returns"}));
}

TEST_F(SetCapRule, RefusesCapabilitiesOutOfRange) {
  for (const unsigned int number : {19U, 20U, 0x80000000U, 0xffffffffU}) {
    EXPECT_EQ(Record([=] { SecPolicy::SetCapRule(7, Capability(number), 1); }).Text(),
              Lines({"throws Braxo::Lib::BraxoException: Capability is not in range"}))
        << number;
  }
}

TEST_F(SetCapRule, WidensTheGrantWithItsSign) {
  Watch(0x4061);
  SecPolicy::SetCapRule(7, Capability(2), kNegative);
  EXPECT_EQ(passed, (std::vector<std::uint64_t>{7, 2, 0xfffffffffffffffeU}));
  SecPolicy::SetCapRule(7, Capability(2), 'Y');
  EXPECT_EQ(passed, (std::vector<std::uint64_t>{7, 2, 'Y'}));
}

TEST_F(SetCapRule, WritesTheDomainUnsignedWhenItFails) {
  host.FailKernelCall(0x4061, 1, -EPERM);
  EXPECT_EQ(Record([] { SecPolicy::SetCapRule(4294967295, Capability(5), 1); }).Text(),
            Lines({
                "Call(0x4061, 4294967295, 5, 1)",
                "throws Braxo::Lib::BraxoException: Failed to set capability rule for domain :: "
                "4294967295:Operation not permitted",
            }));
}

TEST_F(SetParamCheckRule, PassesItsParametersInOrder) {
  EXPECT_EQ(
      Record([&] { SecPolicy::SetParamCheckRule(4294967295, ParamCheck(0), Mode(), 1); }).Text(),
      Lines({"Call(0x4062, 4294967295, 0, &buffer, 1)", "returns"}));
}

TEST_F(SetParamCheckRule, PassesTheCallersAddressAndWidensTheGrantWithItsSign) {
  Watch(0x4062);
  SecPolicy::SetParamCheckRule(7, ParamCheck(2), Mode(), kNegative);
  EXPECT_EQ(passed, (std::vector<std::uint64_t>{7, 2, reinterpret_cast<std::uintptr_t>(Mode()),
                                                0xfffffffffffffffeU}));
}

TEST_F(SetParamCheckRule, AcceptsTheLastCheck) {
  EXPECT_EQ(Record([&] { SecPolicy::SetParamCheckRule(7, ParamCheck(9), Mode(), 0); }).Text(),
            Lines({"Call(0x4062, 7, 9, &buffer, 0)", "returns"}));
}

TEST_F(SetParamCheckRule, RefusesChecksOutOfRange) {
  for (const unsigned int number : {10U, 11U, 0x80000000U, 0xffffffffU}) {
    EXPECT_EQ(
        Record([&] { SecPolicy::SetParamCheckRule(7, ParamCheck(number), Mode(), 1); }).Text(),
        Lines({"throws Braxo::Lib::BraxoException: ParamCheck is not in range"}))
        << number;
  }
}

TEST_F(SetParamCheckRule, RefusesMissingParametersAfterTheRange) {
  EXPECT_EQ(Record([] { SecPolicy::SetParamCheckRule(7, ParamCheck(10), nullptr, 1); }).Text(),
            Lines({"throws Braxo::Lib::BraxoException: ParamCheck is not in range"}));
  EXPECT_EQ(Record([] { SecPolicy::SetParamCheckRule(7, ParamCheck(9), nullptr, 1); }).Text(),
            Lines({"throws Braxo::Lib::BraxoException: Mode Param is NULL"}));
}

TEST_F(SetParamCheckRule, WritesTheDomainUnsignedWhenItFails) {
  host.FailKernelCall(0x4062, 1, -EEXIST);
  EXPECT_EQ(
      Record([&] { SecPolicy::SetParamCheckRule(4294967295, ParamCheck(3), Mode(), 1); }).Text(),
      Lines({
          "Call(0x4062, 4294967295, 3, &buffer, 1)",
          "throws Braxo::Lib::BraxoException: Failed to set parameter check rule for domain :: "
          "4294967295:File exists",
      }));
}

TEST_F(RemoveParamCheckRule, PassesItsParametersInOrder) {
  EXPECT_EQ(
      Record([&] { SecPolicy::RemoveParamCheckRule(4294967295, ParamCheck(0), Mode()); }).Text(),
      Lines({"Call(0x413e, 4294967295, 0, &buffer)", "returns"}));
}

TEST_F(RemoveParamCheckRule, PassesTheCallersAddress) {
  Watch(0x413e);
  SecPolicy::RemoveParamCheckRule(7, ParamCheck(2), Mode());
  EXPECT_EQ(passed, (std::vector<std::uint64_t>{7, 2, reinterpret_cast<std::uintptr_t>(Mode())}));
}

TEST_F(RemoveParamCheckRule, AcceptsTheLastCheck) {
  EXPECT_EQ(Record([&] { SecPolicy::RemoveParamCheckRule(7, ParamCheck(9), Mode()); }).Text(),
            Lines({"Call(0x413e, 7, 9, &buffer)", "returns"}));
}

TEST_F(RemoveParamCheckRule, RefusesChecksOutOfRange) {
  for (const unsigned int number : {10U, 0x80000000U, 0xffffffffU}) {
    EXPECT_EQ(
        Record([&] { SecPolicy::RemoveParamCheckRule(7, ParamCheck(number), Mode()); }).Text(),
        Lines({"throws Braxo::Lib::BraxoException: ParamCheck is not in range"}))
        << number;
  }
}

TEST_F(RemoveParamCheckRule, RefusesMissingParametersAfterTheRange) {
  EXPECT_EQ(Record([] { SecPolicy::RemoveParamCheckRule(7, ParamCheck(10), nullptr); }).Text(),
            Lines({"throws Braxo::Lib::BraxoException: ParamCheck is not in range"}));
  EXPECT_EQ(Record([] { SecPolicy::RemoveParamCheckRule(7, ParamCheck(9), nullptr); }).Text(),
            Lines({"throws Braxo::Lib::BraxoException: Mode Param is NULL"}));
}

TEST_F(RemoveParamCheckRule, WritesTheDomainUnsignedWhenItFails) {
  host.FailKernelCall(0x413e, 1, -ENOENT);
  EXPECT_EQ(
      Record([&] { SecPolicy::RemoveParamCheckRule(4294967295, ParamCheck(3), Mode()); }).Text(),
      Lines({
          "Call(0x413e, 4294967295, 3, &buffer)",
          "throws Braxo::Lib::BraxoException: Failed to remove parameter check rule for domain :: "
          "4294967295:No such file or directory",
      }));
}

}  // namespace
}  // namespace SecPolicyTest
