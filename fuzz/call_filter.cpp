// Filters of system calls: whatever the verdicts, the kernel would take the program, and it answers
// each call as its verdict says, at both ends of every range and just beside them.
//
// An input is a list of bytes: the number of a call, its answer, and how many conditions follow; of
// a condition how many checks; of a check its argument, half and mask, and how many ranges of one
// byte each for the first and the last value.

#include <linux/audit.h>

#include <algorithm>
#include <cstdint>
#include <limits>
#include <string>

#include "enforce/bpf_machine.h"
#include "host/enforce/plan/bpf_program.h"
#include "support/require.h"

namespace SecPolicyFuzz {
namespace {

using Enforce::Answer;
using Enforce::ArgumentCheck;
using Enforce::CallVerdict;
using Enforce::Condition;
using Enforce::Half;
using Enforce::ValueRange;
using EnforceTest::Arguments;
using Calls = std::map<int, CallVerdict>;

constexpr std::uint32_t kArchitecture = AUDIT_ARCH_X86_64;
constexpr std::uint32_t kMasks[] = {std::numeric_limits<std::uint32_t>::max(), 0xff, 0xf0, 0};

class Reader {
 public:
  Reader(const std::uint8_t* bytes, std::size_t size) : data(bytes), left(size) {}

  bool IsAtEnd() const { return left == 0; }

  std::uint8_t Take() {
    if (IsAtEnd()) return 0;
    --left;
    return *data++;
  }

  unsigned int TakeBelow(unsigned int bound) { return Take() % bound; }

  // Near 0 or near the greatest value.
  std::uint32_t TakeValue() { return static_cast<std::uint32_t>(static_cast<std::int8_t>(Take())); }

  ArgumentCheck TakeCheck() {
    ArgumentCheck check{.argument = TakeBelow(6)};
    check.half = TakeBelow(2) == 0 ? Half::kLower : Half::kUpper;
    check.mask = kMasks[TakeBelow(std::size(kMasks))];
    std::vector<ValueRange> values;
    for (unsigned int count = TakeBelow(5); count > 0; --count) {
      const std::uint32_t one = TakeValue();
      const std::uint32_t other = TakeValue();
      values.push_back({std::min(one, other), std::max(one, other)});
    }
    check.values = Enforce::ValueSet(std::move(values)).Ranges();
    return check;
  }

  CallVerdict TakeVerdict() {
    CallVerdict verdict{.answer = static_cast<Answer>(TakeBelow(4))};
    if (verdict.answer != Answer::kAllowed) return verdict;
    for (unsigned int count = TakeBelow(4); count > 0; --count) {
      Condition condition;
      for (unsigned int checks = TakeBelow(4); checks > 0; --checks) {
        condition.push_back(TakeCheck());
      }
      verdict.conditions.push_back(std::move(condition));
    }
    return verdict;
  }

 private:
  const std::uint8_t* data;
  std::size_t left;
};

bool Passes(const ArgumentCheck& check, const Arguments& arguments) {
  const std::uint64_t argument = arguments.at(check.argument);
  const auto half =
      static_cast<std::uint32_t>(check.half == Half::kUpper ? argument >> 32 : argument);
  return std::ranges::any_of(check.values, [&](const ValueRange& range) {
    return range.first <= (half & check.mask) && (half & check.mask) <= range.last;
  });
}

std::string Expected(const CallVerdict& verdict, const Arguments& arguments) {
  if (verdict.answer == Answer::kUnknown) return "ENOSYS";
  if (verdict.answer != Answer::kAllowed) return "EPERM";
  const bool holds = std::ranges::all_of(verdict.conditions, [&](const Condition& condition) {
    return std::ranges::any_of(
        condition, [&](const ArgumentCheck& check) { return Passes(check, arguments); });
  });
  return holds ? "allowed" : "EPERM";
}

void RequireAnswer(const std::vector<sock_filter>& program, int number, const CallVerdict& verdict,
                   const Arguments& arguments) {
  RequireEqual(
      EnforceTest::AnswerOf(program, EnforceTest::CallOf(number, arguments, kArchitecture)),
      Expected(verdict, arguments), "call " + std::to_string(number));
}

// The arguments that decide: all alike, and each at an end of a range with the others at 0.
void RequireAnswers(const std::vector<sock_filter>& program, int number,
                    const CallVerdict& verdict) {
  RequireAnswer(program, number, verdict, {});
  for (const Condition& condition : verdict.conditions) {
    for (const ArgumentCheck& check : condition) {
      for (const ValueRange& range : check.values) {
        for (const std::uint32_t value :
             {range.first - 1, range.first, range.last, range.last + 1}) {
          Arguments arguments = {};
          arguments.fill(value | std::uint64_t{value} << 32);
          RequireAnswer(program, number, verdict, arguments);
          arguments.fill(0);
          arguments.at(check.argument) =
              check.half == Half::kUpper ? std::uint64_t{value} << 32 : value;
          RequireAnswer(program, number, verdict, arguments);
        }
      }
    }
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Reader reader(data, size);
  Calls calls;
  while (!reader.IsAtEnd()) {
    const int number = reader.Take();
    calls[number] = reader.TakeVerdict();
  }
  const std::vector<sock_filter> program = Enforce::Assemble(calls, kArchitecture).instructions;
  if (program.size() > Enforce::kMostInstructions) return 0;
  RequireEqual(EnforceTest::RefusalOf(program), "", "what the kernel says");
  for (int number = 0; number <= 256; ++number) {
    const auto known = calls.find(number);
    RequireAnswers(program, number,
                   known == calls.end() ? CallVerdict{Answer::kUnknown} : known->second);
  }
  return 0;
}

}  // namespace SecPolicyFuzz
