#include "report_json.h"

#include <array>
#include <cstdint>
#include <initializer_list>
#include <unordered_map>
#include <utility>

#include "query/question.h"
#include "report/answers.h"

namespace SecPolicyCli {
namespace {

using Policy::InstalledDomain;
using Policy::Rule;
using Policy::RuleKind;
using Policy::WordKind;

// The texts of the report, each once, by their places.
class Strings {
 public:
  Strings() { PlaceOf(""); }

  Json PlaceOf(const std::string& text) {
    const auto [place, isNew] = places.emplace(text, places.size());
    if (isNew) list.Append(text);
    return place->second;
  }

  Json Take() { return std::move(list); }

 private:
  std::unordered_map<std::string, std::size_t> places;
  Json list = Json::Array();
};

Json ListOf(std::initializer_list<Json> elements) {
  Json list = Json::Array();
  for (const Json& element : elements) list.Append(element);
  return list;
}

// ---- Rules, a column for each of their facts

struct RuleColumns {
  Json kind = Json::Array();
  Json words = Json::Array();  // kMaxRuleWords for each rule
  Json verdict = Json::Array();
  Json file = Json::Array();
  Json line = Json::Array();
  Json gone = Json::Array();  // the places of those rules
  Json answer = Json::Array();
  Json fate = Json::Array();
  Json how = Json::Array();
  std::size_t count = 0;

  void Add(const Rule& rule, unsigned int ofRule, Strings& strings) {
    kind.Append(static_cast<int>(rule.kind));
    for (const std::string& word : rule.words) words.Append(strings.PlaceOf(word));
    verdict.Append(strings.PlaceOf(TextOf(rule.verdict)));
    file.Append(strings.PlaceOf(rule.origin.file));
    line.Append(rule.origin.line);
    answer.Append(ofRule);
    if (rule.origin.isGone) gone.Append(count);
    ++count;
  }

  void Add(const DomainCoverage& coverage, Strings& strings) {
    for (const Enforce::RuleFate& ofRule : coverage.fates) {
      fate.Append(static_cast<int>(ofRule.fate));
      how.Append(strings.PlaceOf(ofRule.how));
    }
  }

