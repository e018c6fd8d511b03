#include "question.h"

#include <unistd.h>

#include <algorithm>
#include <utility>

#include "host/linux/operation/file_label.h"
#include "host/linux/operation/state_use.h"
#include "query/named.h"
#include "text/suggestion.h"
#include "zorvan/kernel.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;
using LinuxHost::LabelOrigin;
using Policy::FileAccess;
using Policy::RuleKind;
using Policy::WordKind;
using SecPolicy::TeskAccessInterfaceImpl;

// A table that is told as a whole when no word of it is near.
constexpr std::size_t kShortTable = 16;

const std::string kCapabilityPrefix = "cap_";

bool CanBeDomain(WordKind kind) { return kind == WordKind::kDomain || kind == WordKind::kLabel; }

bool IsKnown(WordKind kind, const std::string& word, TeskAccessInterfaceImpl& access) {
  unsigned int id = 0;
  if (CanBeDomain(kind) && access.FindDomain(word, &id)) return true;
  const auto& table = FormOf(kind).table;
  return table && access.GetKeywordsMap(*table).contains(word);
}

std::vector<std::string> DomainNames(TeskAccessInterfaceImpl& access) {
  std::vector<std::string> names;
  for (const auto& domain : Policy::ListDomains(access)) names.push_back(domain.name);
  return names;
}

}  // namespace

std::vector<std::string> KnownWords(WordKind kind, TeskAccessInterfaceImpl& access) {
  std::vector<std::string> known;
  if (CanBeDomain(kind)) known = DomainNames(access);
  if (const auto& table = FormOf(kind).table) {
    for (const auto& [name, id] : access.GetKeywordsMap(*table)) known.push_back(name);
  }
  return known;
}

