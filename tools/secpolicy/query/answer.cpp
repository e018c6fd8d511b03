#include "answer.h"

#include "installed/installed_json.h"
#include "policy_dir.h"
#include "root.h"
#include "secpolicy/policy_root.h"
#include "terminal/color.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

using Policy::Decision;
using Policy::InstalledDomain;
using Policy::Rule;
using Policy::Vote;

std::string PlaceOf(const std::string& file, unsigned int line) {
  return OutsidePath(file) + ":" + std::to_string(line) + ": ";
}

std::string CiteOrigin(const LinuxHost::LabelOrigin& origin) {
  return PlaceOf(origin.file, origin.line) + origin.path + (origin.isTree ? "/* " : " ") +
         origin.label;
}

void WriteLine(std::ostream& output, const std::string& text) { output << Visible(text) << '\n'; }

// "yes: …" or "no: …"
void WriteVerdict(std::ostream& output, const std::string& text, bool isYes) {
  const std::string word = text.substr(0, text.find(':'));
  output << Painted{isYes ? Color::kGood : Color::kBad, word};
  WriteLine(output, text.substr(word.size()));
}

std::string AnswerText(const Question& question, const InstalledDomain& domain,
                       const Decision& decision) {
  const std::string asked = question.Text();
  if (!decision.IsAllowed()) return "no: " + domain.name + " may not " + asked;
  std::string yes = "yes: " + domain.name + " may " + asked;
  if (decision.refuses) return yes;
  return yes + ": it is " + TextOf(domain.level) + ", so nothing is refused to it" +
         (decision.granted ? "" : "; its rules would refuse this");
}

void WriteMissing(const InstalledDomain& domain, const Decision& decision, std::ostream& output) {
  if (decision.missing.empty()) return;
  const bool choice = decision.missing.size() > 1;
  WriteLine(output,
            "missing in " + OutsidePath(PolicyFileOf(domain)) + (choice ? ", one of:" : ":"));
  for (const Rule& rule : decision.missing) WriteLine(output, "  " + rule.Text());
}

bool IsAboutCreation(const Question& question) {
  return std::holds_alternative<Policy::CreationQuestion>(question.asked);
}

void WriteFile(const Question& question, std::ostream& output) {
  const FileFacts& file = *question.file;
  const std::string noun = IsAboutCreation(question) ? "directory: " : "file: ";
  if (!file.exists) {
    WriteLine(output, noun + "there is nothing at " + file.paths.front() + " under this root");
    return;
  }
  if (file.paths.size() > 1) WriteLine(output, noun + "leads to " + file.paths.back());
  const std::string whose = IsAboutCreation(question) ? "label of the directory: " : "label: ";
  if (file.label.empty()) {
    WriteLine(output, whose + "none");
    return;
  }
  WriteLine(output, whose + file.label + (file.labelIsInherited ? " (inherited)" : ""));
  if (file.labelOrigin) WriteLine(output, CiteOrigin(*file.labelOrigin));
}

// Why a check is passed that no rule speaks of.
void WriteOpen(const Question& question, const InstalledDomain& domain, std::ostream& output) {
  WriteLine(output, "no rule of " + domain.name + " grants a value of " + question.words.front() +
                        ", so all pass that none revokes");
}

Json FileToJson(const FileFacts& file) {
  Json label;
  if (!file.label.empty()) label = file.label;
  Json json = {{"exists", file.exists}, {"paths", file.paths}, {"label", label}};
  if (file.labelIsInherited) json["labelInherited"] = true;
  if (file.labelOrigin) {
    json["labelFile"] = file.labelOrigin->file;
    json["labelLine"] = file.labelOrigin->line;
  }
  return json;
}

// What a domain may do by: its first rule, its level, or nothing at all.
std::string ReasonOf(const InstalledDomain& domain, const Decision& decision) {
  if (!decision.granted) return std::string(TextOf(domain.level)) + ", so nothing is refused to it";
  if (decision.votes.empty()) return "no rule refuses it";
  return Cite(decision.votes.front().rule);
}

}  // namespace

// A domain that the early policy has as well has its full policy in the usual place.
std::string PolicyFileOf(const InstalledDomain& domain) {
  std::string file = DomainFile(domain.name, SecPolicy::kPolicyRoot);
  const std::string name = file.substr(file.rfind('/'));
  std::string elsewhere;
  for (const Rule& rule : domain.rules) {
    if (rule.origin.file == file) return file;
    if (rule.origin.file.ends_with(name)) elsewhere = rule.origin.file;
  }
  return elsewhere.empty() ? file : elsewhere;
}

std::string Cite(const Rule& rule) {
  const std::string place =
      rule.origin.file.empty() ? "(no policy file): " : PlaceOf(rule.origin.file, rule.origin.line);
  return place + rule.Text();
}

void WriteAnswer(const Question& question, const InstalledDomain& domain, const Decision& decision,
                 std::ostream& output) {
  WriteVerdict(output, AnswerText(question, domain, decision), decision.IsAllowed());
  for (const Vote& vote : decision.votes) {
    WriteLine(output, Cite(vote.rule));
    if (vote.instead) WriteLine(output, "  instead: " + vote.instead->Text());
  }
  if (decision.isOpen) WriteOpen(question, domain, output);
  WriteMissing(domain, decision, output);
  if (question.file) WriteFile(question, output);
}

void WriteAnswerLine(const InstalledDomain& domain, const Decision& decision,
                     std::ostream& output) {
  WriteLine(output, domain.name + ": " + ReasonOf(domain, decision));
}

Json QuestionToJson(const Question& question) {
  Json json = {{"action", question.form->action}, {"words", question.words}};
  if (question.file)
    json[IsAboutCreation(question) ? "directory" : "file"] = FileToJson(*question.file);
  return json;
}

Json AnswerToJson(const InstalledDomain& domain, const Decision& decision) {
  Json rules = Json::Array();
  Json missing = Json::Array();
  for (const Rule& rule : decision.missing) missing.Append(rule.Text());
  for (const Vote& vote : decision.votes) {
    Json rule = ToJson(vote.rule);
    if (vote.instead) rule["instead"] = vote.instead->Text();
    rules.Append(rule);
  }
  Json json = {{"domain", domain.name},
               {"level", TextOf(domain.level)},
               {"allowed", decision.IsAllowed()},
               {"granted", decision.granted}};
  if (decision.isOpen) json["open"] = true;
  json.Add({{"rules", rules}, {"missing", missing}, {"policyFile", PolicyFileOf(domain)}});
  return json;
}

Json WhyToJson(const Question& question, const InstalledDomain& domain, const Decision& decision) {
  Json json = {{"schema", "secpolicy.why/1"}, {"question", QuestionToJson(question)}};
  json.Add(AnswerToJson(domain, decision));
  return json;
}

}  // namespace SecPolicyCli
