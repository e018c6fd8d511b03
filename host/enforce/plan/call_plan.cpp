#include "host/enforce/plan/call_plan.h"

#include <fcntl.h>
#include <linux/fs.h>
#include <linux/prctl.h>
#include <linux/sched.h>
#include <linux/sockios.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/ioctl.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <initializer_list>
#include <set>
#include <string_view>
#include <utility>

#include "braxo/misc/strcat.h"
#include "host/enforce/plan/call_remarks.h"
#include "host/enforce/plan/port_check.h"
#include "host/enforce/system_calls.h"
#include "policy/call_set.h"

using Braxo::Misc::StrCat;
using Policy::Rule;
using Policy::RuleKind;

namespace Enforce {
namespace {

using Values = std::vector<ValueRange>;

// ---- What checks look at

constexpr std::uint32_t kWholeWord = 0xffff'ffff;
constexpr std::uint32_t kSocketTypes = 0xff;  // without SOCK_CLOEXEC and SOCK_NONBLOCK

struct CheckedArgument {
  const char* check;
  const char* call;
  unsigned int argument;
  std::uint32_t mask = kWholeWord;
};
constexpr CheckedArgument kCheckedArguments[] = {
    {"ioctl_request", "ioctl", 1},
    {"kill_signal", "kill", 1},
    {"kill_signal", "pidfd_send_signal", 1},
    {"kill_signal", "rt_sigqueueinfo", 1},
    {"kill_signal", "rt_tgsigqueueinfo", 2},
    {"kill_signal", "tgkill", 2},
    {"kill_signal", "tkill", 1},
    {"prctl_option", "prctl", 0},
    {"set_gid", "setfsgid", 0},
    {"set_gid", "setgid", 0},
    {"set_gid", "setregid", 0},
    {"set_gid", "setregid", 1},
    {"set_gid", "setresgid", 0},
    {"set_gid", "setresgid", 1},
    {"set_gid", "setresgid", 2},
    {"set_uid", "setfsuid", 0},
    {"set_uid", "setresuid", 0},
    {"set_uid", "setresuid", 1},
    {"set_uid", "setresuid", 2},
    {"set_uid", "setreuid", 0},
    {"set_uid", "setreuid", 1},
    {"set_uid", "setuid", 0},
    {"socket_family", "socket", 0},
    {"socket_family", "socketpair", 0},
    {"socket_type", "socket", 1, kSocketTypes},
    {"socket_type", "socketpair", 1, kSocketTypes},
};

// Takes the place of an identity that is to stay as it is.
constexpr std::uint32_t kUnchanged = 0xffff'ffff;

// Values that reach past the domain. A range that happens to hold them does not grant them.
struct DangerousValue {
  const char* check;
  const char* call;
  std::uint32_t value;
  const char* name;
};
constexpr DangerousValue kDangerousValues[] = {
    {"ioctl_request", "ioctl", TIOCSTI, "TIOCSTI"},      // types into the terminal
    {"ioctl_request", "ioctl", TIOCLINUX, "TIOCLINUX"},  // pastes into the console
    // These change attributes of a file that is open for reading alone.
    {"ioctl_request", "ioctl", FS_IOC_SETFLAGS, "FS_IOC_SETFLAGS"},
    {"ioctl_request", "ioctl", FS_IOC_FSSETXATTR, "FS_IOC_FSSETXATTR"},
    {"prctl_option", "prctl", PR_SET_MM, "PR_SET_MM"},  // says what program a process runs
};

// ---- clone_flags

constexpr std::uint32_t kChildSignal = CSIGNAL;
constexpr std::uint32_t kNamespaces = CLONE_NEWNS | CLONE_NEWCGROUP | CLONE_NEWUTS | CLONE_NEWIPC |
                                      CLONE_NEWUSER | CLONE_NEWPID | CLONE_NEWNET;
constexpr std::uint32_t kTimeNamespace =
    CLONE_NEWTIME;  // only for unshare: to clone it is a signal
constexpr std::uint32_t kUnshareFlags = kNamespaces | kTimeNamespace | CLONE_FILES | CLONE_FS |
                                        CLONE_SYSVSEM | CLONE_VM | CLONE_SIGHAND | CLONE_THREAD;

// ---- Signals by way of descriptors

constexpr std::initializer_list<std::uint32_t> kOwnerCommands = {F_SETOWN, F_SETOWN_EX};
constexpr std::initializer_list<std::uint32_t> kOwnerRequests = {FIOSETOWN, SIOCSPGRP};

// ---- Sockets

// Families that carry packets of the internet past the checks of Landlock, and all that are newer
// than this.
ValueSet FamiliesPastPorts() {
  constexpr std::uint32_t kFirstNewer = 46;
  return ValueSet({{AF_PACKET, AF_PACKET},
                   {AF_RDS, AF_RDS},
                   {AF_PPPOX, AF_PPPOX},
                   {AF_TIPC, AF_TIPC},
                   {AF_RXRPC, AF_RXRPC},
                   {AF_KCM, AF_KCM},
                   {AF_SMC, AF_SMC},
                   {AF_XDP, AF_XDP},
                   {kFirstNewer, kWholeWord}});
}

// ---- Truncation

struct OpeningCall {
  const char* name;
  unsigned int flags;
};
constexpr OpeningCall kOpeningCalls[] = {{"open", 1}, {"open_by_handle_at", 2}, {"openat", 2}};

// ---- io_uring

constexpr const char* kRingCalls[] = {"io_uring_enter", "io_uring_register", "io_uring_setup"};

// ---- Conditions

ArgumentCheck Among(unsigned int argument, const ValueSet& values,
                    std::uint32_t mask = kWholeWord) {
  return {.argument = argument, .mask = mask, .values = values.Ranges()};
}

ArgumentCheck NoneOf(unsigned int argument, std::uint32_t bits) {
  return {.argument = argument, .mask = bits, .values = {{0, 0}}};
}

ValueSet Single(std::uint32_t value) { return ValueSet({{value, value}}); }

ValueSet SetOf(std::initializer_list<std::uint32_t> values) {
  ValueSet set;
  for (const std::uint32_t value : values) set = set.With(Single(value));
  return set;
}

// ---- The plan

struct Check {
  std::vector<const Rule*> rules;
  ValueSet passing;
};

// What keeps the rules that no filter can.
enum class Other { kLandlock, kModule };

class CallPlanner {
 public:
  CallPlanner(const Policy::InstalledDomain& installed, Truncation truncated, Other keeper)
      : domain(installed), truncation(truncated), other(keeper) {
    for (const Rule& rule : domain.rules) {
      if (rule.kind == RuleKind::kSyscall) callRules.push_back(&rule);
    }
    GrantCalls();
    for (const auto& checked : kCheckedArguments) ReadCheck(checked.check);
  }

