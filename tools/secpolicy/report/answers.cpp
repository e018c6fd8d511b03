#include "answers.h"

#include <algorithm>
#include <array>
#include <limits>
#include <optional>
#include <set>

namespace SecPolicyCli {
namespace {

using Policy::FileAccess;
using Policy::InstalledDomain;
using Policy::Rule;
using Policy::RuleKind;

constexpr std::array kAccesses = {FileAccess::kRead, FileAccess::kWrite,  FileAccess::kExecute,
                                  FileAccess::kList, FileAccess::kRemove, FileAccess::kTruncate};

constexpr std::uint64_t kGreatest = std::numeric_limits<std::uint64_t>::max();

// A domain with some rules of another. What it may be asked is what no other rule has a say in.
class Part {
 public:
  void Add(const Rule& rule, std::size_t place) {
    domain.rules.push_back(rule);
    places.emplace(rule, place);
  }

  bool IsGranted(const Policy::Question& question) const {
    return Policy::Decide(question, domain).granted;
  }

  Answer Ask(const Policy::Question& question) const {
    const Policy::Decision decision = Policy::Decide(question, domain);
    Answer answer{.granted = decision.granted, .isOpen = decision.isOpen, .rules = {}};
    for (const Policy::Vote& vote : decision.votes) answer.rules.push_back(places.at(vote.rule));
    return answer;
  }

  const std::vector<Rule>& Rules() const { return domain.rules; }

