#include "policy/decision.h"

#include <algorithm>
#include <iterator>
#include <string_view>
#include <utility>

namespace Policy {
namespace {

using Votes = std::vector<Vote>;

constexpr std::string_view kExecTransition = "exec";

// The access to an object that is the same as a permission.
const char* AccessOf(Permission permission) {
  if (permission == Permission::kRead) return "read";
  return permission == Permission::kWrite ? "write" : "execute";
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

// ---- Files

// A path rule is about the path and everything beneath it.
bool Covers(const std::string& rulePath, const std::string& path) {
  if (rulePath == path || rulePath == "/") return true;
  return path.starts_with(rulePath) && (rulePath.ends_with('/') || path[rulePath.size()] == '/');
}

// Of the rules around a path, the nearest one, which decides alone; null when there is none.
const Rule* FindNearest(const std::vector<const Rule*>& rules, const std::string& path) {
  const Rule* nearest = nullptr;
  for (const Rule* const rule : rules) {
    if (!Covers(rule->words[0], path)) continue;
    if (nearest == nullptr || rule->words[0].size() > nearest->words[0].size()) nearest = rule;
  }
  return nearest;
}

Vote PathVote(const Rule& rule, Permission permission) {
  Vote vote{.rule = rule, .instead = std::nullopt};
  if (rule.Permits().Has(permission)) return vote;
  vote.instead = rule;
  vote.instead->verdict = rule.Permits().With(permission);
  return vote;
}

Votes PathVotes(const FileQuestion& question, const InstalledDomain& domain) {
  Votes votes;
  std::vector<const Rule*> heard;
  const std::vector<const Rule*> rules = RulesOf(domain, RuleKind::kFilePath);
  for (const std::string& path : question.paths) {
    const Rule* const nearest = FindNearest(rules, path);
    if (nearest == nullptr || std::ranges::find(heard, nearest) != heard.end()) continue;
    heard.push_back(nearest);
    votes.push_back(PathVote(*nearest, question.permission));
  }
  return votes;
}

// What has the label that a granted transition names can be executed, which is how it happens.
Votes ExecVotes(const std::string& label, const InstalledDomain& domain) {
  return VotesOf(domain, RuleKind::kDomainTransition, [&](const Rule& rule) {
    return rule.Grants() && rule.words[0] == label && rule.words[2] == kExecTransition;
  });
}

Votes VotesOn(const FileQuestion& question, const InstalledDomain& domain) {
  Votes votes = PathVotes(question, domain);
  if (question.label.empty()) return votes;
  const std::string access = AccessOf(question.permission);
  Append(votes, VotesOf(domain, RuleKind::kObjectAccess, [&](const Rule& rule) {
           return rule.words[0] == question.label && rule.words[1] == access;
         }));
  if (question.permission == Permission::kExecute) {
    Append(votes, ExecVotes(question.label, domain));
  }
  return votes;
}

std::vector<Rule> MissingFor(const FileQuestion& question) {
  std::vector<Rule> missing = {{.kind = RuleKind::kFilePath,
                                .words = {question.paths.front()},
                                .verdict = Permissions().With(question.permission)}};
  if (question.label.empty() || question.labelIsBuiltIn) return missing;
  missing.push_back(
      Granting(RuleKind::kObjectAccess, {question.label, AccessOf(question.permission)}));
  return missing;
}

// ---- Domains

// Each rule is about another label: one that grants is enough.
Votes VotesOn(const EntryQuestion& question, const InstalledDomain& domain) {
  Votes votes = VotesOf(domain, RuleKind::kDomainTransition,
                        [&](const Rule& rule) { return rule.words[1] == question.domain; });
  const bool isGranted = std::ranges::any_of(votes, &Vote::Grants);
  if (isGranted) std::erase_if(votes, [](const Vote& vote) { return !vote.Grants(); });
  return votes;
}

std::vector<Rule> MissingFor(const EntryQuestion& question) {
  if (!question.ways.empty()) return question.ways;
  return {Granting(RuleKind::kDomainTransition,
                   {"OBJECT", question.domain, std::string(kExecTransition)})};
}

// ---- Parameter checks

Votes VotesOn(const ParameterQuestion& question, const InstalledDomain& domain) {
  const ParameterRange asked = ParseParameterRange(question.number, "");
  return VotesOf(domain, RuleKind::kParameterCheck, [&](const Rule& rule) {
    return rule.words[0] == question.check && rule.Range().Overlaps(asked);
  });
}

std::vector<Rule> MissingFor(const ParameterQuestion& question) {
  return {Granting(RuleKind::kParameterCheck, {question.check, question.number})};
}

// ---- The rest

Votes VotesOn(const WordsQuestion& question, const InstalledDomain& domain) {
  return VotesOf(domain, question.kind,
                 [&](const Rule& rule) { return rule.words == question.words; });
}

std::vector<Rule> MissingFor(const WordsQuestion& question) {
  return {Granting(question.kind, question.words)};
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
  Decision decision;
  decision.refuses = domain.level == Level::kEnforcing;
  decision.votes = std::visit([&](const auto& asked) { return VotesOn(asked, domain); }, question);
  if (decision.votes.empty()) {
    decision.missing = std::visit([](const auto& asked) { return MissingFor(asked); }, question);
    return decision;
  }
  decision.granted = std::ranges::all_of(decision.votes, &Vote::Grants);
  std::erase_if(decision.votes,
                [&](const Vote& vote) { return vote.Grants() != decision.granted; });
  return decision;
}

}  // namespace Policy