  void RefuseAllValues(const std::string& name) {
    Check& check = checks.at(name);
    for (const auto& checked : kCheckedArguments) {
      if (checked.check != name) continue;
      TellOfLoss(check, checked.call, check.passing,
                 StrCat("refused, as ", name, " has more values than a filter has room for"));
    }
    check.passing = ValueSet();
  }

  CallPlan Plan() {
    CloseDangerousValues();
    if (other == Other::kModule) {
      LetUseClone();
    } else {
      CloseWhatPassesLandlock();
    }
    CloseRings();
    if (truncation == Truncation::kByFilter) CloseTruncation();
    for (const auto& checked : kCheckedArguments) DemandValues(checked);
    LeaveTheEntry();
    return Finish();
  }

  // The check with the most ranges of values.
  std::string LongestCheck() const {
    const auto longest = std::ranges::max_element(
        checks, {}, [](const auto& check) { return check.second.passing.Ranges().size(); });
    return longest->first;
  }

 private:
  // ---- -s

  void GrantCalls() {
    for (const SystemCall& call : SystemCalls()) verdicts[call.number] = {Answer::kRefused};
    for (const Rule* const rule : callRules) {
      if (rule->Grants()) Answers(rule->words[0], Answer::kAllowed);
    }
    for (const Rule* const rule : callRules) {
      if (!rule->Grants()) Answers(rule->words[0], Answer::kRefused);
      if (rule->Grants() && !Policy::FindCallSet(rule->words[0]) && !NumberOf(rule->words[0])) {
        remarks.Add(*rule, "this machine has no such call");
      }
    }
  }

