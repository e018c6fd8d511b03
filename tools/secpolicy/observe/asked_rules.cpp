#include "asked_rules.h"

#include <algorithm>
#include <iterator>
#include <optional>
#include <variant>

#include "host/linux/operation/file_label.h"
#include "query/question.h"

namespace SecPolicyCli {
namespace {

using Policy::RuleKind;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;

struct KnownLabel {
  std::string name;
  bool isBuiltIn = false;
};

KnownLabel LabelOf(const std::string& path, SecPolicy::TeskAccessInterfaceImpl& access) {
  auto label = LinuxHost::ReadLabel(path.c_str());
  if (!label) label = LinuxHost::ReadLabel(DirectoryOf(path).c_str());
  if (!label) return {};
  try {
    const std::string name = access.GetLabel(label->id, TESKACCESS_LABEL_OBJECT);
    return {.name = name, .isBuiltIn = access.IsPredefinedLabel(name, TESKACCESS_LABEL_OBJECT)};
  } catch (const Braxo::Lib::BraxoException&) {
    return {};
  }
}

std::string ActionOf(RuleKind kind, Policy::FileAccess access = {}) {
  const auto forms = QuestionForms();
  const auto form = std::ranges::find_if(
      forms, [&](const QuestionForm& each) { return each.kind == kind && each.access == access; });
  return form->action;
}

// The words of a question of each kind.
struct Wording {
  using Words = std::vector<std::string>;

  Words operator()(const Policy::FileQuestion& asked) const {
    return {ActionOf(RuleKind::kFilePath, asked.access), asked.path};
  }
  Words operator()(const Policy::CreationQuestion& asked) const {
    const bool isFile = asked.kind == RuleKind::kFileCreation;
    return {isFile ? "make" : "make-socket", asked.path, asked.what};
  }
  Words operator()(const Policy::EntryQuestion& asked) const {
    return {ActionOf(RuleKind::kDomainTransition), asked.domain};
  }
  Words operator()(const Policy::ParameterQuestion& asked) const {
    return {ActionOf(RuleKind::kParameterCheck), asked.check, asked.number};
  }
  Words operator()(const Policy::WordsQuestion& asked) const {
    Words words = {ActionOf(asked.kind)};
    std::ranges::copy_if(asked.words, std::back_inserter(words),
                         [](const std::string& word) { return !word.empty(); });
    return words;
  }
};

}  // namespace

Policy::Question WithLabel(Policy::Question question, SecPolicy::TeskAccessInterfaceImpl& access) {
  if (auto* const file = std::get_if<Policy::FileQuestion>(&question)) {
    const KnownLabel label = LabelOf(file->path, access);
    file->label = label.name;
    file->labelIsBuiltIn = label.isBuiltIn;
  } else if (auto* const creation = std::get_if<Policy::CreationQuestion>(&question)) {
    const KnownLabel label = LabelOf(DirectoryOf(creation->path), access);
    creation->directoryLabel = label.name;
    creation->labelIsBuiltIn = label.isBuiltIn;
  }
  return question;
}

std::optional<Policy::WordsQuestion> WiderCapability(const Policy::WordsQuestion& asked) {
  if (asked.kind != RuleKind::kCapability || asked.words[0] != "cap_dac_read_search") {
    return std::nullopt;
  }
  return Policy::WordsQuestion{.kind = asked.kind, .words = {"cap_dac_override"}};
}

bool IsGranted(const Policy::Question& question, const Policy::InstalledDomain& domain) {
  if (Decide(question, domain).granted) return true;
  const auto* const asked = std::get_if<Policy::WordsQuestion>(&question);
  const auto wider = asked == nullptr ? std::nullopt : WiderCapability(*asked);
  return wider && Decide(*wider, domain).granted;
}

std::vector<std::string> WordsOf(const Policy::Question& question) {
  return std::visit(Wording(), question);
}

std::string TextOf(const Policy::Question& question) {
  std::string text;
  for (const std::string& word : WordsOf(question)) text += (text.empty() ? "" : " ") + word;
  return text;
}

std::string DirectoryOf(const std::string& path) {
  return path.substr(0, std::max<std::size_t>(path.rfind('/'), 1));
}

}  // namespace SecPolicyCli
