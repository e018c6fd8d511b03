#include "host/enforce/module/module_calls.h"

#include <sched.h>

#include <algorithm>
#include <array>
#include <bit>
#include <csignal>
#include <span>
#include <string_view>
#include <unordered_set>

#include "braxo/misc/strcat.h"
#include "host/enforce/plan/value_set.h"
#include "host/enforce/system_calls.h"
#include "policy/call_set.h"

using Braxo::Misc::StrCat;
using Policy::InstalledDomain;
using Policy::Rule;
using Policy::RuleKind;

namespace Enforce {
namespace {

using std::string_view_literals::operator""sv;

// The calls of which each use comes to a hook, by what is asked there. What makes a descriptor.
constexpr std::array kMakeDescriptors = {"accept"sv,          "accept4"sv, "io_uring_setup"sv,
                                         "perf_event_open"sv, "socket"sv,  "socketpair"sv,
                                         "userfaultfd"sv};
// What makes, moves or removes an entry of a directory.
constexpr std::array kEntries = {"link"sv,    "linkat"sv,    "mkdir"sv,    "mkdirat"sv,   "mknod"sv,
                                 "mknodat"sv, "rename"sv,    "renameat"sv, "renameat2"sv, "rmdir"sv,
                                 "symlink"sv, "symlinkat"sv, "unlink"sv,   "unlinkat"sv};
// What reads the status of a file or changes it.
constexpr std::array kStatus = {"chmod"sv,      "chown"sv,     "fchmod"sv,   "fchmodat"sv,
                                "fchmodat2"sv,  "fchown"sv,    "fchownat"sv, "fstat"sv,
                                "ftruncate"sv,  "futimesat"sv, "lchown"sv,   "lstat"sv,
                                "newfstatat"sv, "stat"sv,      "statx"sv,    "truncate"sv,
                                "utime"sv,      "utimensat"sv, "utimes"sv};
constexpr std::array kProcesses = {"clone"sv,
                                   "clone3"sv,
                                   "execve"sv,
                                   "execveat"sv,
                                   "fork"sv,
                                   "kill"sv,
                                   "pidfd_send_signal"sv,
                                   "rt_sigqueueinfo"sv,
                                   "rt_tgsigqueueinfo"sv,
                                   "tgkill"sv,
                                   "tkill"sv,
                                   "vfork"sv};
constexpr std::array kChecked = {"fcntl"sv, "inotify_add_watch"sv, "ioctl"sv, "prctl"sv};
// What takes a capability before anything else.
constexpr std::array kPrivileged = {
    "acct"sv,          "chroot"sv,        "delete_module"sv, "finit_module"sv,    "fsmount"sv,
    "fsopen"sv,        "fspick"sv,        "init_module"sv,   "kexec_file_load"sv, "kexec_load"sv,
    "mount"sv,         "mount_setattr"sv, "move_mount"sv,    "pivot_root"sv,      "reboot"sv,
    "setdomainname"sv, "setgroups"sv,     "sethostname"sv,   "setns"sv,           "settimeofday"sv,
    "swapoff"sv,       "swapon"sv,        "umount2"sv,       "vhangup"sv};
constexpr std::array kAtHooks = {std::span<const std::string_view>(kMakeDescriptors),
                                 std::span<const std::string_view>(kEntries),
                                 std::span<const std::string_view>(kStatus),
                                 std::span<const std::string_view>(kProcesses),
                                 std::span<const std::string_view>(kChecked),
                                 std::span<const std::string_view>(kPrivileged)};

constexpr const char* kReachesNoHook = "not refused, as not each use of it comes to a hook";
constexpr const char* kRing = "refused, as what a ring does is no system call";

bool IsAtHook(std::string_view call) {
  return std::ranges::any_of(
      kAtHooks, [call](const auto& calls) { return std::ranges::binary_search(calls, call); });
}

bool IsOfRing(std::string_view call) { return call.starts_with("io_uring_"); }

// ---- System calls

using Names = std::unordered_set<std::string_view>;

// `only` is its word.
std::span<const std::string_view> CallsOf(const Rule& rule, const std::string_view& only) {
  const Policy::CallSet* const set = Policy::FindCallSet(rule.words[0]);
  return set != nullptr ? set->members : std::span(&only, 1);
}

template <class Use>
void ForEachCall(const InstalledDomain& domain, bool grants, Use use) {
  for (const Rule& rule : domain.rules) {
    if (rule.kind != RuleKind::kSyscall || rule.Grants() != grants) continue;
    const std::string_view only = rule.words[0];
    std::ranges::for_each(CallsOf(rule, only), use);
  }
}

// What is revoked is not granted, whoever grants it.
Names GrantedCalls(const InstalledDomain& domain) {
  Names names;
  ForEachCall(domain, true, [&names](std::string_view call) { names.insert(call); });
  ForEachCall(domain, false, [&names](std::string_view call) { names.erase(call); });
  return names;
}

// Through a ring everything is done, and by none of the calls that do it elsewhere.
void GrantCalls(const Names& names, std::span<const SystemCall> known, std::span<__u64> granted) {
  for (const auto& [number, name] : known) {
    const auto place = static_cast<unsigned int>(number);
    if (place >= kMostCalls || IsOfRing(name) || !names.contains(name)) continue;
    granted[place / kCallsInWord] |= std::uint64_t{1} << place % kCallsInWord;
  }
}

bool IsKnown(std::string_view call) {
  return NumberOf(call) || std::ranges::count(SystemCallsOf32Bits(), call, &SystemCall::name) > 0;
}

// Of those that the rule speaks of the first one that the module cannot refuse; empty when it can.
std::string UnrefusedBy(const Rule& rule) {
  const std::string_view only = rule.words[0];
  const auto members = CallsOf(rule, only);
  const auto found = std::ranges::find_if_not(members, IsAtHook);
  return found == members.end() ? std::string() : std::string(*found);
}

RuleFate FateOfCall(const InstalledDomain& domain, const Rule& rule) {
  RuleFate fate{.rule = rule, .place = PlaceOf(rule, domain.rules)};
  if (rule.Grants()) {
    const bool isSet = Policy::FindCallSet(rule.words[0]) != nullptr;
    if (IsOfRing(rule.words[0])) Narrow(fate, kRing);
    if (!isSet && !IsKnown(rule.words[0])) Narrow(fate, "this machine has no such call");
    return fate;
  }
  const std::string unrefused = UnrefusedBy(rule);
  if (unrefused.empty()) return fate;
  fate.fate = Fate::kNotExpressible;
  fate.how = unrefused == rule.words[0] ? kReachesNoHook : StrCat(unrefused, ": ", kReachesNoHook);
  return fate;
}

// ---- Flags

// What no hook sees, as it takes no capability.
constexpr std::uint64_t kUnseenFlags = CLONE_FILES | CLONE_FS | CLONE_SYSVSEM;

std::uint64_t FlagsOf(const InstalledDomain& domain) {
  std::uint64_t granted = 0;
  std::uint64_t revoked = 0;
  const std::vector<const Rule*> rules = RulesOfCheck(domain.rules, Policy::kMaskCheck);
  for (const Rule* const rule : rules) (rule->Grants() ? granted : revoked) |= rule->Range().first;
  const bool isOpen = std::ranges::none_of(rules, &Rule::Grants);
  return (isOpen ? ~std::uint64_t{0} : granted) & ~revoked;
}

RuleFate FateOfFlags(const InstalledDomain& domain, const Rule& rule) {
  RuleFate fate{.rule = rule, .place = PlaceOf(rule, domain.rules)};
  if (rule.Grants() || (rule.Range().first & kUnseenFlags) == 0) return fate;
  fate.fate = Fate::kNotExpressible;
  fate.how = "no hook sees an unshare of what threads share";
  return fate;
}

// ---- Signals

// Who may not send signals has no descriptor do it.
std::uint64_t OwnedSignals(const InstalledDomain& domain, const Names& calls) {
  static constexpr std::array kSending = {
      "kill", "pidfd_send_signal", "rt_sigqueueinfo", "rt_tgsigqueueinfo", "tgkill", "tkill"};
  const bool sends =
      std::ranges::any_of(kSending, [&calls](const char* call) { return calls.contains(call); });
  if (!sends) return 0;
  const ValueSet passing = PassingValues(RulesOfCheck(domain.rules, "kill_signal"));
  std::uint64_t signals = 0;
  for (unsigned int signal = 1; signal <= kMostSignals; ++signal)
    signals |= std::uint64_t{passing.Has(signal)} << (signal - 1);
  return signals;
}

// Those that a domain has as owner of a descriptor.
bool HasOwner(std::uint64_t signals) {
  constexpr std::uint64_t kOwned = std::uint64_t{1} << (SIGIO - 1) | std::uint64_t{1}
                                                                         << (SIGURG - 1);
  return (signals & kOwned) == kOwned;
}

void NarrowOwners(const InstalledDomain& domain, std::vector<RuleFate>& fates) {
  const Names calls = GrantedCalls(domain);
  if (HasOwner(OwnedSignals(domain, calls)) || !calls.contains("fcntl")) return;
  for (RuleFate& fate : fates) {
    if (fate.rule.kind != RuleKind::kSyscall || !fate.rule.Grants()) continue;
    if (Policy::SpeaksOfCall(fate.rule.words[0], "fcntl"))
      Narrow(fate, "an owner of a descriptor is refused where SIGIO and SIGURG may not be sent");
  }
}

unsigned int CountOf(std::span<const __u64> calls) {
  unsigned int count = 0;
  for (const std::uint64_t word : calls) count += static_cast<unsigned int>(std::popcount(word));
  return count;
}

}  // namespace

void PlanCallsOfModule(const InstalledDomain& domain, ModuleRules& rules) {
  const Names names = GrantedCalls(domain);
  GrantCalls(names, SystemCalls(), rules.calls[kCallsOfMachine]);
  GrantCalls(names, SystemCallsOf32Bits(), rules.calls[kCallsOf32Bits]);
  rules.cloneFlags = FlagsOf(domain);
  rules.ownedSignals = OwnedSignals(domain, names);
}

std::vector<RuleFate> CallFatesByModule(const InstalledDomain& domain) {
  std::vector<RuleFate> fates;
  for (const Rule& rule : domain.rules) {
    if (rule.kind == RuleKind::kSyscall) fates.push_back(FateOfCall(domain, rule));
    const bool isCheck = rule.kind == RuleKind::kParameterCheck;
    if (isCheck && rule.words[0] == Policy::kMaskCheck) fates.push_back(FateOfFlags(domain, rule));
  }
  NarrowOwners(domain, fates);
  return fates;
}

std::vector<std::string> GapsByModule(const InstalledDomain& domain) {
  const auto passes = [granted = GrantedCalls(domain)](const SystemCall& call) {
    return !IsAtHook(call.name) && !granted.contains(call.name);
  };
  std::vector<std::string> gaps;
  const auto calls = SystemCalls();
  if (const auto first = std::ranges::find_if(calls, passes); first != calls.end()) {
    gaps.push_back(StrCat(first->name, " and ", std::ranges::count_if(calls, passes) - 1,
                          " other calls that no rule grants pass, as not each use of them comes to "
                          "a hook"));
  }
  return gaps;
}

std::vector<std::string_view> CallsAtHooks() {
  std::vector<std::string_view> all;
  for (const auto& calls : kAtHooks) all.insert(all.end(), calls.begin(), calls.end());
  std::ranges::sort(all);
  return all;
}

std::string DumpCalls(const ModuleRules& rules) {
  std::string text;
  if (const auto count = CountOf(rules.calls[kCallsOfMachine])) {
    text += StrCat("  calls: ", count, "\n");
  }
  if (const auto count = CountOf(rules.calls[kCallsOf32Bits])) {
    text += StrCat("  calls_of_32_bits: ", count, "\n");
  }
  if (~rules.cloneFlags != 0) text += StrCat("  clone_flags: ", rules.cloneFlags, "\n");
  return text;
}

}  // namespace Enforce