  void Answers(const std::string& word, Answer answer) {
    const Policy::CallSet* const set = Policy::FindCallSet(word);
    if (set == nullptr) return AnswersCall(word, answer);
    for (const std::string_view call : set->members) AnswersCall(call, answer);
  }

  void AnswersCall(std::string_view call, Answer answer) {
    const std::optional<int> number = NumberOf(call);
    if (number) verdicts[*number].answer = answer;
  }

  // Null when the call is refused, or none of this machine.
  CallVerdict* FindGranted(std::string_view call) {
    const std::optional<int> number = NumberOf(call);
    if (!number || verdicts[*number].answer != Answer::kAllowed) return nullptr;
    return &verdicts[*number];
  }

  // Tells those who grant the call, unless another revokes it.
  void Tell(const std::string& call, const std::string& reason) {
    if (FindGranted(call) == nullptr) return;
    for (const Rule* const rule : callRules) {
      if (rule->Grants() && Policy::SpeaksOfCall(rule->words[0], call)) {
        remarks.Add(*rule, reason, call);
      }
    }
  }

  void Demand(const std::string& call, Condition condition) {
    CallVerdict* const verdict = FindGranted(call);
    if (verdict != nullptr) verdict->conditions.push_back(std::move(condition));
  }

  // Demands what no rule says.
  void Close(const std::string& call, Condition condition, const std::string& reason) {
    Tell(call, reason);
    Demand(call, std::move(condition));
  }

  void Withdraw(const std::string& call, Answer answer, const std::string& reason) {
    Tell(call, reason);
    AnswersCall(call, answer);
  }

  // ---- -p

  void ReadCheck(const char* name) {
    if (checks.contains(name)) return;
    const std::vector<const Rule*> rules = RulesOfCheck(domain.rules, name);
    const bool isKeptElsewhere = other == Other::kModule;
    checks[name] = {rules, isKeptElsewhere ? PassingValues({}) : PassingValues(rules)};
  }

  // Refuses values of a check that pass by its rules.
  void TakeValues(const std::string& check, const std::string& call, const ValueSet& values,
                  const std::string& reason) {
    Check& taken = checks.at(check);
    const ValueSet lost = taken.passing.Within(values);
    taken.passing = taken.passing.Without(values);
    if (!lost.IsEmpty()) TellOfLoss(taken, call, lost, reason);
  }

  // Tells those who grant lost values; where none grants any, all pass, and so who grants the call.
  void TellOfLoss(const Check& check, const std::string& call, const ValueSet& lost,
                  const std::string& reason) {
    if (std::ranges::none_of(check.rules, &Rule::Grants)) return Tell(call, reason);
    for (const Rule* const rule : check.rules) {
      const bool hasLost = rule->Grants() && !PassingValues({&rule, 1}).Within(lost).IsEmpty();
      if (hasLost) remarks.Add(*rule, reason);
    }
  }

  bool IsGrantedByItself(const std::string& check, std::uint32_t value) const {
    return Enforce::IsGrantedByItself(checks.at(check).rules, value);
  }

