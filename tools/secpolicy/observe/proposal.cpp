#include "proposal.h"

#include <sys/socket.h>

#include <algorithm>
#include <set>
#include <string_view>

#include "asked_rules.h"
#include "path_proposal.h"
#include "policy/call_set.h"
#include "text/format.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

using Observed = Observations::Observed;
using Policy::CallSet;
using Policy::CreationQuestion;
using Policy::FileQuestion;
using Policy::InstalledDomain;
using Policy::ParameterQuestion;
using Policy::Rule;
using Policy::RuleKind;
using Policy::WordsQuestion;
using Rules = std::vector<ProposedRule>;

// So many calls of a set stand for all of it.
constexpr std::ptrdiff_t kManyCalls = 5;

constexpr char kStartSet[] = "@start";

// Each of its calls is worth a line of its own.
constexpr std::string_view kNeverAsSet = "@privileged";

constexpr char kDatagramType[] = "2";

Rule Granting(RuleKind kind, const std::array<std::string, Policy::kMaxRuleWords>& words) {
  return {.kind = kind, .words = words, .verdict = true};
}

std::string TimesAndFirst(unsigned int count, const std::string& program) {
  return CountOf(count, "time") + ", first by " + program;
}

// ---- System calls

bool GrantsSet(const InstalledDomain& domain, const CallSet& set) {
  return std::ranges::all_of(set.members, [&](std::string_view call) {
    return IsGranted(WordsQuestion{.kind = RuleKind::kSyscall, .words = {std::string(call)}},
                     domain);
  });
}

std::vector<Observed> MissingCalls(const Observations& observations,
                                   const InstalledDomain& domain) {
  const CallSet& start = *Policy::FindCallSet(kStartSet);
  std::vector<Observed> calls;
  for (const Observed& each : observations.All()) {
    const auto* const asked = std::get_if<WordsQuestion>(&each.question);
    const bool isCall = asked != nullptr && asked->kind == RuleKind::kSyscall;
    if (isCall && !start.Has(asked->words[0]) && !IsGranted(each.question, domain)) {
      calls.push_back(each);
    }
  }
  return calls;
}

const std::string& NameOf(const Observed& call) {
  return std::get<WordsQuestion>(call.question).words[0];
}

// The set that most of the calls are in; null when none has many of them.
const CallSet* WidestSet(const std::vector<Observed>& calls) {
  const CallSet* widest = nullptr;
  std::ptrdiff_t most = kManyCalls - 1;
  for (const CallSet& set : Policy::CallSets()) {
    const auto count =
        std::ranges::count_if(calls, [&](const Observed& call) { return set.Has(NameOf(call)); });
    if (set.name == kNeverAsSet || count <= most) continue;
    widest = &set;
    most = count;
  }
  return widest;
}

std::string ReasonForSet(const CallSet& set, const std::vector<Observed>& calls) {
  std::string names;
  std::size_t count = 0;
  for (const Observed& call : calls) {
    if (!set.Has(NameOf(call))) continue;
    names += (names.empty() ? "" : " ") + NameOf(call);
    ++count;
  }
  return CountOf(count, "call") + ": " + names;
}

void ProposeCalls(Rules& rules, const Observations& observations, const InstalledDomain& domain) {
  if (!GrantsSet(domain, *Policy::FindCallSet(kStartSet))) {
    rules.push_back({.rule = Granting(RuleKind::kSyscall, {kStartSet}),
                     .reason = "what every program needs to start"});
  }
  std::vector<Observed> calls = MissingCalls(observations, domain);
  while (const CallSet* const set = WidestSet(calls)) {
    rules.push_back(
        {.rule = Granting(RuleKind::kSyscall, {set->name}), .reason = ReasonForSet(*set, calls)});
    std::erase_if(calls, [&](const Observed& call) { return set->Has(NameOf(call)); });
  }
  for (const Observed& call : calls) {
    rules.push_back({.rule = Granting(RuleKind::kSyscall, {NameOf(call)}),
                     .reason = TimesAndFirst(call.count, call.program)});
  }
}

// ---- Capabilities and checks

void ProposeCapabilities(Rules& rules, const Observations& observations,
                         const InstalledDomain& domain) {
  for (const Observed& each : observations.All()) {
    const auto* const asked = std::get_if<WordsQuestion>(&each.question);
    if (asked == nullptr || asked->kind != RuleKind::kCapability) continue;
    const auto wider = WiderCapability(*asked);
    if (IsGranted(each.question, domain) || (wider && observations.Has(*wider))) continue;
    rules.push_back({.rule = Granting(RuleKind::kCapability, asked->words),
                     .reason = TimesAndFirst(each.count, each.program)});
  }
}

bool HasCall(const Observations& observations, const char* call) {
  return observations.Has(WordsQuestion{.kind = RuleKind::kSyscall, .words = {call}});
}

bool IsPort(const std::string& check) { return check.ends_with("_port"); }

// Values of other checks are seldom the same the next time.
bool IsProposed(const std::string& check) {
  return IsPort(check) || check == "socket_family" || check == "set_uid" || check == "set_gid";
}

