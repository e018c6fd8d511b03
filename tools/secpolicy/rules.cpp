#include <algorithm>
#include <array>
#include <iostream>
#include <memory>
#include <string>
#include <vector>

#include "command_line.h"
#include "ending.h"
#include "installed/installed_json.h"
#include "installed/installed_policy.h"
#include "policy/mention.h"
#include "query/answer.h"
#include "query/ask.h"
#include "query/named.h"
#include "query/question.h"
#include "text/format.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

using Policy::WordKind;
using SecPolicy::TeskAccessInterfaceImpl;

// Something that rules may speak of.
struct Subject {
  WordKind kind;
  std::string word;
};

// By which option it is named.
struct SubjectOption {
  const char* name;
  const char* value;
  const char* meaning;
  WordKind kind;
};

constexpr SubjectOption kOptions[] = {
    {"--label", "LABEL", "Rules for an object label, by its name or its number, or for a domain",
     WordKind::kLabel},
    {"--path", "PATH", "Rules for a path, for directories above it, and for the label of the file",
     WordKind::kPath},
    {"--call", "CALL", "Rules for a system call, and for the sets that it is in",
     WordKind::kSyscall},
    {"--capability", "CAPABILITY", "Rules for a capability", WordKind::kCapability},
};

// A rule, and whose it is.
struct Found {
  const Policy::InstalledDomain& domain;
  const Policy::Rule& rule;
};

// A file is spoken of by all its paths and by its label.
std::vector<Subject> SubjectsOfFile(const std::string& path, TeskAccessInterfaceImpl& access) {
  RequirePath(path);
  const FileFacts file = ExamineFile(WithoutTrailingSlashes(path), access);
  std::vector<Subject> subjects;
  for (const std::string& each : file.paths) subjects.push_back({WordKind::kPath, each});
  if (!file.label.empty() && !file.labelIsBuiltIn) {
    subjects.push_back({WordKind::kLabel, file.label});
  }
  return subjects;
}

// The name of a domain is a label, and transitions have it as their end.
std::vector<Subject> SubjectsOfLabel(const std::string& word, TeskAccessInterfaceImpl& access) {
  unsigned int id = 0;
  const std::string name = access.FindDomain(word, &id) ? word : FindObject(word, access);
  return {{WordKind::kLabel, name}, {WordKind::kDomain, name}};
}

std::vector<Subject> ReadSubjects(WordKind kind, const std::string& word,
                                  TeskAccessInterfaceImpl& access) {
  if (kind == WordKind::kPath) return SubjectsOfFile(word, access);
  if (kind == WordKind::kLabel) return SubjectsOfLabel(word, access);
  return {{kind, FindWord(kind, word, access)}};
}

std::vector<Found> Find(const Policy::InstalledPolicy& policy,
                        const std::vector<Subject>& subjects) {
  std::vector<Found> found;
  for (const Policy::InstalledDomain& domain : policy.domains) {
    for (const Policy::Rule& rule : domain.rules) {
      const bool isAbout = std::ranges::any_of(subjects, [&](const Subject& subject) {
        return SpeaksOf(rule, subject.kind, subject.word);
      });
      if (isAbout) found.push_back(Found{domain, rule});
    }
  }
  return found;
}

void WriteText(const std::vector<Found>& found) {
  for (const auto& [domain, rule] : found) {
    std::cout << Visible(domain.name + ": " + Cite(rule)) << '\n';
  }
}

void WriteJson(const std::vector<Found>& found) {
  Json rules = Json::Array();
  for (const auto& [domain, rule] : found) {
    Json json = {{"domain", domain.name}};
    json.Add(ToJson(rule));
    rules.Append(json);
  }
  std::cout << Json{{"schema", "secpolicy.rules/1"}, {"rules", rules}}.Text();
}

// What was given for each option; empty for those that were not.
using Words = std::array<std::string, std::size(kOptions)>;

ExitCode Answer(const Words& words, const std::string& format) {
  if (std::ranges::count(words, "") + 1 != static_cast<std::ptrdiff_t>(words.size())) {
    throw QuestionError("give one of --label, --path, --call and --capability");
  }
  const auto given = static_cast<std::size_t>(std::ranges::find_if_not(words, &std::string::empty) -
                                              words.begin());
  TeskAccessInterfaceImpl access;
  const std::vector<Subject> subjects = ReadSubjects(kOptions[given].kind, words[given], access);
  const Policy::InstalledPolicy policy = ReadInstalledPolicy(access);
  const std::vector<Found> found = Find(policy, subjects);
  (format == "json" ? WriteJson : WriteText)(found);
  Summarize("rules", CountOf(found.size(), "rule"));
  return found.empty() ? kFailed : kWell;
}

Action Define(Syntax& syntax) {
  const auto words = std::make_shared<Words>();
  for (std::size_t index = 0; index < std::size(kOptions); ++index) {
    const SubjectOption& option = kOptions[index];
    syntax.AddOption(option.name, (*words)[index], option.meaning).NameValue(option.value);
  }
  const auto format = AddAnswerFormat(syntax);
  return [=] { return Ask("rules", [=] { return Answer(*words, *format); }); };
}

}  // namespace

const Verb kRules = {
    "rules",
    "Find the installed rules that speak of a label, a path or a system call",
    "Prints the rules of all domains that grant or revoke something of it, each with its domain,\n"
    "policy file and line. Which of them decides is what 'why' says. Exit status: 0 there are "
    "some,\n"
    "1 there are none, 2 a word is not known.\n"
    "\n"
    "Examples:\n"
    "  secpolicy rules --label sshKey\n"
    "  secpolicy rules --path /etc/ssh/host_key\n"
    "  secpolicy rules --call mount --format json | jq -r '.rules[] | select(.grant) | .domain'",
    Define,
    nullptr,
    true};

}  // namespace SecPolicyCli
