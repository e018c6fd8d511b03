#include "secpolicy/labels/file_label_policy.h"

#include <string_view>

#include "braxo/misc/strcat.h"
#include "secpolicy/carry_on.h"
#include "secpolicy/observed/policy_observer.h"

namespace SecPolicy {
namespace {

using Braxo::Lib::BraxoException;
using Braxo::Misc::StrCat;

constexpr std::string_view kTreeMarker = "/*";

// A line names itself the same way when it is read and when it is applied.
std::string LineMessage(const std::string& file, unsigned int line, const std::string& message) {
  return StrCat(file, ":", line, " : ", message);
}

[[noreturn]] void Refuse(const std::string& file, unsigned int line, Fault fault, std::size_t word,
                         const char* reason) {
  throw LineFailure(LineMessage(file, line, reason),
                    {.line = line, .fault = fault, .word = word, .reason = reason});
}

// An unknown label is told in the kernel's own words.
void ValidateLabel(const std::string& label, unsigned int line, TeskAccessInterfaceImpl& access) {
  try {
    access.ValidateKeyword(TeskCtl::Security::TESKACCESS_KEYWORD_LABEL, label);
  } catch (const BraxoException& failure) {
    throw LineFailure(
        failure.what(),
        {.line = line, .fault = Fault::kUnknownWord, .word = 1, .reason = failure.what()});
  }
}

void Apply(const FileLabelPolicy::FileLabel& fileLabel, TeskAccessInterfaceImpl& access) {
  if (fileLabel.recursive) {
    SetDirLabelRecursive(fileLabel.path, fileLabel.label, access);
  } else {
    SetFileLabel(fileLabel.path, fileLabel.label, access);
  }
}

}  // namespace

void FileLabelPolicy::ParsePolicy(const std::string& file, TeskAccessInterfaceImpl& access,
                                  PolicyObserver& observer) {
  ReadLines(file, observer, [&](unsigned int line, std::queue<std::string>& tokens) {
    ParseLine(file, line, tokens, access);
    observer.OnFileLabel(fileLabels.back());
  });
}

void FileLabelPolicy::ParseLine(const std::string& file, unsigned int line,
                                const std::queue<std::string>& tokens,
                                TeskAccessInterfaceImpl& access) {
  if (tokens.size() != 2) {
    Refuse(file, line, Fault::kArgumentCount, Problem::kWholeLine, "incorrect no of parameters");
  }
  const std::string& pattern = tokens.front();
  const std::string& label = tokens.back();
  // An unknown label is told before the pattern is looked at.
  ValidateLabel(label, line, access);

  const std::size_t marker = pattern.find(kTreeMarker);
  const bool recursive = marker != std::string::npos;
  if (recursive && marker + kTreeMarker.size() != pattern.size()) {
    Refuse(file, line, Fault::kTreeMarker, 0, "Unrecognized format for file/dir specification");
  }
  fileLabels.push_back({.path = pattern.substr(0, marker),
                        .label = label,
                        .recursive = recursive,
                        .policyFile = file,
                        .lineNumber = line});
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
