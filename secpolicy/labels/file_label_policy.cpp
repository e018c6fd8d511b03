#include "secpolicy/labels/file_label_policy.h"

#include <string_view>

#include "braxo/misc/strcat.h"
#include "secpolicy/report.h"

namespace SecPolicy {
namespace {

using Braxo::Lib::BraxoException;
using Braxo::Misc::StrCat;
using FileLabel = FileLabelPolicy::FileLabel;

constexpr std::string_view kTreeMarker = "/*";

// A line names itself the same way when it is read and when it is applied.
std::string LineMessage(const std::string& file, unsigned int line, const std::string& message) {
  return StrCat(file, ":", line, " : ", message);
}

FileLabel ParseLine(const std::string& file, unsigned int line, std::queue<std::string>& tokens,
                    TeskAccessInterfaceImpl& access) {
  if (tokens.size() != 2) RaiseError(LineMessage(file, line, "incorrect no of parameters"));
  const std::string& pattern = tokens.front();
  const std::string& label = tokens.back();
  // An unknown label is told in the kernel's own words, before the pattern is looked at.
  access.ValidateKeyword(TeskCtl::Security::TESKACCESS_KEYWORD_LABEL, label);

  const std::size_t marker = pattern.find(kTreeMarker);
  const bool recursive = marker != std::string::npos;
  if (recursive && marker + kTreeMarker.size() != pattern.size()) {
    RaiseError(LineMessage(file, line, "Unrecognized format for file/dir specification"));
  }
  return {.path = pattern.substr(0, marker),
          .label = label,
          .recursive = recursive,
          .policyFile = file,
          .lineNumber = line};
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
  std::map<unsigned int, std::queue<std::string>> parsed;
  ParseFile(file, parsed);
  for (auto& [line, tokens] : parsed) {
    if (tokens.empty()) continue;
    fileLabels.push_back(ParseLine(file, line, tokens, access));
  }
}

void FileLabelPolicy::SetFileLabels(TeskAccessInterfaceImpl& access) {
  bool failed = false;
  for (; !fileLabels.empty(); fileLabels.pop_front()) {
    const FileLabel& fileLabel = fileLabels.front();
    try {
      Apply(fileLabel, access);
    } catch (const BraxoException& failure) {
      SecpolicyError(LineMessage(fileLabel.policyFile, fileLabel.lineNumber, failure.what()));
      failed = true;
    }
  }
  if (failed) RaiseError("There was a failure in setting file labels");
}

}  // namespace SecPolicy
