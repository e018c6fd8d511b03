#include "question.h"

#include <unistd.h>

#include <algorithm>
#include <map>

#include "host/linux/operation/file_label.h"
#include "installed/real_path.h"
#include "policy/parameter_range.h"
#include "text/suggestion.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;
using enum QuestionWord;
using SecPolicy::TeskAccessInterfaceImpl;
using TeskCtl::Security::TeskAccess_KeywordType;

// A table that is told as a whole when no word of it is near.
constexpr std::size_t kShortTable = 10;

struct WordKind {
  const char* noun;
  std::optional<TeskAccess_KeywordType> table;
};

const WordKind& KindOf(QuestionWord word) {
  static const std::map<QuestionWord, WordKind> kinds = {
      {kPath, {"path", std::nullopt}},
      {kSyscall, {"system call", TeskCtl::Security::TESKACCESS_KEYWORD_SYSCALL}},
      {kCapability, {"capability", TeskCtl::Security::TESKACCESS_KEYWORD_CAPABILITY}},
      {kObject, {"object", TeskCtl::Security::TESKACCESS_KEYWORD_LABEL}},
      {kObjectAccess, {"kind of access", TeskCtl::Security::TESKACCESS_KEYWORD_OBJECT_ACCESS}},
      {kDomain, {"domain", std::nullopt}},
      {kFileKind, {"kind of file", TeskCtl::Security::TESKACCESS_KEYWORD_FILE_CREATION}},
      {kSocketKind, {"kind of socket", TeskCtl::Security::TESKACCESS_KEYWORD_UNIX_SOCK_CREATION}},
      {kParameterCheck, {"parameter check", TeskCtl::Security::TESKACCESS_KEYWORD_PARAM_CHECK}},
      {kNumber, {"number", std::nullopt}},
  };
  return kinds.at(word);
}

std::vector<std::string> DomainNames(const InstalledPolicy& policy) {
  std::vector<std::string> names;
  for (const InstalledDomain& domain : policy.domains) names.push_back(domain.name);
  return names;
}

// The words that can stand there. The name of a domain is a label, too.
std::vector<std::string> KnownWords(QuestionWord word, const InstalledPolicy& policy,
                                    TeskAccessInterfaceImpl& access) {
  std::vector<std::string> known;
  if (word == kDomain || word == kObject) known = DomainNames(policy);
  if (const auto table = KindOf(word).table) {
    for (const auto& [name, id] : access.GetKeywordsMap(*table)) known.push_back(name);
  }
  return known;
}

[[noreturn]] void RefuseWord(const std::string& noun, const std::string& word,
                             const std::vector<std::string>& known) {
  std::string text = "there is no " + noun + " '" + word + "'";
  const std::string nearest = NearestWord(word, known);
  if (!nearest.empty()) throw QuestionError(text + "; did you mean '" + nearest + "'?");
  if (known.size() <= kShortTable) {
    const char* separator = "; there are ";
    for (const std::string& other : known) {
      text += separator + other;
      separator = ", ";
    }
  }
  throw QuestionError(text);
}

void RequirePath(const std::string& path) {
  if (path.starts_with('/')) return;
  throw QuestionError("'" + path + "' is no path from the root on: it begins with a slash");
}

void RequireNumber(const std::string& word) {
  try {
    Policy::ParseParameterRange(word, "");
  } catch (const BraxoException&) {
    throw QuestionError("'" + word + "' is not an unsigned number, decimal or hexadecimal with 0x");
  }
}

void RequireWord(QuestionWord kind, const std::string& word, const InstalledPolicy& policy,
                 TeskAccessInterfaceImpl& access) {
  if (kind == kPath) return RequirePath(word);
  if (kind == kNumber) return RequireNumber(word);
  const std::vector<std::string> known = KnownWords(kind, policy, access);
  if (std::find(known.begin(), known.end(), word) == known.end()) {
    RefuseWord(KindOf(kind).noun, word, known);
  }
}

const QuestionForm& FormOf(const std::string& action) {
  std::vector<std::string> actions;
  for (const QuestionForm& form : QuestionForms()) {
    if (form.action == action) return form;
    actions.emplace_back(form.action);
  }
  RefuseWord("question", action, actions);
}

