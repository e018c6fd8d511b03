// Filters from verdicts: hunts for a jump that leads elsewhere, a bound that is off by one, and a
// way around the check of the architecture, by running each program as the kernel does.

#include "host/enforce/plan/bpf_program.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/audit.h>

#include <initializer_list>
#include <random>

#include "enforce/bpf_machine.h"

namespace EnforceTest {
namespace {

using Enforce::Answer;
using Enforce::ArgumentCheck;
using Enforce::Assemble;
using Enforce::CallVerdict;
using Enforce::Condition;
using Enforce::FilterProgram;
using Enforce::Half;
using Enforce::ValueSet;
using Calls = std::map<int, CallVerdict>;
using Numbers = std::initializer_list<std::uint64_t>;

constexpr std::uint32_t kArchitecture = AUDIT_ARCH_X86_64;
constexpr int kX32 = 0x4000'0000;

std::string Ask(const FilterProgram& program, int number, const Arguments& arguments = {}) {
  return AnswerOf(program.instructions, CallOf(number, arguments, kArchitecture));
}

CallVerdict Allowed(std::vector<Condition> conditions = {}) {
  return {Answer::kAllowed, std::move(conditions)};
}

TEST(Assemble, AnswersEachNumber) {
  const FilterProgram program =
      Assemble({{0, Allowed()}, {1, {Answer::kRefused}}, {2, {Answer::kUnknown}}, {4, Allowed()}},
               kArchitecture);
  EXPECT_EQ(RefusalOf(program.instructions), "");
  EXPECT_EQ(Ask(program, 0), "allowed");
  EXPECT_EQ(Ask(program, 1), "EPERM");
  EXPECT_EQ(Ask(program, 2), "ENOSYS");
  EXPECT_EQ(Ask(program, 3), "ENOSYS");
  EXPECT_EQ(Ask(program, 4), "allowed");
  EXPECT_EQ(Ask(program, 5), "ENOSYS");
  EXPECT_EQ(Ask(program, kX32 - 1), "ENOSYS");
  EXPECT_FALSE(program.secret);
}

TEST(Assemble, AsksASupervisor) {
  const FilterProgram program = Assemble({{3, {Answer::kNoticed}}}, kArchitecture);
  EXPECT_EQ(RefusalOf(program.instructions), "");
  EXPECT_EQ(EnforceTest::Run(program.instructions, CallOf(3, {}, kArchitecture)),
            SECCOMP_RET_USER_NOTIF);
  EXPECT_EQ(Ask(program, 2), "ENOSYS");
  EXPECT_EQ(Ask(program, 4), "ENOSYS");
}

TEST(Assemble, KnowsNoCallOfNobody) {
  const FilterProgram program = Assemble({}, kArchitecture);
  EXPECT_EQ(Ask(program, 0), "ENOSYS");
  EXPECT_EQ(Ask(program, kX32), "killed");
}

TEST(Assemble, KillsCallsByAnotherTable) {
  const FilterProgram program = Assemble({{39, Allowed()}}, kArchitecture);
  EXPECT_EQ(Ask(program, 39), "allowed");
  EXPECT_EQ(Ask(program, kX32 + 39), "killed");
  EXPECT_EQ(Ask(program, 0x7fff'ffff), "killed");
  EXPECT_EQ(Ask(program, -1), "ENOSYS");
  EXPECT_EQ(AnswerOf(program.instructions, CallOf(39, {}, AUDIT_ARCH_I386)), "killed");
  EXPECT_EQ(AnswerOf(program.instructions, CallOf(39, {}, AUDIT_ARCH_AARCH64)), "killed");
}

TEST(Assemble, KnowsNoSecondTableElsewhere) {
  const FilterProgram program = Assemble({{39, Allowed()}}, AUDIT_ARCH_AARCH64);
  const auto ask = [&](int number, std::uint32_t architecture) {
    return AnswerOf(program.instructions, CallOf(number, {}, architecture));
  };
  EXPECT_EQ(ask(39, AUDIT_ARCH_AARCH64), "allowed");
  EXPECT_EQ(ask(kX32 + 39, AUDIT_ARCH_AARCH64), "ENOSYS");
  EXPECT_EQ(ask(39, AUDIT_ARCH_ARM), "killed");
  EXPECT_EQ(ask(39, AUDIT_ARCH_X86_64), "killed");
}

TEST(Assemble, LooksAtTheMaskedHalf) {
  const ArgumentCheck lower = {.argument = 1, .mask = 0xff, .values = {{2, 4}, {9, 9}}};
  const ArgumentCheck upper = {.argument = 2, .half = Half::kUpper, .values = {{0, 0}}};
  const FilterProgram program = Assemble({{7, Allowed({{lower}, {upper}})}}, kArchitecture);
  for (const std::uint64_t value : Numbers{2, 3, 4, 9, 0x102, 0x7fff'ff09}) {
    EXPECT_EQ(Ask(program, 7, {0, value, 0xffff'ffff}), "allowed") << value;
  }
  for (const std::uint64_t value : Numbers{0, 1, 5, 8, 10, 0xff, 0x101}) {
    EXPECT_EQ(Ask(program, 7, {0, value}), "EPERM") << value;
  }
  EXPECT_EQ(Ask(program, 7, {0, 2 | std::uint64_t{1} << 32}), "allowed");
  EXPECT_EQ(Ask(program, 7, {0, 2, std::uint64_t{1} << 32}), "EPERM");
}

TEST(Assemble, TakesOneCheckOfACondition) {
  const ArgumentCheck first = {.argument = 0, .values = {{1, 1}}};
  const ArgumentCheck second = {.argument = 1, .values = {{1, 1}}};
  const ArgumentCheck third = {.argument = 2, .values = {{1, 1}}};
  const FilterProgram any = Assemble({{0, Allowed({{first, second, third}})}}, kArchitecture);
  const FilterProgram all = Assemble({{0, Allowed({{first}, {second}, {third}})}}, kArchitecture);
  for (std::uint64_t bits = 0; bits < 8; ++bits) {
    const Arguments arguments = {bits & 1, bits >> 1 & 1, bits >> 2};
    EXPECT_EQ(Ask(any, 0, arguments), bits == 0 ? "EPERM" : "allowed") << bits;
    EXPECT_EQ(Ask(all, 0, arguments), bits == 7 ? "allowed" : "EPERM") << bits;
  }
}

TEST(Assemble, LetsNothingPassAConditionOfNothing) {
  EXPECT_EQ(Ask(Assemble({{0, Allowed({{}})}}, kArchitecture), 0), "EPERM");
  EXPECT_EQ(Ask(Assemble({{0, Allowed({{ArgumentCheck{}}})}}, kArchitecture), 0), "EPERM");
}

TEST(Assemble, LetsTheSecretPassOnceItIsSet) {
  constexpr std::uint64_t kSecret = 0x0123'4567'89ab'cdef;
  const CallVerdict entry = {Answer::kAllowedWithSecret};
  FilterProgram program = Assemble({{59, entry}, {60, Allowed()}, {322, entry}}, kArchitecture);
  ASSERT_TRUE(program.secret);
  EXPECT_EQ(RefusalOf(program.instructions), "");
  for (const std::uint64_t guess : Numbers{0, kSecret, ~std::uint64_t{0}}) {
    EXPECT_EQ(Ask(program, 59, {0, 0, 0, 0, 0, guess}), "EPERM");
  }
  SetSecret(program.instructions.data(), *program.secret, kSecret);
  EXPECT_EQ(RefusalOf(program.instructions), "");
  for (const int number : {59, 322}) {
    EXPECT_EQ(Ask(program, number, {0, 0, 0, 0, 0, kSecret}), "allowed");
    EXPECT_EQ(Ask(program, number, {kSecret, kSecret, kSecret, kSecret, kSecret, 0}), "EPERM");
    for (int bit = 0; bit < 64; ++bit) {
      const std::uint64_t guess = kSecret ^ std::uint64_t{1} << bit;
      EXPECT_EQ(Ask(program, number, {0, 0, 0, 0, 0, guess}), "EPERM") << bit;
    }
  }
  EXPECT_EQ(Ask(program, 60), "allowed");
}

TEST(Assemble, SharesWhatIsTheSame) {
  const ArgumentCheck check = {.argument = 1, .values = {{1, 5}, {7, 9}, {11, 13}}};
  Calls calls;
  for (int number = 0; number < 100; number += 2) calls[number] = Allowed({{check}});
  const std::size_t fifty = Assemble(calls, kArchitecture).instructions.size();
  calls.erase(0);
  calls.erase(2);
  EXPECT_LE(fifty, Assemble(calls, kArchitecture).instructions.size() + 8);
}

// As many segments as there can be: two neighbours never have the same verdict.
TEST(Assemble, JumpsFurtherThanABranchCan) {
  Calls calls;
  for (int number = 0; number < 1000; ++number) {
    calls[number] = number % 2 == 0 ? Allowed() : CallVerdict{Answer::kRefused};
  }
  const FilterProgram program = Assemble(calls, kArchitecture);
  EXPECT_EQ(RefusalOf(program.instructions), "");
  EXPECT_LT(program.instructions.size(), 2100U);
  for (int number = 0; number < 1000; ++number) {
    ASSERT_EQ(Ask(program, number), number % 2 == 0 ? "allowed" : "EPERM") << number;
  }
  EXPECT_EQ(Ask(program, 1000), "ENOSYS");
}

TEST(Assemble, SearchesManyValues) {
  std::vector<Enforce::ValueRange> values;
  for (std::uint32_t value = 10; value < 5000; value += 10) values.push_back({value, value + 4});
  const FilterProgram program =
      Assemble({{0, Allowed({{{.argument = 0, .values = values}}})}}, kArchitecture);
  EXPECT_EQ(RefusalOf(program.instructions), "");
  for (std::uint64_t value = 0; value < 5100; ++value) {
    const bool isIn = value >= 10 && value < 5000 && value % 10 < 5;
    ASSERT_EQ(Ask(program, 0, {value}), isIn ? "allowed" : "EPERM") << value;
  }
}

// ---- By chance

// Whether the verdict, taken by its words, lets a call pass.
bool Passes(const ArgumentCheck& check, const Arguments& arguments) {
  const std::uint64_t argument = arguments[check.argument];
  const auto word =
      static_cast<std::uint32_t>(check.half == Half::kUpper ? argument >> 32 : argument);
  return std::ranges::any_of(check.values, [&](const Enforce::ValueRange& range) {
    return range.first <= (word & check.mask) && (word & check.mask) <= range.last;
  });
}

std::string Expected(const CallVerdict& verdict, const Arguments& arguments) {
  if (verdict.answer == Answer::kUnknown) return "ENOSYS";
  if (verdict.answer == Answer::kRefused) return "EPERM";
  const bool holds = std::ranges::all_of(verdict.conditions, [&](const Condition& condition) {
    return std::ranges::any_of(
        condition, [&](const ArgumentCheck& check) { return Passes(check, arguments); });
  });
  return holds ? "allowed" : "EPERM";
}

class Chance {
 public:
  explicit Chance(unsigned int seed) : random(seed) {}

  std::uint32_t Below(std::uint32_t bound) { return static_cast<std::uint32_t>(random() % bound); }

  CallVerdict Verdict() {
    if (Below(3) == 0) return {Below(2) == 0 ? Answer::kRefused : Answer::kUnknown};
    CallVerdict verdict = Allowed();
    for (auto count = Below(3); count > 0; --count) {
      Condition condition;
      for (auto checks = Below(3) + 1; checks > 0; --checks) condition.push_back(Check());
      verdict.conditions.push_back(std::move(condition));
    }
    return verdict;
  }

  Arguments Any() {
    Arguments arguments;
    for (std::uint64_t& argument : arguments) argument = Word() | std::uint64_t{Word()} << 32;
    return arguments;
  }

 private:
  std::uint32_t Word() {
    const std::uint32_t near = Below(12);
    return Below(2) == 0 ? near : 0U - near;
  }

  ArgumentCheck Check() {
    ArgumentCheck check{.argument = Below(6), .half = Below(4) == 0 ? Half::kUpper : Half::kLower};
    if (Below(3) == 0) check.mask = Below(2) == 0 ? 0xff : 0xffff'ff00;
    std::vector<Enforce::ValueRange> values;
    for (auto count = Below(4); count > 0; --count) {
      const std::uint32_t one = Word();
      const std::uint32_t other = Word();
      values.push_back({std::min(one, other), std::max(one, other)});
    }
    check.values = ValueSet(std::move(values)).Ranges();
    return check;
  }

  std::mt19937 random;
};

TEST(Assemble, DoesAsTheVerdictsSay) {
  for (unsigned int seed = 0; seed < 300; ++seed) {
    Chance chance(seed);
    Calls calls;
    for (auto count = chance.Below(40); count > 0; --count) {
      calls[static_cast<int>(chance.Below(60))] = chance.Verdict();
    }
    const FilterProgram program = Assemble(calls, kArchitecture);
    ASSERT_LE(program.instructions.size(), Enforce::kMostInstructions) << seed;
    for (int number = 0; number < 64; ++number) {
      const auto known = calls.find(number);
      for (int round = 0; round < 20; ++round) {
        const Arguments arguments = chance.Any();
        ASSERT_EQ(Ask(program, number, arguments),
                  known == calls.end() ? "ENOSYS" : Expected(known->second, arguments))
            << "seed " << seed << ", number " << number;
      }
    }
  }
}

}  // namespace
}  // namespace EnforceTest