  void DemandValues(const CheckedArgument& checked) {
    ValueSet passing = checks.at(checked.check).passing;
    if (passing.IsAll()) return;
    if (IsIdentity(checked.check)) passing = passing.With(Single(kUnchanged));
    Demand(checked.call, {Among(checked.argument, passing, checked.mask)});
  }

  static bool IsIdentity(std::string_view check) { return check.starts_with("set_"); }

  // ---- What goes past rules

  void CloseDangerousValues() {
    for (const auto& [check, call, value, name] : kDangerousValues) {
      if (IsGrantedByItself(check, value)) continue;
      TakeValues(check, call, Single(value), StrCat(name, " is refused unless granted by itself"));
    }
  }

  void CloseWhatPassesLandlock() {
    CloseNamedSockets();
    CloseLimits();
    CloseClone();
    CloseSignalsByDescriptors();
    CloseGroups();
    ClosePorts();
  }

  // No rule of the kernel is about who connects to a unix socket that has a name.
  void CloseNamedSockets() {
    static constexpr std::array kConnecting = {"connect", "sendmmsg", "sendmsg", "sendto"};
    const bool connects =
        std::ranges::any_of(kConnecting, [&](const char* call) { return FindGranted(call); });
    if (!connects || !checks.at("socket_family").passing.Has(AF_UNIX)) return;
    if (!IsGrantedByItself("socket_family", AF_UNIX)) {
      const char* const reason =
          "unix sockets are refused unless socket_family grants 1, as they reach whoever listens";
      Close("socket", {Among(0, Single(AF_UNIX).Complement())}, reason);
      CloseDatagramPairs();
      return;
    }
    for (const Rule* const rule : checks.at("socket_family").rules) {
      if (!rule->Grants() || !PassingValues({&rule, 1}).Has(AF_UNIX)) continue;
      remarks.Surrender(*rule,
                        "beside connect or sending, a unix socket reaches whoever listens: this "
                        "kernel has no rules for that");
    }
  }

  // Of a pair, sockets for datagrams still send to any address and can be connected anew. Those
  // that are raw are the same to the kernel.
  void CloseDatagramPairs() {
    Close("socketpair", {Among(1, SetOf({SOCK_STREAM, SOCK_SEQPACKET}), kSocketTypes)},
          "pairs that are neither SOCK_STREAM nor SOCK_SEQPACKET are refused unless socket_family "
          "grants 1, as they reach whoever listens");
  }

  // A limit of processor time that is over ends a process, as a signal would.
  void CloseLimits() {
    constexpr unsigned int kProcess = 0;
    constexpr unsigned int kNewLimit = 2;
    for (const Half half : {Half::kLower, Half::kUpper}) {
      Demand("prlimit64", {Among(kProcess, Single(0)),
                           {.argument = kNewLimit, .half = half, .values = {{0, 0}}}});
    }
    Tell("prlimit64", "the limits of other processes are not changed");
  }

  void CloseClone() {
    Withdraw("clone3", Answer::kUnknown, "answered as unknown, so that programs use clone");
    const std::uint32_t allowed = AllowedFlags();
    DemandFlags("clone", allowed | kChildSignal);
    DemandFlags("unshare", allowed & kUnshareFlags);
    Demand("unshare", {{.argument = 0, .half = Half::kUpper, .values = {{0, 0}}}});
  }

  // Where clone3 is not there, programs do without.
  void LetUseClone() {
    if (FindGranted("clone3") == nullptr) AnswersCall("clone3", Answer::kUnknown);
  }

  std::uint32_t AllowedFlags() {
    std::uint32_t granted = 0;
    std::uint32_t revoked = 0;
    const std::vector<const Rule*> rules = RulesOfCheck(domain.rules, Policy::kMaskCheck);
    for (const Rule* const rule : rules) {
      (rule->Grants() ? granted : revoked) |= static_cast<std::uint32_t>(rule->Range().first);
    }
    if (std::ranges::none_of(rules, &Rule::Grants)) {
      const char* const reason = "new namespaces are refused unless clone_flags grants them";
      Tell("clone", reason);
      Tell("unshare", reason);
      return ~(kNamespaces | kTimeNamespace | revoked);
    }
    const std::uint32_t allowed = granted & ~revoked;
    if ((allowed & kTimeNamespace) == 0) {
      Tell("unshare", "a new time namespace is refused unless clone_flags grants 0x80");
    }
    return allowed;
  }