void RefuseWord(const std::string& noun, const std::string& word,
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

namespace {

void RequireNumber(const std::string& word) {
  try {
    Policy::ParseParameterRange(word, "");
  } catch (const BraxoException&) {
    throw QuestionError("'" + word + "' is not an unsigned number, decimal or hexadecimal with 0x");
  }
}

}  // namespace

std::string FindWord(WordKind kind, const std::string& word, TeskAccessInterfaceImpl& access) {
  if (kind == WordKind::kDomain) return FindDomain(word, access).name;
  if (IsKnown(kind, word, access)) return word;
  if (kind == WordKind::kLabel) {
    if (const auto name = FindObjectByNumber(word, access)) return *name;
  }
  std::vector<std::string> known = KnownWords(kind, access);
  if (kind == WordKind::kCapability && !word.starts_with(kCapabilityPrefix)) {
    std::string name = kCapabilityPrefix + word;
    if (IsKnown(kind, name, access)) return name;
    for (std::string& other : known) other.erase(0, kCapabilityPrefix.size());
  }
  RefuseWord(FormOf(kind).plainNoun, word, known);
}

namespace {

std::string ReadWord(WordKind kind, const std::string& word, TeskAccessInterfaceImpl& access) {
  if (kind != WordKind::kPath && kind != WordKind::kNumber) return FindWord(kind, word, access);
  kind == WordKind::kPath ? RequirePath(word) : RequireNumber(word);
  return word;
}

const QuestionForm& FindForm(const std::string& action) {
  std::vector<std::string> actions;
  for (const QuestionForm& form : QuestionForms()) {
    if (form.action == action) return form;
    actions.emplace_back(form.action);
  }
  RefuseWord("question", action, actions);
}

}  // namespace

std::string WithoutTrailingSlashes(std::string path) {
  while (path.size() > 1 && path.ends_with('/')) path.pop_back();
  return path;
}

namespace {

// The path that it resolves to; empty when it leads nowhere.
std::string RealPathOf(const std::string& path) {
  SecPolicy::TeskAccess_FileRule resolved{};
  const bool found = path.size() < sizeof resolved.path &&
                     Zorvan::Kernel::RealPath(path.c_str(), resolved.path) == 0;
  return found ? resolved.path : "";
}

std::string DirectoryOf(const std::string& path) {
  const std::size_t slash = path.rfind('/');
  return slash == 0 ? "/" : path.substr(0, slash);
}

// The line for the nearest directory that gave the file the label that it inherits.
std::optional<LabelOrigin> FindOriginAbove(const FileFacts& file) {
  std::string path = file.paths.back();
  while (path.size() > 1) {
    path = DirectoryOf(path);
    auto origin = LinuxHost::FindLabelOrigin(LinuxHost::CurrentState(), path);
    if (origin && origin->label == file.label) return origin;
  }
  return std::nullopt;
}

// The line for one of the paths that gave the label that the file has now.
std::optional<LabelOrigin> FindOriginOf(const FileFacts& file) {
  for (const std::string& path : file.paths) {
    auto origin = LinuxHost::FindLabelOrigin(LinuxHost::CurrentState(), path);
    if (origin && origin->label == file.label) return origin;
  }
  return file.labelIsInherited ? FindOriginAbove(file) : std::nullopt;
}

}  // namespace

FileFacts ExamineFile(const std::string& path, TeskAccessInterfaceImpl& access) {
  FileFacts file;
  file.paths = {path};
  const std::string resolved = RealPathOf(path);
  if (resolved.empty()) return file;
  file.exists = true;
  if (resolved != path) file.paths.push_back(resolved);
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

namespace {

std::string JoinPath(const std::string& directory, const std::string& name) {
  return (directory == "/" ? "" : directory) + "/" + name;
}

void AskAboutFile(Question& question, TeskAccessInterfaceImpl& access) {
  question.file = ExamineFile(WithoutTrailingSlashes(question.words.front()), access);
  const FileFacts& file = *question.file;
  question.asked = Policy::FileQuestion{.access = question.form->access,
                                        .path = file.paths.back(),
                                        .label = file.label,
                                        .labelIsBuiltIn = file.labelIsBuiltIn};
}

void AskAboutCreation(Question& question, TeskAccessInterfaceImpl& access) {
  const std::string path = WithoutTrailingSlashes(question.words.front());
  question.file = ExamineFile(DirectoryOf(path), access);
  const FileFacts& directory = *question.file;
  question.asked = Policy::CreationQuestion{
      .kind = question.form->kind,
      .what = question.words.back(),
      .path = JoinPath(directory.paths.back(), path.substr(path.rfind('/') + 1)),
      .directoryLabel = directory.label,
      .labelIsBuiltIn = directory.labelIsBuiltIn};
}

// What rules are asked by a question that is about no file.
Policy::Question AskRules(const Question& question, TeskAccessInterfaceImpl& access) {
  const std::vector<std::string>& words = question.words;
  if (question.form->kind == RuleKind::kDomainTransition) {
    return Policy::EntryQuestion{.domain = words[0],
                                 .ways = Policy::ReadTransitionsInto(words[0], access)};
  }
  if (question.form->kind == RuleKind::kParameterCheck) {
    return Policy::ParameterQuestion{.check = words[0], .number = words[1]};
  }
  Policy::WordsQuestion asked{.kind = question.form->kind, .words = {}};
  std::copy(words.begin(), words.end(), asked.words.begin());
  return asked;
}

}  // namespace

std::span<const QuestionForm> QuestionForms() {
  using enum WordKind;
  static const std::vector<QuestionForm> forms = {
      {"read", "PATH", {kPath}, RuleKind::kFilePath, FileAccess::kRead},
      {"write", "PATH", {kPath}, RuleKind::kFilePath, FileAccess::kWrite},
      {"exec", "PATH", {kPath}, RuleKind::kFilePath, FileAccess::kExecute},
      {"list", "PATH", {kPath}, RuleKind::kFilePath, FileAccess::kList},
      {"remove", "PATH", {kPath}, RuleKind::kFilePath, FileAccess::kRemove},
      {"truncate", "PATH", {kPath}, RuleKind::kFilePath, FileAccess::kTruncate},
      {"make", "PATH KIND", {kPath, kFileKind}, RuleKind::kFileCreation},
      {"make-socket", "PATH KIND", {kPath, kSocketKind}, RuleKind::kUnixSocketCreation},
      {"call", "SYSCALL", {kSyscall}, RuleKind::kSyscall},
      {"use", "CAPABILITY", {kCapability}, RuleKind::kCapability},
      {"access", "OBJECT KIND", {kLabel, kObjectAccess}, RuleKind::kObjectAccess},
      {"enter", "DOMAIN", {kDomain}, RuleKind::kDomainTransition},
      {"create", "OBJECT NEWOBJECT KIND", {kLabel, kLabel, kFileKind}, RuleKind::kFileCreation},
      {"create-socket", "OBJECT KIND", {kLabel, kSocketKind}, RuleKind::kUnixSocketCreation},
      {"pass", "CHECK NUMBER", {kParameterCheck, kNumber}, RuleKind::kParameterCheck},
  };
  return forms;
}

std::string Question::Text() const {
  std::string text = form->action;
  for (const std::string& word : words) text += " " + word;
  return text;
}

Question ReadQuestion(const std::vector<std::string>& words, TeskAccessInterfaceImpl& access) {
  const QuestionForm& form = FindForm(words.front());
  if (words.size() != form.words.size() + 1) {
    throw QuestionError(std::string("write: ") + form.action + " " + form.usage);
  }
  Question question;
  question.form = &form;
  for (std::size_t index = 0; index < form.words.size(); ++index) {
    question.words.push_back(ReadWord(form.words[index], words[index + 1], access));
  }
  if (form.words.front() != WordKind::kPath) {
    question.asked = AskRules(question, access);
  } else if (form.kind == RuleKind::kFilePath) {
    AskAboutFile(question, access);
  } else {
    AskAboutCreation(question, access);
  }
  return question;
}

void RefuseDomain(const std::string& name, TeskAccessInterfaceImpl& access) {
  RefuseWord(FormOf(WordKind::kDomain).plainNoun, name, DomainNames(access));
}

}  // namespace SecPolicyCli
