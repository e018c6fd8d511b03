#include <algorithm>
#include <cerrno>
#include <filesystem>

#include "enforce/published.h"
#include "host/linux/operation/label_index.h"
#include "label_actions.h"
#include "query/named.h"
#include "refusal.h"
#include "root.h"
#include "secpolicy/observed/policy_lines.h"
#include "text/shell_word.h"
#include "text/suggestion.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;

[[noreturn]] void RefuseLabel(LabelRun& run, const std::string& label,
                              const std::vector<std::string>& paths) {
  const std::string problem = "there is no object label '" + label + "'";
  if (label.starts_with('/') && run.FindLabel(paths.back()) != kNoSuchLabel) {
    throw QuestionError(problem + ". The label comes first: secpolicy label set " + paths.back() +
                        " " + label);
  }
  std::vector<std::string> labels;
  for (const auto& [name, id] :
       run.access.GetKeywordsMap(TeskCtl::Security::TESKACCESS_KEYWORD_LABEL)) {
    labels.push_back(name);
  }
  const std::string nearest = NearestWord(label, labels);
  throw QuestionError(problem + (nearest.empty()
                                     ? ". " + Call("words objects") + " lists all labels"
                                     : ". Did you mean '" + nearest + "'?"));
}

std::string NameOf(LabelRun& run, const std::string& label, const std::vector<std::string>& paths) {
  if (run.FindLabel(label) != kNoSuchLabel) return label;
  if (const auto name = FindObjectByNumber(label, run.access)) return *name;
  RefuseLabel(run, label, paths);
}

void GiveLabelTo(LabelRun& run, const std::string& label, const std::string& path,
                 bool wholeTrees) {
  std::error_code ignored;
  int error = 0;
  try {
    if (wholeTrees && std::filesystem::is_directory(path, ignored)) {
      SecPolicy::SetDirLabelRecursive(path, label, run.access, error);
    } else {
      SecPolicy::SetFileLabel(path, label, run.access, error);
    }
  } catch (const BraxoException& failure) {
    const bool hasNone = error == ENODATA;
    run.Error(failure.what() + (hasNone ? ": it " + WhyNoLabel(error) : ""));
  }
}

}  // namespace

std::string GiveLabel(LabelRun& run, const std::string& label,
                      const std::vector<std::string>& paths, bool wholeTrees) {
  const std::string name = NameOf(run, label, paths);
  for (const std::string& path : paths) GiveLabelTo(run, name, path, wholeTrees);
  LinuxHost::RefreshLabelIndex();
  PublishPlansOrTell("label set");
  return "done";
}

}  // namespace SecPolicyCli