std::string WithoutTrailingSlashes(std::string path) {
  while (path.size() > 1 && path.ends_with('/')) path.pop_back();
  return path;
}

// The line for the nearest directory that gave the file the label that it inherits.
std::optional<LinuxHost::LabelOrigin> FindOriginAbove(const AskedFile& file) {
  std::string path = file.paths.back();
  while (path.size() > 1) {
    path.resize(std::max<std::size_t>(path.rfind('/'), 1));
    auto origin = LinuxHost::FindLabelOrigin(path);
    if (origin && origin->label == file.label) return origin;
  }
  return std::nullopt;
}

// The line for one of the paths that gave the label that the file has now.
std::optional<LinuxHost::LabelOrigin> FindOriginOf(const AskedFile& file) {
  for (const std::string& path : file.paths) {
    auto origin = LinuxHost::FindLabelOrigin(path);
    if (origin && origin->label == file.label) return origin;
  }
  return file.labelIsInherited ? FindOriginAbove(file) : std::nullopt;
}

AskedFile ExamineFile(const std::string& asked, TeskAccessInterfaceImpl& access) {
  AskedFile file;
  file.paths.push_back(WithoutTrailingSlashes(asked));
  const std::string resolved = RealPathOf(file.paths.front());
  if (resolved.empty()) return file;
  file.exists = true;
  if (resolved != file.paths.front()) file.paths.push_back(resolved);
  try {
    file.label = SecPolicy::GetFileLabel(resolved, access);
  } catch (const BraxoException&) {
    return file;
  }
  const auto label = LinuxHost::ReadLabel(resolved.c_str());
  file.labelIsInherited = label && label->isInherited;
  file.labelIsBuiltIn =
      access.IsPredefinedLabel(file.label, TeskCtl::Security::TESKACCESS_LABEL_OBJECT);
  file.labelOrigin = FindOriginOf(file);
  return file;
}

}  // namespace

std::span<const QuestionForm> QuestionForms() {
  static const std::vector<QuestionForm> forms = {
      {"read", "PATH", {kPath}, "-r", 'r', "read"},
      {"write", "PATH", {kPath}, "-r", 'w', "write"},
      {"exec", "PATH", {kPath}, "-r", 'x', "execute"},
      {"call", "SYSCALL", {kSyscall}, "-s"},
      {"use", "CAPABILITY", {kCapability}, "-c"},
      {"access", "OBJECT KIND", {kObject, kObjectAccess}, "-a"},
      {"enter", "DOMAIN", {kDomain}, "-d"},
      {"create", "OBJECT NEWOBJECT KIND", {kObject, kObject, kFileKind}, "-f"},
      {"create-socket", "OBJECT KIND", {kObject, kSocketKind}, "-u"},
      {"pass", "CHECK NUMBER", {kParameterCheck, kNumber}, "-p"},
  };
  return forms;
}

std::string Question::Text() const {
  std::string text = form->action;
  for (const std::string& word : words) text += " " + word;
  return text;
}

Question ReadQuestion(const std::vector<std::string>& words, const InstalledPolicy& policy,
                      TeskAccessInterfaceImpl& access) {
  const QuestionForm& form = FormOf(words.front());
  if (words.size() != form.words.size() + 1) {
    throw QuestionError(std::string("write: ") + form.action + " " + form.usage);
  }
  Question question;
  question.form = &form;
  question.words.assign(words.begin() + 1, words.end());
  for (std::size_t index = 0; index < form.words.size(); ++index) {
    RequireWord(form.words[index], question.words[index], policy, access);
  }
  if (form.words.front() == kPath) question.file = ExamineFile(question.words.front(), access);
  return question;
}

const InstalledDomain& FindAskedDomain(const std::string& name, const InstalledPolicy& policy) {
  for (const InstalledDomain& domain : policy.domains) {
    if (domain.name == name) return domain;
  }
  RefuseWord("domain", name, DomainNames(policy));
}

}  // namespace SecPolicyCli