 private:
  InstalledDomain domain;
  std::map<Rule, std::size_t, Policy::BySubject> places;
};

// Rules that belong together, by what `keyOf` says of each; none where it says nothing.
template <class Key, class KeyOf>
std::map<Key, Part> Group(const InstalledDomain& domain, KeyOf keyOf) {
  std::map<Key, Part> parts;
  for (std::size_t place = 0; place < domain.rules.size(); ++place) {
    const Rule& rule = domain.rules[place];
    if (const std::optional<Key> key = keyOf(rule)) parts[*key].Add(rule, place);
  }
  return parts;
}

unsigned int AnswerOfPath(const Rule& rule) {
  const std::string& path = rule.words[0];
  Part alone;
  alone.Add(rule, 0);
  unsigned int answer = 0;
  for (const FileAccess access : kAccesses) {
    const Policy::FileQuestion question{.access = access, .path = path, .label = {}};
    if (alone.IsGranted(question)) answer |= 1U << static_cast<unsigned int>(access);
  }
  const Policy::CreationQuestion creation{.what = {}, .path = path, .directoryLabel = {}};
  return alone.IsGranted(creation) ? answer | kMakes : answer;
}

unsigned int AnswerOfRule(const Rule& rule) {
  switch (rule.kind) {
    case RuleKind::kFilePath:
      return AnswerOfPath(rule);
    case RuleKind::kObjectAccess:
    case RuleKind::kCapability:
    case RuleKind::kFileCreation:
    case RuleKind::kUnixSocketCreation: {
      Part alone;
      alone.Add(rule, 0);
      return alone.IsGranted(Policy::WordsQuestion{rule.kind, rule.words}) ? 1 : 0;
    }
    case RuleKind::kDomainTransition:
    case RuleKind::kParameterCheck:
    case RuleKind::kSyscall:
      break;
  }
  return 0;
}

using Key = std::optional<std::string>;

Key If(bool isSo, const std::string& word) { return isSo ? Key(word) : std::nullopt; }

Answers AnswerCalls(const InstalledDomain& domain, const std::vector<std::string>& calls) {
  const auto parts = Group<std::string>(
      domain, [](const Rule& rule) { return If(rule.kind == RuleKind::kSyscall, "calls"); });
  Answers answers;
  for (const auto& [all, part] : parts) {
    for (const std::string& call : calls) {
      Answer answer = part.Ask(Policy::WordsQuestion{RuleKind::kSyscall, {call}});
      if (!answer.rules.empty()) answers[call] = std::move(answer);
    }
  }
  return answers;
}

Answers AnswerEntries(const InstalledDomain& domain) {
  Answers answers;
  const auto byDomain = Group<std::string>(domain, [](const Rule& rule) {
    return If(rule.kind == RuleKind::kDomainTransition, rule.words[1]);
  });
  for (const auto& [name, part] : byDomain) {
    answers[name] = part.Ask(Policy::EntryQuestion{.domain = name, .ways = {}});
  }
  return answers;
}

// Transitions have a say in who may execute what has their label.
Answers AnswerExecutions(const InstalledDomain& domain) {
  std::set<std::string> named;
  for (const Rule& rule : domain.rules) {
    if (rule.kind == RuleKind::kDomainTransition) named.insert(rule.words[0]);
  }
  Answers answers;
  const auto byLabel = Group<std::string>(domain, [&](const Rule& rule) {
    const bool isOfLabel =
        rule.kind == RuleKind::kDomainTransition || rule.kind == RuleKind::kObjectAccess;
    return If(isOfLabel && named.contains(rule.words[0]), rule.words[0]);
  });
  for (const auto& [label, part] : byLabel) {
    Answer answer =
        part.Ask(Policy::FileQuestion{.access = FileAccess::kExecute, .path = {}, .label = label});
    if (!answer.rules.empty()) answers[label] = std::move(answer);
  }
  return answers;
}

auto AnswerCreations(const InstalledDomain& domain) {
  using What = std::pair<std::string, std::string>;
  const auto parts = Group<What>(domain, [](const Rule& rule) -> std::optional<What> {
    if (rule.kind != RuleKind::kFileCreation) return std::nullopt;
    return What{rule.words[0], rule.words[2]};
  });
  std::map<What, Answer> answers;
  for (const auto& [what, part] : parts) {
    answers[what] = part.Ask(
        Policy::CreationQuestion{.what = what.second, .path = {}, .directoryLabel = what.first});
  }
  return answers;
}

// ---- Parameter checks

Answer AskNumber(const Part& part, const std::string& check, std::uint64_t number) {
  return part.Ask(Policy::ParameterQuestion{.check = check, .number = std::to_string(number)});
}

// Between two bounds of ranges, all numbers have the same answer.
std::vector<RangeAnswer> AnswerNumbers(const std::string& check, const Part& part) {
  std::set<std::uint64_t> starts = {0};
  for (const Rule& rule : part.Rules()) {
    starts.insert(rule.Range().first);
    if (rule.Range().last != kGreatest) starts.insert(rule.Range().last + 1);
  }
  std::vector<RangeAnswer> answers;
  for (const std::uint64_t start : starts) {
    Answer answer = AskNumber(part, check, start);
    if (!answers.empty()) answers.back().last = start - 1;
    answers.push_back({.first = start, .last = kGreatest, .answer = std::move(answer)});
  }
  return answers;
}

std::vector<RangeAnswer> AnswerBits(const std::string& check, const Part& part) {
  std::vector<RangeAnswer> answers = {{.first = 0, .last = 0, .answer = AskNumber(part, check, 0)}};
  for (std::uint64_t bit = 1; bit != 0; bit <<= 1U) {
    if ((bit & Policy::kMaskCheckBits) == 0) continue;
    answers.push_back({.first = bit, .last = bit, .answer = AskNumber(part, check, bit)});
  }
  return answers;
}

auto AnswerChecks(const InstalledDomain& domain) {
  std::map<std::string, std::vector<RangeAnswer>> answers;
  const auto parts = Group<std::string>(domain, [](const Rule& rule) {
    return If(rule.kind == RuleKind::kParameterCheck, rule.words[0]);
  });
  for (const auto& [check, part] : parts) {
    answers[check] =
        check == Policy::kMaskCheck ? AnswerBits(check, part) : AnswerNumbers(check, part);
  }
  return answers;
}

// ---- What paths and labels say together

constexpr char kAnyPath[] = "/";
constexpr char kAnyLabel[] = "label";

// `question` is asked of a domain whose rules say this.
template <class Question>
Settled SettleBy(Question question, Say ofPath, Say ofLabel, RuleKind kind,
                 const std::array<std::string, Policy::kMaxRuleWords>& words) {
  InstalledDomain domain;
  if (ofPath != Say::kNothing) {
    const unsigned int bits = ofPath == Say::kGrants ? Policy::Permissions::kAllBits : 0;
    domain.rules.push_back(
        {.kind = RuleKind::kFilePath, .words = {kAnyPath}, .verdict = Policy::Permissions(bits)});
  }
  if (ofLabel != Say::kNothing) {
    domain.rules.push_back({.kind = kind, .words = words, .verdict = ofLabel == Say::kGrants});
  }
  question.path = kAnyPath;
  const Policy::Decision decision = Policy::Decide(question, domain);
  const auto isDecidedBy = [&](RuleKind wanted) {
    return std::ranges::any_of(decision.votes,
                               [=](const Policy::Vote& vote) { return vote.rule.kind == wanted; });
  };
  return {.granted = decision.granted,
          .byPath = isDecidedBy(RuleKind::kFilePath),
          .byLabel = isDecidedBy(kind)};
}

}  // namespace

DomainAnswers AnswersOf(const InstalledDomain& domain, const std::vector<std::string>& calls) {
  DomainAnswers answers{.ofRules = {},
                        .calls = AnswerCalls(domain, calls),
                        .entries = AnswerEntries(domain),
                        .executions = AnswerExecutions(domain),
                        .creations = AnswerCreations(domain),
                        .checks = AnswerChecks(domain)};
  answers.ofRules.reserve(domain.rules.size());
  for (const Rule& rule : domain.rules) answers.ofRules.push_back(AnswerOfRule(rule));
  return answers;
}

Settled Settle(const Policy::FileQuestion& question, Say ofPath, Say ofLabel) {
  Policy::FileQuestion asked = question;
  asked.label = kAnyLabel;
  // The word of rules for labels is that of the one that would grant it.
  const Policy::Decision unknown = Policy::Decide(asked, {});
  return SettleBy(asked, ofPath, ofLabel, RuleKind::kObjectAccess, unknown.missing.back().words);
}

Settled Settle(const Policy::CreationQuestion& question, Say ofPath, Say ofLabel) {
  Policy::CreationQuestion asked = question;
  asked.directoryLabel = kAnyLabel;
  const bool isFile = asked.kind == RuleKind::kFileCreation;
  return SettleBy(asked, ofPath, ofLabel, asked.kind,
                  isFile ? std::array<std::string, 3>{kAnyLabel, kAnyLabel, asked.what}
                         : std::array<std::string, 3>{kAnyLabel, asked.what, ""});
}

}  // namespace SecPolicyCli