  void DemandFlags(const char* call, std::uint32_t allowed) {
    if (~allowed != 0) Demand(call, {NoneOf(0, ~allowed)});
  }

  // A descriptor that is ready sends a signal to whoever is its owner.
  void CloseSignalsByDescriptors() {
    const ValueSet signals = SentSignals();
    if (signals.IsAll()) return;
    const ValueSet descriptorSignals =
        signals.Has(SIGIO) ? signals.With(Single(0)) : signals.Without(Single(0));
    Demand("fcntl", {Among(1, Single(F_SETSIG).Complement()), Among(2, descriptorSignals)});
    if (signals.Has(SIGIO) && signals.Has(SIGURG)) return;
    const char* const reason =
        "an owner of a descriptor is refused where SIGIO and SIGURG may not be sent";
    Close("fcntl", {Among(1, SetOf(kOwnerCommands).Complement())}, reason);
    TakeValues("ioctl_request", "ioctl", SetOf(kOwnerRequests), reason);
  }

  // None where no call that sends one is granted.
  ValueSet SentSignals() {
    const bool sends = std::ranges::any_of(kCheckedArguments, [&](const auto& checked) {
      return std::string_view(checked.check) == "kill_signal" &&
             FindGranted(checked.call) != nullptr;
    });
    return sends ? checks.at("kill_signal").passing : ValueSet();
  }

  void CloseGroups() {
    if (checks.at("set_gid").passing.IsAll()) return;
    Withdraw("setgroups", Answer::kRefused, "refused beside set_gid, as no filter sees its groups");
  }

  // Landlock checks the ports of TCP at bind and connect, and nothing else.
  void ClosePorts() {
    const PortCheck bind = ReadPortCheck(domain, kBindPort);
    const PortCheck connect = ReadPortCheck(domain, kConnectPort);
    if (bind.IsOpen() && connect.IsOpen()) return;
    CloseOtherProtocols();
    if (!connect.IsOpen()) CloseFastOpen();
    if (bind.IsOpen() || bind.passing.Has(kPortOfKernel)) return;
    Withdraw("listen", Answer::kRefused,
             "refused unless bind_port grants 0, as it takes a port for a socket without one");
  }

  void CloseOtherProtocols() {
    const ArgumentCheck isElsewhere = Among(0, SetOf({AF_INET, AF_INET6}).Complement());
    const char* const reason = "only TCP reaches the internet beside rules for ports";
    Close("socket", {Among(0, FamiliesPastPorts().Complement())}, reason);
    Demand("socket", {isElsewhere, Among(1, Single(SOCK_STREAM), kSocketTypes)});
    Demand("socket", {isElsewhere, Among(2, SetOf({IPPROTO_IP, IPPROTO_TCP}))});
    Close("setsockopt",
          {Among(1, Single(IPPROTO_TCP).Complement()), Among(2, Single(TCP_ULP).Complement())},
          "TCP_ULP is refused beside rules for ports, as it changes the protocol of a socket");
  }

  void CloseFastOpen() {
    const char* const reason = "MSG_FASTOPEN is refused beside connect_port, as it connects unseen";
    Close("sendmmsg", {NoneOf(3, MSG_FASTOPEN)}, reason);
    Close("sendmsg", {NoneOf(2, MSG_FASTOPEN)}, reason);
    Close("sendto", {NoneOf(3, MSG_FASTOPEN)}, reason);
  }

