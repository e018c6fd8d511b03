#include "secpolicy/labels/file_label_policy.h"

#include <string_view>

#include "braxo/misc/strcat.h"
#include "secpolicy/carry_on.h"
#include "secpolicy/report.h"

namespace SecPolicy {
namespace {

using Braxo::Lib::BraxoException;
using Braxo::Misc::StrCat;

constexpr std::string_view kTreeMarker = "/*";

// A line names itself the same way when it is read and when it is applied.
std::string LineMessage(const std::string& file, unsigned int line, const std::string& message) {
  return StrCat(file, ":", line, " : ", message);
}

[[noreturn]] void Refuse(Problem& problem, Fault fault, std::size_t word, const char* reason) {
  problem.fault = fault;
  problem.word = word;
  problem.reason = reason;
  RaiseError(LineMessage(problem.file, problem.line, problem.reason));
}

// An unknown label is told in the kernel's own words.
void ValidateLabel(const std::string& label, TeskAccessInterfaceImpl& access, Problem& problem) {
  try {
    access.ValidateKeyword(TeskCtl::Security::TESKACCESS_KEYWORD_LABEL, label);
  } catch (const BraxoException& failure) {
    problem.fault = Fault::kUnknownWord;
    problem.word = 1;
    problem.reason = failure.what();
    throw;
  }
}

void Apply(const FileLabel& fileLabel, TeskAccessInterfaceImpl& access) {
  if (fileLabel.recursive) {
    SetDirLabelRecursive(fileLabel.path, fileLabel.label, access);
  } else {
    SetFileLabel(fileLabel.path, fileLabel.label, access);
  }
}

}  // namespace

void FileLabelPolicy::ParsePolicy(const std::string& file, TeskAccessInterfaceImpl& access) {
  PolicyObserver nobody;
  ParsePolicy(file, access, nobody);
}

void FileLabelPolicy::ParsePolicy(const std::string& file, TeskAccessInterfaceImpl& access,
                                  PolicyObserver& observer) {
  ReadLines(file, observer, [&](auto& tokens, Problem& problem) {
    ParseLine(tokens, access, problem);
    observer.OnFileLabel(fileLabels.back());
  });
}

void FileLabelPolicy::ParseLine(std::queue<std::string>& tokens, TeskAccessInterfaceImpl& access,
                                Problem& problem) {
  if (tokens.size() != 2) {
    Refuse(problem, Fault::kArgumentCount, Problem::kWholeLine, "incorrect no of parameters");
  }
  const std::string& pattern = tokens.front();
  const std::string& label = tokens.back();
  // An unknown label is told before the pattern is looked at.
  ValidateLabel(label, access, problem);

  const std::size_t marker = pattern.find(kTreeMarker);
  const bool recursive = marker != std::string::npos;
  if (recursive && marker + kTreeMarker.size() != pattern.size()) {
    Refuse(problem, Fault::kTreeMarker, 0, "Unrecognized format for file/dir specification");
  }
  fileLabels.push_back({.path = pattern.substr(0, marker),
                        .label = label,
                        .recursive = recursive,
                        .policyFile = problem.file,
                        .lineNumber = problem.line});
}

void FileLabelPolicy::SetFileLabels(TeskAccessInterfaceImpl& access) {
  PolicyObserver nobody;
  SetFileLabels(access, nobody);
}

void FileLabelPolicy::SetFileLabels(TeskAccessInterfaceImpl& access, PolicyObserver& observer) {
  bool failed = false;
  for (; !fileLabels.empty(); fileLabels.pop_front()) {
    const FileLabel& fileLabel = fileLabels.front();
    try {
      Apply(fileLabel, access);
    } catch (const BraxoException& failure) {
      const auto& [path, label, recursive, file, line] = fileLabel;
      observer.OnProblem({.file = file, .line = line, .reason = failure.what()});
      ReportError(LineMessage(file, line, failure.what()), observer);
      failed = true;
    }
  }
  if (failed) RaiseError("There was a failure in setting file labels");
}

}  // namespace SecPolicy
