#include "policy/decision.h"

#include <algorithm>
#include <iterator>
#include <sstream>
#include <string_view>
#include <utility>

#include "policy/call_set.h"
#include "policy/mention.h"

namespace Policy {
namespace {

using Votes = std::vector<Vote>;

constexpr std::string_view kExecTransition = "exec";

// An access to a file: the word of rules for its label, and the letter of rules for its path.
struct AccessForm {
  const char* word;
  Permission permission;
};

AccessForm FormOf(FileAccess access) {
  switch (access) {
    case FileAccess::kRead:
      return {"read", Permission::kRead};
    case FileAccess::kWrite:
      return {"write", Permission::kWrite};
    case FileAccess::kExecute:
      return {"execute", Permission::kExecute};
    case FileAccess::kList:
      return {"list", Permission::kRead};
    case FileAccess::kRemove:
      return {"remove", Permission::kWrite};
    case FileAccess::kTruncate:
      break;
  }
  return {"truncate", Permission::kWrite};
}

Rule Granting(RuleKind kind, const std::array<std::string, kMaxRuleWords>& words) {
  return {.kind = kind, .words = words, .verdict = true};
}

Vote VoteOf(const Rule& rule) {
  Vote vote{.rule = rule, .instead = std::nullopt};
  if (!rule.Grants()) vote.instead = Granting(rule.kind, rule.words);
  return vote;
}

// The votes of the rules of the kind that `isAsked` says yes to.
template <class IsAsked>
Votes VotesOf(const InstalledDomain& domain, RuleKind kind, IsAsked isAsked) {
  Votes votes;
  for (const Rule& rule : domain.rules) {
    if (rule.kind == kind && isAsked(rule)) votes.push_back(VoteOf(rule));
  }
  return votes;
}

void Append(Votes& votes, Votes more) {
  std::move(more.begin(), more.end(), std::back_inserter(votes));
}

// Of rules that disagree the one that refuses counts; where none speaks, those in `missing` do not.
Decision Settle(Votes votes, std::vector<Rule> missing) {
  Decision decision;
  if (votes.empty()) {
    decision.missing = std::move(missing);
    return decision;
  }
  decision.granted = std::ranges::all_of(votes, &Vote::Grants);
  std::erase_if(votes, [&](const Vote& vote) { return vote.Grants() != decision.granted; });
  decision.votes = std::move(votes);
  return decision;
}

// Where each vote is about something else that would do, one that grants is enough.
Votes AnyOf(Votes votes) {
  const bool isGranted = std::ranges::any_of(votes, &Vote::Grants);
  if (isGranted) std::erase_if(votes, [](const Vote& vote) { return !vote.Grants(); });
  return votes;
}

// ---- Files

// Of the rules around a path, the nearest one, which decides alone; null when there is none.
const Rule* FindNearest(const InstalledDomain& domain, const std::string& path) {
  const Rule* nearest = nullptr;
  for (const Rule* const rule : RulesOf(domain, RuleKind::kFilePath)) {
    if (!Covers(rule->words[0], path)) continue;
    if (nearest == nullptr || rule->words[0].size() > nearest->words[0].size()) nearest = rule;
  }
  return nearest;
}

Votes PathVotes(const std::string& path, Permission permission, const InstalledDomain& domain) {
  const Rule* const nearest = FindNearest(domain, path);
  if (nearest == nullptr) return {};
  Vote vote{.rule = *nearest, .instead = std::nullopt};
  if (nearest->Permits().Has(permission)) return {vote};
  vote.instead = *nearest;
  vote.instead->verdict = nearest->Permits().With(permission);
  return {vote};
}

Rule PermittingPath(const std::string& path, Permission permission) {
  return {.kind = RuleKind::kFilePath, .words = {path}, .verdict = Permissions().With(permission)};
}

// What has the label that a granted transition names can be executed, which is how it happens.
Votes ExecVotes(const std::string& label, const InstalledDomain& domain) {
  return VotesOf(domain, RuleKind::kDomainTransition, [&](const Rule& rule) {
    return rule.Grants() && rule.words[0] == label && rule.words[2] == kExecTransition;
  });
}

Decision DecideOn(const FileQuestion& question, const InstalledDomain& domain) {
  const auto [access, permission] = FormOf(question.access);
  Votes votes = PathVotes(question.path, permission, domain);
  std::vector<Rule> missing = {PermittingPath(question.path, permission)};
  if (question.label.empty()) return Settle(std::move(votes), std::move(missing));
  Append(votes, VotesOf(domain, RuleKind::kObjectAccess, [&, word = access](const Rule& rule) {
           return rule.words[0] == question.label && rule.words[1] == word;
         }));
  if (question.access == FileAccess::kExecute) Append(votes, ExecVotes(question.label, domain));
  if (!question.labelIsBuiltIn) {
    missing.push_back(Granting(RuleKind::kObjectAccess, {question.label, access}));
  }
  return Settle(std::move(votes), std::move(missing));
}

// A device is not made by writing to a directory.
bool IsDevice(const std::string& fileKind) {
  return fileKind == "char_device" || fileKind == "block_device";
}

Decision DecideOn(const CreationQuestion& question, const InstalledDomain& domain) {
  const std::string& label = question.directoryLabel;
  const bool isFile = question.kind == RuleKind::kFileCreation;
  Votes votes = PathVotes(question.path, Permission::kWrite, domain);
  std::vector<Rule> missing;
  if (IsDevice(question.what)) {
    std::erase_if(votes, &Vote::Grants);
  } else {
    missing.push_back(PermittingPath(question.path, Permission::kWrite));
  }
  Append(votes, AnyOf(VotesOf(domain, question.kind, [&](const Rule& rule) {
           return rule.words[0] == label && rule.words[isFile ? 2 : 1] == question.what;
         })));
  if (!label.empty() && !question.labelIsBuiltIn) {
    missing.push_back(isFile ? Granting(question.kind, {label, label, question.what})
                             : Granting(question.kind, {label, question.what}));
  }
  if (missing.empty()) {
    missing.push_back(Granting(question.kind, {"OBJECT", "NEWOBJECT", question.what}));
  }
  return Settle(std::move(votes), std::move(missing));
}

// ---- Domains

// Each rule is about another label: one that grants is enough.
Decision DecideOn(const EntryQuestion& question, const InstalledDomain& domain) {
  Votes votes = AnyOf(VotesOf(domain, RuleKind::kDomainTransition,
                              [&](const Rule& rule) { return rule.words[1] == question.domain; }));
  if (!question.ways.empty()) return Settle(std::move(votes), question.ways);
  return Settle(std::move(votes),
                {Granting(RuleKind::kDomainTransition,
                          {"OBJECT", question.domain, std::string(kExecTransition)})});
}

// ---- Parameter checks

// The bits of a mask that are asked for and of no granted rule.
std::uint64_t BitsWithoutGrant(std::uint64_t bits, const Votes& votes) {
  for (const Vote& vote : votes) {
    if (vote.Grants()) bits &= ~vote.rule.Range().first;
  }
  return bits;
}

std::string Hexadecimal(std::uint64_t number) {
  std::ostringstream text;
  text << "0x" << std::hex << number;
  return text.str();
}

// Without a value that is granted, all pass that none revokes.
bool IsOpen(const std::string& check, const InstalledDomain& domain) {
  return std::ranges::none_of(domain.rules, [&](const Rule& rule) {
    return rule.kind == RuleKind::kParameterCheck && rule.words[0] == check && rule.Grants();
  });
}

Decision Open() {
  Decision decision;
  decision.granted = true;
  decision.isOpen = true;
  return decision;
}

// All bits have to be of granted rules, and none of a revoked one.
Decision DecideOnMask(const ParameterQuestion& question, std::uint64_t number,
                      const InstalledDomain& domain) {
  const std::uint64_t bits = number & kMaskCheckBits;
  const Votes votes = VotesOf(domain, RuleKind::kParameterCheck, [&](const Rule& rule) {
    return rule.words[0] == question.check && (rule.Range().first & bits) != 0;
  });
  if (std::ranges::any_of(votes, [](const Vote& vote) { return !vote.Grants(); })) {
    return Settle(votes, {});
  }
  if (IsOpen(question.check, domain)) return Open();
  if (const std::uint64_t lacking = BitsWithoutGrant(bits, votes); lacking != 0) {
    return Settle({},
                  {Granting(RuleKind::kParameterCheck, {question.check, Hexadecimal(lacking)})});
  }
  Decision decision = Settle(votes, {});
  decision.granted = true;
  return decision;
}

Decision DecideOn(const ParameterQuestion& question, const InstalledDomain& domain) {
  const ParameterRange asked = ParseParameterRange(question.number, "");
  if (question.check == kMaskCheck) return DecideOnMask(question, asked.first, domain);
  Votes votes = VotesOf(domain, RuleKind::kParameterCheck, [&](const Rule& rule) {
    return rule.words[0] == question.check && rule.Range().Overlaps(asked);
  });
  if (votes.empty() && IsOpen(question.check, domain)) return Open();
  return Settle(std::move(votes),
                {Granting(RuleKind::kParameterCheck, {question.check, question.number})});
}

// ---- The rest

Decision DecideOn(const WordsQuestion& question, const InstalledDomain& domain) {
  const bool isCall = question.kind == RuleKind::kSyscall;
  Votes votes = VotesOf(domain, question.kind, [&](const Rule& rule) {
    return isCall ? SpeaksOfCall(rule.words[0], question.words[0]) : rule.words == question.words;
  });
  return Settle(std::move(votes), {Granting(question.kind, question.words)});
}

}  // namespace

std::vector<const Rule*> RulesOf(const InstalledDomain& domain, RuleKind kind) {
  std::vector<const Rule*> rules;
  for (const Rule& rule : domain.rules) {
    if (rule.kind == kind) rules.push_back(&rule);
  }
  return rules;
}

Decision Decide(const Question& question, const InstalledDomain& domain) {
  Decision decision =
      std::visit([&](const auto& asked) { return DecideOn(asked, domain); }, question);
  decision.refuses = domain.level == Level::kEnforcing;
  return decision;
}

}  // namespace Policy
