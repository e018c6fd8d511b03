// Filters against the meaning of rules: hunts for a call that a filter lets pass and the rules
// refuse, and for one that it refuses, the rules grant, and no rule's fate tells of. By domains of
// chance, each call and many arguments.

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/fs.h>
#include <linux/sched.h>
#include <sys/ioctl.h>
#include <sys/socket.h>

#include <random>

#include "enforce/bpf_machine.h"
#include "enforce/domain_of.h"
#include "host/enforce/plan/call_plan.h"
#include "host/enforce/system_calls.h"
#include "policy/call_set.h"
#include "policy/decision.h"

namespace EnforceTest {
namespace {

using Enforce::CallPlan;
using Enforce::PlanCalls;
using Enforce::Truncation;
using Policy::InstalledDomain;
using Policy::Rule;

// ---- What rules mean

bool MayCall(const InstalledDomain& domain, const std::string& call) {
  return Decide(Policy::WordsQuestion{Policy::RuleKind::kSyscall, {call}}, domain).granted;
}

bool Passes(const InstalledDomain& domain, const std::string& check, std::uint32_t value) {
  return Decide(Policy::ParameterQuestion{check, std::to_string(value)}, domain).granted;
}

bool IsAbout(const Rule& rule, const std::string& check) {
  return rule.kind == Policy::RuleKind::kParameterCheck && rule.words[0] == check;
}

// ---- What calls are about

struct Use {
  const char* call;
  const char* check;
  std::size_t argument;
  std::uint32_t mask = 0xffff'ffff;
};
constexpr Use kUses[] = {
    {"clone", "clone_flags", 0},
    {"unshare", "clone_flags", 0},
    {"ioctl", "ioctl_request", 1},
    {"kill", "kill_signal", 1},
    {"pidfd_send_signal", "kill_signal", 1},
    {"prctl", "prctl_option", 0},
    {"rt_sigqueueinfo", "kill_signal", 1},
    {"rt_tgsigqueueinfo", "kill_signal", 2},
    {"setfsgid", "set_gid", 0},
    {"setfsuid", "set_uid", 0},
    {"setgid", "set_gid", 0},
    {"setregid", "set_gid", 0},
    {"setregid", "set_gid", 1},
    {"setresgid", "set_gid", 0},
    {"setresgid", "set_gid", 1},
    {"setresgid", "set_gid", 2},
    {"setresuid", "set_uid", 0},
    {"setresuid", "set_uid", 1},
    {"setresuid", "set_uid", 2},
    {"setreuid", "set_uid", 0},
    {"setreuid", "set_uid", 1},
    {"setuid", "set_uid", 0},
    {"socket", "socket_family", 0},
    {"socket", "socket_type", 1, 0xff},
    {"socketpair", "socket_family", 0},
    {"socketpair", "socket_type", 1, 0xff},
    {"tgkill", "kill_signal", 2},
    {"tkill", "kill_signal", 1},
};

// What the kernel refuses to unshare anyhow.
constexpr std::uint64_t kNotUnshared = ~std::uint64_t{0x7e07'0f80};

bool ArgumentsPass(const InstalledDomain& domain, const std::string& call,
                   const Arguments& arguments) {
  if (call == "unshare" && (arguments[0] & kNotUnshared) != 0) return false;
  return std::ranges::all_of(kUses, [&](const Use& use) {
    if (use.call != call) return true;
    const auto value = static_cast<std::uint32_t>(arguments.at(use.argument)) & use.mask;
    const bool isUnchanged =
        std::string_view(use.check).starts_with("set_") && value == 0xffff'ffff;
    return isUnchanged || Passes(domain, use.check, value);
  });
}

struct Opening {
  const char* call;
  std::size_t flags;
};
constexpr Opening kOpenings[] = {{"open", 1}, {"open_by_handle_at", 2}, {"openat", 2}};

bool CanTruncate(const std::string& call) {
  return call == "truncate" ||
         std::ranges::find(kOpenings, call, &Opening::call) != std::end(kOpenings);
}

// Whether the call truncates a file that it does not open for writing.
bool Truncates(const std::string& call, const Arguments& arguments) {
  if (call == "truncate") return true;
  const auto* const opening = std::ranges::find(kOpenings, call, &Opening::call);
  if (opening == std::end(kOpenings)) return false;
  const std::uint64_t flags = arguments.at(opening->flags);
  const std::uint64_t mode = flags & O_ACCMODE;
  return (flags & O_TRUNC) != 0 && mode != O_WRONLY && mode != O_RDWR;
}

// Whether a rule that grants the call, or one of its checks, is told to be less than it says.
bool IsTold(const CallPlan& plan, const std::string& call) {
  return std::ranges::any_of(plan.fates, [&](const Enforce::RuleFate& fate) {
    if (fate.fate == Enforce::Fate::kEnforced) return false;
    if (fate.how.find(call) != std::string::npos) return true;
    return std::ranges::any_of(
        kUses, [&](const Use& use) { return use.call == call && IsAbout(fate.rule, use.check); });
  });
}

// ---- By chance

constexpr const char* kChecks[] = {"bind_port",     "clone_flags",  "connect_port", "ioctl_request",
                                   "kill_signal",   "prctl_option", "set_gid",      "set_uid",
                                   "socket_family", "socket_type"};

constexpr std::uint64_t kValues[] = {0,
                                     1,
                                     2,
                                     3,
                                     9,
                                     10,
                                     15,
                                     23,
                                     29,
                                     35,
                                     80,
                                     0x80,
                                     0xff,
                                     0x100,
                                     0x101,
                                     CLONE_VM | CLONE_FS,
                                     CLONE_PARENT_SETTID,
                                     CLONE_NEWUSER,
                                     CLONE_NEWNS,
                                     262,
                                     1000,
                                     0x5401,
                                     TIOCSTI,
                                     TIOCLINUX,
                                     FS_IOC_SETFLAGS,
                                     FS_IOC_FSSETXATTR,
                                     O_TRUNC,
                                     O_TRUNC | O_CREAT | O_RDWR,
                                     O_CREAT | O_CLOEXEC,
                                     0x8901,
                                     0xffff,
                                     0x7fff'ffff,
                                     MSG_FASTOPEN,
                                     SOCK_STREAM | SOCK_CLOEXEC,
                                     SOCK_DGRAM | SOCK_NONBLOCK,
                                     0xffff'fffe,
                                     0xffff'ffff,
                                     std::uint64_t{1} << 32 | 2};

class Chance {
 public:
  explicit Chance(unsigned int seed) : random(seed) {}

  std::size_t Below(std::size_t bound) { return random() % bound; }
  std::uint64_t Value() { return kValues[Below(std::size(kValues))]; }

  InstalledDomain Domain() {
    std::vector<std::string> lines;
    for (auto count = Below(12); count > 0; --count) lines.push_back("-s " + Call() + Verdict());
    if (Below(2) == 0) lines.emplace_back("-s ioctl grant");
    for (auto count = Below(10); count > 0; --count) lines.push_back(CheckLine());
    return DomainOf(lines);
  }

  Arguments Any() {
    Arguments arguments;
    for (std::uint64_t& argument : arguments) argument = Value() + (Below(4) == 0 ? 1 : 0);
    return arguments;
  }

 private:
  std::string Call() {
    if (Below(2) == 0) return kUses[Below(std::size(kUses))].call;
    if (Below(2) == 0) return Policy::CallSets()[Below(Policy::CallSets().size())].name;
    return Enforce::SystemCalls()[Below(Enforce::SystemCalls().size())].name;
  }

  std::string Verdict() { return Below(4) == 0 ? " revoke" : " grant"; }

  std::string CheckLine() {
    const std::string check = kChecks[Below(std::size(kChecks))];
    const std::uint64_t one = Value();
    const std::uint64_t other = Value();
    std::string line = "-p " + check + " " + std::to_string(std::min(one, other));
    if (check != "clone_flags" && Below(2) == 0) line += " " + std::to_string(std::max(one, other));
    return line + Verdict();
  }

  std::mt19937 random;
};

std::string Show(const InstalledDomain& domain, const Arguments& arguments) {
  std::string text;
  for (const Rule& rule : domain.rules) text += rule.Text() + "\n";
  for (const std::uint64_t argument : arguments) text += std::to_string(argument) + " ";
  return text;
}

struct Tally {
  std::size_t asked = 0;
  std::size_t allowed = 0;
  std::size_t keptWhole = 0;
};

// What a call is refused with that no rule grants, or that goes past the rules.
std::string ExpectedRefusal(const std::string& call, Truncation truncation) {
  const bool isUnknown =
      call == "clone3" || (call == "openat2" && truncation == Truncation::kByFilter);
  return isUnknown ? "ENOSYS" : "EPERM";
}

struct Case {
  const InstalledDomain& domain;
  const CallPlan& plan;
  const Enforce::SystemCall& call;
  Truncation truncation;
  bool mayCall;
};

// Why an answer is not what the rules mean; empty when it is.
std::string ErrorOf(const Case& tried, const Arguments& arguments, const std::string& answer) {
  const std::string& call = tried.call.name;
  if (tried.mayCall && tried.truncation == Truncation::kByFilter && Truncates(call, arguments)) {
    return answer == "EACCES" ? "" : "truncated with " + answer;
  }
  const bool isGranted = tried.mayCall && ArgumentsPass(tried.domain, call, arguments);
  if (answer == "allowed") return isGranted ? "" : "allowed without a grant";
  if (isGranted) return IsTold(tried.plan, call) ? "" : "refused without a word";
  return answer == ExpectedRefusal(call, tried.truncation) ? "" : answer;
}

void ExpectMeaning(const Case& tried, Chance& chance, Tally& tally) {
  const std::string& call = tried.call.name;
  const bool isChecked = std::ranges::find(kUses, call, &Use::call) != std::end(kUses) ||
                         (tried.truncation == Truncation::kByFilter && CanTruncate(call));
  for (int round = isChecked ? 40 : 1; round > 0; --round) {
    const Arguments arguments = chance.Any();
    const std::string answer = AnswerOf(tried.plan.program, CallOf(tried.call.number, arguments));
    ASSERT_EQ(ErrorOf(tried, arguments, answer), "") << call << "\n"
                                                     << Show(tried.domain, arguments);
    ++tally.asked;
    if (answer == "allowed") ++tally.allowed;
    if (answer == "EACCES") ++tally.keptWhole;
  }
}

#if defined(SECPOLICY_SANITIZE)
constexpr unsigned int kDomains = 100;
#else
constexpr unsigned int kDomains = 500;
#endif

void ExpectMeaningOfDomain(unsigned int seed, Truncation truncation, Tally& tally) {
  Chance chance(seed);
  const InstalledDomain domain = chance.Domain();
  const CallPlan plan = PlanCalls(domain, truncation);
  ASSERT_EQ(RefusalOf(plan.program), "") << seed;
  for (const Enforce::SystemCall& call : Enforce::SystemCalls()) {
    const bool mayCall = MayCall(domain, call.name);
    ExpectMeaning({domain, plan, call, truncation, mayCall}, chance, tally);
    ASSERT_FALSE(testing::Test::HasFatalFailure()) << "seed " << seed;
  }
}

TEST(PlanCalls, DoesAsTheRulesMean) {
  Tally tally;
  for (unsigned int seed = 0; seed < kDomains; ++seed) {
    ExpectMeaningOfDomain(seed, seed % 2 == 0 ? Truncation::kByLandlock : Truncation::kByFilter,
                          tally);
    ASSERT_FALSE(testing::Test::HasFatalFailure());
  }
  EXPECT_GT(tally.asked, kDomains * 1000);
  EXPECT_GT(tally.allowed, tally.asked / 20);
  EXPECT_GT(tally.keptWhole, kDomains);
}

TEST(PlanCalls, AnswersNumbersOfNoCallAsUnknown) {
  for (unsigned int seed = 0; seed < 50; ++seed) {
    Chance chance(seed);
    const CallPlan plan = PlanCalls(chance.Domain());
    for (int number = 0; number < 2000; ++number) {
      if (!Enforce::NameOf(number).empty()) continue;
      ASSERT_EQ(AnswerOf(plan.program, CallOf(number, chance.Any())), "ENOSYS") << number;
    }
  }
}

TEST(PlanCalls, HasAFateForEachRule) {
  for (unsigned int seed = 0; seed < 200; ++seed) {
    Chance chance(seed);
    const InstalledDomain domain = chance.Domain();
    std::vector<std::string> expected;
    for (const Rule& rule : domain.rules) {
      if (!IsAbout(rule, "bind_port") && !IsAbout(rule, "connect_port")) {
        expected.push_back(rule.Text());
      }
    }
    std::vector<std::string> told;
    for (const auto& [rule, fate, how, place] : PlanCalls(domain).fates) {
      told.push_back(rule.Text());
      EXPECT_EQ(how.empty(), fate == Enforce::Fate::kEnforced) << rule.Text();
      EXPECT_TRUE(rule.Grants() || fate == Enforce::Fate::kEnforced) << rule.Text();
    }
    EXPECT_EQ(told, expected) << seed;
  }
}

}  // namespace
}  // namespace EnforceTest
