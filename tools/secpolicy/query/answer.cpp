#include "answer.h"

#include "installed/installed_json.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

std::string PlaceOf(const std::string& file, unsigned int line) {
  return file + ":" + std::to_string(line) + ": ";
}

// The rule behind its place, in the form that editors and grep know.
std::string Cite(const InstalledRule& rule) {
  const std::string place =
      rule.origin.file.empty() ? "(no policy file): " : PlaceOf(rule.origin.file, rule.origin.line);
  return place + rule.text;
}

std::string Cite(const LinuxHost::LabelOrigin& origin) {
  return PlaceOf(origin.file, origin.line) + origin.path + (origin.isTree ? "/* " : " ") +
         origin.label;
}

void WriteLine(std::ostream& output, const std::string& text) { output << Visible(text) << '\n'; }

std::string AnswerText(const Question& question, const InstalledDomain& domain,
                       const Decision& decision) {
  const std::string asked = question.Text();
  if (!decision.IsAllowed()) return "no: " + domain.name + " may not " + asked;
  std::string yes = "yes: " + domain.name + " may " + asked;
  if (decision.refuses) return yes;
  return yes + ": it is " + domain.level + ", so nothing is refused to it" +
         (decision.granted ? "" : "; its rules would refuse this");
}

void WriteMissing(const InstalledDomain& domain, const Decision& decision, std::ostream& output) {
  if (decision.missing.empty()) return;
  const bool choice = decision.missing.size() > 1;
  WriteLine(output, "missing in " + PolicyFileOf(domain) + (choice ? ", one of:" : ":"));
  for (const std::string& rule : decision.missing) WriteLine(output, "  " + rule);
}

void WriteFile(const AskedFile& file, std::ostream& output) {
  if (!file.exists) {
    WriteLine(output, "file: there is nothing at " + file.paths.front() + " under this root");
    return;
  }
  if (file.paths.size() > 1) WriteLine(output, "file: leads to " + file.paths.back());
  if (file.label.empty()) {
    WriteLine(output, "label: none");
    return;
  }
  WriteLine(output, "label: " + file.label + (file.labelIsInherited ? " (inherited)" : ""));
  if (file.labelOrigin) WriteLine(output, Cite(*file.labelOrigin));
}

Json FileToJson(const AskedFile& file) {
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

}  // namespace

void WriteAnswer(const Question& question, const InstalledDomain& domain, const Decision& decision,
                 std::ostream& output) {
  WriteLine(output, AnswerText(question, domain, decision));
  for (const Vote& vote : decision.votes) {
    WriteLine(output, Cite(vote.rule));
    if (!vote.grants) WriteLine(output, "  instead: " + vote.instead);
  }
  WriteMissing(domain, decision, output);
  if (question.file) WriteFile(*question.file, output);
}

void WriteAnswerLine(const InstalledDomain& domain, const Decision& decision,
                     std::ostream& output) {
  WriteLine(output, domain.name + ": " +
                        (decision.granted ? Cite(decision.votes.front().rule)
                                          : domain.level + ", so nothing is refused to it"));
}

Json QuestionToJson(const Question& question) {
  Json json = {{"action", question.form->action}, {"words", question.words}};
  if (question.file) json["file"] = FileToJson(*question.file);
  return json;
}

Json AnswerToJson(const InstalledDomain& domain, const Decision& decision) {
  Json rules = Json::Array();
  for (const Vote& vote : decision.votes) {
    Json rule = ToJson(vote.rule);
    if (!vote.grants) rule["instead"] = vote.instead;
    rules.Append(rule);
  }
  return {{"domain", domain.name},
          {"level", domain.level},
          {"allowed", decision.IsAllowed()},
          {"granted", decision.granted},
          {"rules", rules},
          {"missing", decision.missing},
          {"policyFile", PolicyFileOf(domain)}};
}

}  // namespace SecPolicyCli