  Json Take() {
    return {
        {"kind", std::move(kind)},     {"words", std::move(words)}, {"verdict", std::move(verdict)},
        {"file", std::move(file)},     {"line", std::move(line)},   {"gone", std::move(gone)},
        {"answer", std::move(answer)}, {"fate", std::move(fate)},   {"how", std::move(how)}};
  }
};

// ---- Answers of a domain

Json RulesToJson(const Answer& answer) {
  Json rules = Json::Array();
  for (const std::size_t place : answer.rules) rules.Append(place);
  return rules;
}

Json ToJson(const Answers& answers, Strings& strings) {
  Json list = Json::Array();
  for (const auto& [asked, answer] : answers) {
    list.Append(ListOf({strings.PlaceOf(asked), answer.granted ? 1 : 0, RulesToJson(answer)}));
  }
  return list;
}

// Most calls have their answer from the same few rules.
Json CallsToJson(const Answers& calls, Strings& strings) {
  std::vector<std::pair<const Answer*, Json>> groups;
  for (const auto& [call, answer] : calls) {
    auto group = groups.begin();
    while (group != groups.end() && *group->first != answer) ++group;
    if (group == groups.end()) group = groups.emplace(group, &answer, Json::Array());
    group->second.Append(strings.PlaceOf(call));
  }
  Json list = Json::Array();
  for (const auto& [answer, names] : groups) {
    list.Append(ListOf({names, answer->granted ? 1 : 0, RulesToJson(*answer)}));
  }
  return list;
}

Json CreationsToJson(const DomainAnswers& answers, Strings& strings) {
  Json list = Json::Array();
  for (const auto& [what, answer] : answers.creations) {
    list.Append(ListOf({strings.PlaceOf(what.first), strings.PlaceOf(what.second),
                        answer.granted ? 1 : 0, RulesToJson(answer)}));
  }
  return list;
}

// Numbers as texts: they have more digits than the page's numbers.
Json ChecksToJson(const DomainAnswers& answers, Strings& strings) {
  Json list = Json::Array();
  for (const auto& [check, ranges] : answers.checks) {
    Json pieces = Json::Array();
    for (const RangeAnswer& range : ranges) {
      pieces.Append(ListOf({std::to_string(range.first), std::to_string(range.last),
                            range.answer.granted ? 1 : 0, range.answer.isOpen ? 1 : 0,
                            RulesToJson(range.answer)}));
    }
    list.Append(ListOf({strings.PlaceOf(check), pieces}));
  }
  return list;
}

// ---- Questions

constexpr std::array kSays = {Say::kNothing, Say::kGrants, Say::kRefuses};

template <class Question>
Json SettlementOf(const Question& question) {
  Json table = Json::Array();
  for (const Say ofPath : kSays) {
    for (const Say ofLabel : kSays) {
      const Settled settled = Settle(question, ofPath, ofLabel);
      table.Append(
          ListOf({settled.granted ? 1 : 0, settled.byPath ? 1 : 0, settled.byLabel ? 1 : 0}));
    }
  }
  return table;
}

// What stands in a rule that is proposed for what is asked.
constexpr std::array kPlaceholders = {"{0}", "{1}", "{2}"};
constexpr char kLabelPlaceholder[] = "{label}";

Json MissingFor(const Policy::Question& question) {
  const Policy::Decision decision = Policy::Decide(question, {});
  Json rules = Json::Array();
  for (const Rule& rule : decision.missing) rules.Append(rule.Text());
  return rules;
}

Json FileToJson(const QuestionForm& form) {
  Policy::FileQuestion question{.access = form.access, .path = kPlaceholders[0], .label = {}};
  Json settled = SettlementOf(question);
  Json missing = MissingFor(question);
  question.label = kLabelPlaceholder;
  const Policy::Decision unknown = Policy::Decide(question, {});
  return {{"what", ""},
          {"word", unknown.missing.back().words[1]},
          {"settled", settled},
          {"missing", missing},
          {"missingWithLabel", MissingFor(question)}};
}

Json CreationToJson(const QuestionForm& form, const std::string& what) {
  Policy::CreationQuestion question{
      .kind = form.kind, .what = what, .path = kPlaceholders[0], .directoryLabel = {}};
  Json settled = SettlementOf(question);
  Json missing = MissingFor(question);
  question.directoryLabel = kLabelPlaceholder;
  return {{"what", what},
          {"word", what},
          {"settled", settled},
          {"missing", missing},
          {"missingWithLabel", MissingFor(question)}};
}

Json FilesToJson(const QuestionForm& form, const WordTables& words) {
  Json list = Json::Array();
  if (form.words.size() == 1) {
    list.Append(FileToJson(form));
    return list;
  }
  for (const std::string& what : words.at(form.words.back())) {
    list.Append(CreationToJson(form, what));
  }
  return list;
}

Json MissingWords(const QuestionForm& form) {
  if (form.kind == RuleKind::kDomainTransition) {
    return MissingFor(Policy::EntryQuestion{.domain = kPlaceholders[0], .ways = {}});
  }
  Policy::WordsQuestion question{.kind = form.kind, .words = {}};
  for (std::size_t word = 0; word < form.words.size(); ++word) {
    question.words.at(word) = kPlaceholders.at(word);
  }
  return MissingFor(question);
}

Json ToJson(const QuestionForm& form, const WordTables& words) {
  Json kinds = Json::Array();
  for (const WordKind kind : form.words) kinds.Append(FormOf(kind).plainNoun);
  Json json = {{"action", form.action},
               {"words", kinds},
               {"kind", static_cast<int>(form.kind)},
               {"access", static_cast<int>(form.access)}};
  const bool isAboutFile = form.words.front() == WordKind::kPath;
  if (isAboutFile) {
    json["files"] = FilesToJson(form, words);
  } else {
    json["missing"] = MissingWords(form);
  }
  return json;
}

// ---- The report

Json KindsToJson() {
  Json list = Json::Array();
  for (const Policy::RuleForm& form : Policy::kRuleForms) {
    Json words = Json::Array();
    for (const WordKind kind : form.Words()) words.Append(FormOf(kind).plainNoun);
    list.Append(
        {{"keyword", form.keyword}, {"name", form.name}, {"usage", form.usage}, {"words", words}});
  }
  return list;
}

Json ToJson(const InstalledDomain& domain, const DomainAnswers& answers, Strings& strings) {
  Policy::Decision anything = Policy::Decide(Policy::WordsQuestion{}, domain);
  return {{"name", strings.PlaceOf(domain.name)},
          {"id", domain.id},
          {"level", TextOf(domain.level)},
          {"refuses", anything.refuses},
          {"atRunTime", domain.IsCreatedAtRunTime()},
          {"gone", domain.isGone},
          {"count", domain.rules.size()},
          {"calls", CallsToJson(answers.calls, strings)},
          {"entries", ToJson(answers.entries, strings)},
          {"executions", ToJson(answers.executions, strings)},
          {"creations", CreationsToJson(answers, strings)},
          {"checks", ChecksToJson(answers, strings)}};
}

Json LabelsToJson(const std::vector<LinuxHost::LabelOrigin>& labels, Strings& strings) {
  Json list = Json::Array();
  for (const LinuxHost::LabelOrigin& line : labels) {
    list.Append(ListOf({strings.PlaceOf(line.path), line.isTree ? 1 : 0,
                        strings.PlaceOf(line.label), strings.PlaceOf(line.file), line.line}));
  }
  return list;
}

Json ObjectsToJson(const Policy::InstalledPolicy& policy, Strings& strings) {
  Json list = Json::Array();
  for (const auto& [name, id] : policy.objects) list.Append(ListOf({strings.PlaceOf(name), id}));
  return list;
}

Json FeaturesToJson(const ReportSource& source) {
  if (!source.coverage) return {};
  const Enforce::Features& features = source.coverage->features;
  return {{"landlock", features.landlock},
          {"seccomp", features.seccomp},
          {"seccompNotify", features.notifies}};
}

Json WordsToJson(const WordTables& tables) {
  Json json = Json::Object();
  for (const auto& [kind, words] : tables) json[FormOf(kind).plainNoun] = words;
  return json;
}

Json QuestionsToJson(const WordTables& words) {
  Json list = Json::Array();
  for (const QuestionForm& form : QuestionForms()) list.Append(ToJson(form, words));
  return list;
}

// What is said of a check that no rule of a domain speaks of.
bool PassesUnspoken(const std::string& check) {
  return Policy::Decide(Policy::ParameterQuestion{.check = check, .number = "0"}, {}).granted;
}

}  // namespace

Json ReportToJson(const ReportSource& source) {
  Strings strings;
  RuleColumns rules;
  Json domains = Json::Array();
  std::size_t place = 0;
  for (const InstalledDomain& domain : source.policy.domains) {
    const DomainAnswers answers = AnswersOf(domain, source.words.at(WordKind::kSyscall));
    for (std::size_t rule = 0; rule < domain.rules.size(); ++rule) {
      rules.Add(domain.rules[rule], answers.ofRules[rule], strings);
    }
    Json json = ToJson(domain, answers, strings);
    if (source.coverage) {
      const DomainCoverage& coverage = source.coverage->domains[place++];
      rules.Add(coverage, strings);
      json["gaps"] = coverage.gaps;
    }
    domains.Append(std::move(json));
  }
  Json report = {{"version", SECPOLICY_VERSION},
                 {"title", source.title},
                 {"policy", source.name},
                 {"kinds", KindsToJson()},
                 {"words", WordsToJson(source.words)},
                 {"questions", QuestionsToJson(source.words)},
                 {"maskCheck", std::string(Policy::kMaskCheck)},
                 {"passesUnspoken", PassesUnspoken(std::string(Policy::kMaskCheck))},
                 {"builtInLabels", source.builtInLabels},
                 {"features", FeaturesToJson(source)},
                 {"whyNoCoverage", source.whyNoCoverage},
                 {"against", source.against ? DiffToJson(*source.against) : Json()}};
  report.Add({{"domains", std::move(domains)},
              {"rules", rules.Take()},
              {"objects", ObjectsToJson(source.policy, strings)},
              {"labels", LabelsToJson(source.labels, strings)}});
  report.Add({{"strings", strings.Take()}});
  return report;
}

}  // namespace SecPolicyCli