  // A ring opens sockets and sends without a call, also those that conditions are about.
  void CloseRings() {
    for (const char* const call : kRingCalls) {
      Withdraw(call, Answer::kRefused, "refused, as no filter sees what a ring does");
    }
  }

  // Who opens a file for reading can empty it as well. Opening for writing remains for Landlock to
  // refuse, as it tells files from pipes, which shells would truncate, too.
  void CloseTruncation() {
    for (const auto& [call, flags] : kOpeningCalls) {
      CallVerdict* const verdict = FindGranted(call);
      if (verdict == nullptr) continue;
      verdict->conditions = {
          {NoneOf(flags, O_TRUNC), Among(flags, SetOf({O_WRONLY, O_RDWR}), O_ACCMODE)}};
      verdict->refusal = EACCES;
    }
    CallVerdict* const verdict = FindGranted("truncate");
    if (verdict != nullptr) *verdict = {.answer = Answer::kRefused, .refusal = EACCES};
    Withdraw("openat2", Answer::kUnknown,
             "answered as unknown unless granted by itself, so that programs use openat");
  }

  // ---- The end

  // By a path or by a descriptor, whichever the launcher is given; it tells of what fails, and
  // ends.
  void LeaveTheEntry() {
    for (const char* const call : {"execve", "execveat", "exit_group", "write"}) {
      if (FindGranted(call) == nullptr) AnswersCall(call, Answer::kAllowedWithSecret);
    }
  }

  CallPlan Finish() {
    CallPlan plan;
    plan.mayEnd = FindGranted("exit") != nullptr || FindGranted("exit_group") != nullptr;
    plan.mayMap = FindGranted("mmap") != nullptr;
    FilterProgram program = Assemble(verdicts, NativeArchitecture());
    plan.verdicts = std::move(verdicts);
    plan.program = std::move(program.instructions);
    plan.secret = program.secret;
    for (const Rule& rule : domain.rules) {
      if (!IsOfThePlan(rule)) continue;
      plan.fates.push_back(remarks.FateOf(rule));
      plan.fates.back().place = PlaceOf(rule, domain.rules);
    }
    return plan;
  }

  static bool IsOfThePlan(const Rule& rule) {
    if (rule.kind == RuleKind::kParameterCheck) return !IsPortCheck(rule.words[0]);
    return rule.kind == RuleKind::kSyscall;
  }

  const Policy::InstalledDomain& domain;
  const Truncation truncation;
  const Other other;
  std::vector<const Rule*> callRules;
  std::map<int, CallVerdict> verdicts;
  std::map<std::string, Check> checks;
  CallRemarks remarks;
};

}  // namespace

CallPlan PlanCallsBesideModule(const Policy::InstalledDomain& domain) {
  return CallPlanner(domain, Truncation::kByLandlock, Other::kModule).Plan();
}

CallPlan PlanCalls(const Policy::InstalledDomain& domain, Truncation truncation) {
  std::set<std::string> tooLong;
  for (;;) {
    CallPlanner planner(domain, truncation, Other::kLandlock);
    for (const std::string& check : tooLong) planner.RefuseAllValues(check);
    CallPlan plan = planner.Plan();
    if (plan.program.size() <= kMostInstructions) return plan;
    tooLong.insert(planner.LongestCheck());
  }
}

bool IsCallNamed(const Policy::InstalledDomain& domain, std::string_view call) {
  const auto names = [call](const Rule& rule) {
    return rule.kind == RuleKind::kSyscall && rule.words[0] == call && rule.Grants();
  };
  return std::ranges::any_of(domain.rules, names);
}

bool SpeaksOfSignals(const Rule& rule) {
  return std::ranges::any_of(kCheckedArguments, [&](const CheckedArgument& checked) {
    return std::string_view(checked.check) == "kill_signal" &&
           Policy::SpeaksOfCall(rule.words[0], checked.call);
  });
}

}  // namespace Enforce