bool HasDatagrams(const Observations& observations) {
  return std::ranges::any_of(observations.All(), [](const Observed& each) {
    const auto* const asked = std::get_if<ParameterQuestion>(&each.question);
    return asked != nullptr && asked->check == "socket_type" && asked->number == kDatagramType;
  });
}

// A pair of local sockets takes their family, and beside a rule for that each local service could
// be reached: without rules for families it takes none.
bool HasPairsAlone(const Observations& observations) {
  const ParameterQuestion local = {.check = "socket_family", .number = std::to_string(AF_UNIX)};
  return HasCall(observations, "socketpair") && !observations.Has(local);
}

// True where a rule for the value would refuse the program what it was seen to do.
bool IsInTheWay(const std::string& check, const Observations& observations) {
  if (IsPort(check)) return HasDatagrams(observations);  // beside ports there is TCP alone
  if (check == "socket_family") return HasPairsAlone(observations);
  return check == "set_gid" && HasCall(observations, "setgroups");  // its groups are not seen
}

// A check that is open to an installed domain stays so. To wait at the kernel's choice of a port
// is asked by all who wait, and takes a line only beside other ports.
void ProposeChecks(Rules& rules, const Observations& observations, const InstalledDomain& domain) {
  const bool isNew = domain.rules.empty();
  for (const Observed& each : observations.All()) {
    const auto* const asked = std::get_if<ParameterQuestion>(&each.question);
    if (asked == nullptr || !IsProposed(asked->check)) continue;
    if (IsInTheWay(asked->check, observations)) continue;
    const Policy::Decision decision = Decide(each.question, domain);
    if (decision.granted && !(isNew && decision.isOpen)) continue;
    rules.push_back({.rule = Granting(RuleKind::kParameterCheck, {asked->check, asked->number}),
                     .reason = TimesAndFirst(each.count, each.program)});
  }
}

// ---- Labels

struct LabelUse {
  std::set<std::string> files;
  std::string first;
};

using LabelUses =
    std::map<std::pair<RuleKind, std::array<std::string, Policy::kMaxRuleWords>>, LabelUse>;

const char* WordOf(Policy::FileAccess access) {
  switch (access) {
    case Policy::FileAccess::kRead:
      return "read";
    case Policy::FileAccess::kWrite:
      return "write";
    case Policy::FileAccess::kExecute:
      return "execute";
    case Policy::FileAccess::kList:
      return "list";
    case Policy::FileAccess::kRemove:
      return "remove";
    case Policy::FileAccess::kTruncate:
      break;
  }
  return "truncate";
}

void Use(LabelUses& uses, RuleKind kind,
         const std::array<std::string, Policy::kMaxRuleWords>& words, const std::string& path) {
  LabelUse& use = uses[{kind, words}];
  if (use.files.empty()) use.first = path;
  use.files.insert(path);
}

void UseCreation(LabelUses& uses, const CreationQuestion& asked) {
  const std::string& label = asked.directoryLabel;
  if (!IsMeaningful(label, asked.labelIsBuiltIn)) return;
  if (asked.kind == RuleKind::kUnixSocketCreation) {
    return Use(uses, asked.kind, {label, asked.what}, asked.path);
  }
  Use(uses, asked.kind, {label, label, asked.what}, asked.path);
}

void ProposeLabels(Rules& rules, const Observations& observations, const InstalledDomain& domain) {
  LabelUses uses;
  for (const Observed& each : observations.All()) {
    if (IsGranted(each.question, domain)) continue;
    if (const auto* const file = std::get_if<FileQuestion>(&each.question)) {
      if (!IsMeaningful(file->label, file->labelIsBuiltIn)) continue;
      Use(uses, RuleKind::kObjectAccess, {file->label, WordOf(file->access)}, file->path);
    } else if (const auto* const creation = std::get_if<CreationQuestion>(&each.question)) {
      UseCreation(uses, *creation);
    }
  }
  for (const auto& [subject, use] : uses) {
    rules.push_back({.rule = Granting(subject.first, subject.second),
                     .reason = CountOf(use.files.size(), "file") + ", first " + use.first});
  }
}

std::string LineOf(const ProposedRule& proposed) {
  return proposed.rule.Text() + "   # " + Visible(proposed.reason);
}

}  // namespace

bool Observations::Has(const Policy::Question& question) const {
  return places.contains(TextOf(question));
}

bool Observations::Note(const Policy::Question& question, const std::string& program) {
  const auto [place, isNew] = places.emplace(TextOf(question), all.size());
  if (isNew) all.push_back({.question = question, .count = 0, .program = program});
  ++all[place->second].count;
  return isNew;
}

std::vector<std::string> Propose(const Observations& observations, const InstalledDomain& domain) {
  Rules rules;
  ProposeCalls(rules, observations, domain);
  ProposeCapabilities(rules, observations, domain);
  ProposeChecks(rules, observations, domain);
  ProposeLabels(rules, observations, domain);
  const Rules paths = ProposePaths(observations, domain, rules);
  rules.insert(rules.end(), paths.begin(), paths.end());
  std::vector<std::string> lines;
  lines.reserve(rules.size());
  for (const ProposedRule& each : rules) lines.push_back(LineOf(each));
  return lines;
}

}  // namespace SecPolicyCli
