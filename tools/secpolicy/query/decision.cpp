#include "decision.h"

#include <algorithm>
#include <set>
#include <string_view>

#include "domain_file.h"
#include "installed/rule_words.h"
#include "policy/parameter_range.h"
#include "secpolicy/policy_root.h"

namespace SecPolicyCli {
namespace {

constexpr std::string_view kObjectRule = "-a";
constexpr std::string_view kTransitionRule = "-d";
constexpr std::string_view kParameterRule = "-p";
constexpr std::string_view kPathRule = "-r";
constexpr std::string_view kExecTransition = "exec";
constexpr char kExecLetter = 'x';
constexpr std::string_view kPermissionLetters = "rwx";
constexpr char kEnforcing[] = "enforcing";

// A rule of the domain, with its words.
struct ReadRule {
  const InstalledRule* rule;
  RuleWords words;

  bool Grants() const { return words.grant.value_or(false); }
};

std::vector<ReadRule> RulesOf(const InstalledDomain& domain, std::string_view keyword) {
  std::vector<ReadRule> rules;
  for (const InstalledRule& rule : domain.rules) {
    if (!rule.text.starts_with(keyword)) continue;
    rules.push_back({.rule = &rule, .words = SplitRule(rule.text)});
  }
  return rules;
}

std::string GrantText(std::string_view keyword, const std::vector<std::string>& words) {
  std::string text(keyword);
  for (const std::string& word : words) text += " " + word;
  return text + " grant";
}

Vote VoteOf(const ReadRule& rule) {
  Vote vote{.rule = *rule.rule, .grants = rule.Grants(), .instead = {}};
  if (!vote.grants) vote.instead = GrantText(rule.words.keyword, rule.words.words);
  return vote;
}

// The votes of the rules with this keyword that `isAsked` says yes to.
template <class IsAsked>
std::vector<Vote> VotesOf(const InstalledDomain& domain, std::string_view keyword,
                          IsAsked isAsked) {
  std::vector<Vote> votes;
  for (const ReadRule& rule : RulesOf(domain, keyword)) {
    if (isAsked(rule)) votes.push_back(VoteOf(rule));
  }
  return votes;
}

void Append(std::vector<Vote>& votes, std::vector<Vote> more) {
  std::move(more.begin(), more.end(), std::back_inserter(votes));
}

// ---- Files

// A path rule is about the path and everything beneath it.
bool Covers(const std::string& rulePath, const std::string& path) {
  if (rulePath == path || rulePath == "/") return true;
  return path.starts_with(rulePath) && (rulePath.ends_with('/') || path[rulePath.size()] == '/');
}

const ReadRule* FindNearest(const std::vector<ReadRule>& rules, const std::string& path) {
  const ReadRule* nearest = nullptr;
  for (const ReadRule& rule : rules) {
    const std::string& rulePath = rule.words.words.front();
    if (!Covers(rulePath, path)) continue;
    if (nearest == nullptr || rulePath.size() > nearest->words.words.front().size()) {
      nearest = &rule;
    }
  }
  return nearest;
}

Vote PathVote(const ReadRule& rule, char letter) {
  const std::string& permissions = rule.words.words.back();
  Vote vote{
      .rule = *rule.rule, .grants = permissions.find(letter) != std::string::npos, .instead = {}};
  if (vote.grants) return vote;
  vote.instead = rule.words.keyword + " " + rule.words.words.front() + " ";
  for (const char known : kPermissionLetters) {
    if (known == letter || permissions.find(known) != std::string::npos) vote.instead += known;
  }
  return vote;
}

// Of the path rules around a path, the nearest one decides.
std::vector<Vote> PathVotes(const Question& question, const InstalledDomain& domain) {
  std::vector<Vote> votes;
  const std::vector<ReadRule> rules = RulesOf(domain, kPathRule);
  std::set<const InstalledRule*> seen;
  for (const std::string& path : question.file->paths) {
    const ReadRule* const nearest = FindNearest(rules, path);
    if (nearest == nullptr || !seen.insert(nearest->rule).second) continue;
    votes.push_back(PathVote(*nearest, question.form->letter));
  }
  return votes;
}

// What has the label that a granted transition names can be executed, which is how it happens.
std::vector<Vote> ExecVotes(const std::string& label, const InstalledDomain& domain) {
  return VotesOf(domain, kTransitionRule, [&](const ReadRule& rule) {
    return rule.Grants() && rule.words.words.front() == label &&
           rule.words.words.back() == kExecTransition;
  });
}

std::vector<Vote> FileVotes(const Question& question, const InstalledDomain& domain) {
  std::vector<Vote> votes = PathVotes(question, domain);
  const std::string& label = question.file->label;
  if (label.empty()) return votes;
  const std::vector<std::string> words = {label, question.form->access};
  Append(votes, VotesOf(domain, kObjectRule,
                        [&](const ReadRule& rule) { return rule.words.words == words; }));
  if (question.form->letter == kExecLetter) Append(votes, ExecVotes(label, domain));
  return votes;
}

std::vector<std::string> MissingForFile(const Question& question) {
  const AskedFile& file = *question.file;
  std::vector<std::string> missing = {std::string(kPathRule) + " " + file.paths.front() + " " +
                                      question.form->letter};
  // A built-in label says nothing about what a file is for.
  if (file.label.empty() || file.labelIsBuiltIn) return missing;
  missing.push_back(GrantText(kObjectRule, {file.label, question.form->access}));
  return missing;
}

// ---- Domains

bool LeadsTo(const ReadRule& rule, const std::string& domain) {
  return rule.words.words.size() == 3 && rule.words.words[1] == domain;
}

// Each rule is about another label: one that grants is enough.
std::vector<Vote> EntryVotes(const std::string& target, const InstalledDomain& domain) {
  std::vector<Vote> votes =
      VotesOf(domain, kTransitionRule, [&](const ReadRule& rule) { return LeadsTo(rule, target); });
  const auto grants = [](const Vote& vote) { return vote.grants; };
  if (std::any_of(votes.begin(), votes.end(), grants)) {
    std::erase_if(votes, [](const Vote& vote) { return !vote.grants; });
  }
  return votes;
}

// The ways by which other domains enter.
std::vector<std::string> MissingForEntry(const std::string& target, const InstalledPolicy& policy) {
  std::set<std::string> missing;
  for (const InstalledDomain& domain : policy.domains) {
    for (const ReadRule& rule : RulesOf(domain, kTransitionRule)) {
      if (rule.Grants() && LeadsTo(rule, target)) missing.insert(rule.rule->text);
    }
  }
  if (missing.empty()) missing.insert(GrantText(kTransitionRule, {"OBJECT", target, "exec"}));
  return {missing.begin(), missing.end()};
}

// ---- Parameter checks

bool IsInRange(const RuleWords& rule, const std::string& number) {
  const auto asked = Policy::ParseParameterRange(number, "");
  const std::string last = rule.words.size() > 2 ? rule.words[2] : "";
  return Policy::ParseParameterRange(rule.words[1], last).Overlaps(asked);
}

std::vector<Vote> ParameterVotes(const Question& question, const InstalledDomain& domain) {
  return VotesOf(domain, kParameterRule, [&](const ReadRule& rule) {
    return rule.words.words.front() == question.words.front() &&
           IsInRange(rule.words, question.words.back());
  });
}

std::vector<Vote> AllVotes(const Question& question, const InstalledDomain& domain) {
  const std::string_view keyword = question.form->keyword;
  if (keyword == kPathRule) return FileVotes(question, domain);
  if (keyword == kTransitionRule) return EntryVotes(question.words.front(), domain);
  if (keyword == kParameterRule) return ParameterVotes(question, domain);
  return VotesOf(domain, keyword,
                 [&](const ReadRule& rule) { return rule.words.words == question.words; });
}

std::vector<std::string> MissingFor(const Question& question, const InstalledPolicy& policy) {
  const std::string_view keyword = question.form->keyword;
  if (keyword == kPathRule) return MissingForFile(question);
  if (keyword == kTransitionRule) return MissingForEntry(question.words.front(), policy);
  return {GrantText(keyword, question.words)};
}

}  // namespace

// What no rule speaks of is refused, and of rules that disagree the one that refuses counts.
Decision Decide(const Question& question, const InstalledDomain& domain,
                const InstalledPolicy& policy) {
  Decision decision;
  decision.refuses = domain.level == kEnforcing;
  decision.votes = AllVotes(question, domain);
  if (decision.votes.empty()) {
    decision.missing = MissingFor(question, policy);
    return decision;
  }
  const auto refuses = [](const Vote& vote) { return !vote.grants; };
  decision.granted = std::none_of(decision.votes.begin(), decision.votes.end(), refuses);
  std::erase_if(decision.votes, [&](const Vote& vote) { return vote.grants != decision.granted; });
  return decision;
}

// A domain that the early policy has as well has its full policy in the usual place.
std::string PolicyFileOf(const InstalledDomain& domain) {
  std::string file = DomainFile(domain.name, SecPolicy::kPolicyRoot);
  const std::string name = file.substr(file.rfind('/'));
  std::string elsewhere;
  for (const InstalledRule& rule : domain.rules) {
    if (rule.origin.file == file) return file;
    if (rule.origin.file.ends_with(name)) elsewhere = rule.origin.file;
  }
  return elsewhere.empty() ? file : elsewhere;
}

}  // namespace SecPolicyCli
