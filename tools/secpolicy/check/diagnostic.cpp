#include "diagnostic.h"

#include <algorithm>
#include <array>
#include <iterator>
#include <tuple>
#include <utility>

#include "text/suggestion.h"

namespace SecPolicyCli {
namespace Codes {

using enum Severity;

const Code kArgumentCount{"argument-count", kError, "A line has too many or too few words"};
const Code kBadName{"bad-name", kError, "The host refuses the name of an object or a domain"};
const Code kBadPermissions{"bad-permissions", kError,
                           "The letters of a -r rule fail when the rule is installed"};
const Code kCannotLabel{"cannot-label", kError, "A load cannot give a file its label"};
const Code kGrantWord{"grant-word", kError, "The last word is neither grant nor revoke"};
const Code kMissingDomain{"missing-domain", kError,
                          "A domain that every host needs is missing: a load stops"};
const Code kNoTardisk{"no-tardisk", kError, "A tardisk policy came from no tardisk"};
const Code kParameterConflict{"parameter-conflict", kError,
                              "The host refuses a -p rule, alone or beside another one"};
const Code kRuleType{"rule-type", kError, "The first word is no kind of rule"};
const Code kSecondPolicy{"second-policy", kError, "A tardisk has more than one policy file"};
const Code kSecondRule{"second-rule", kError, "A tardisk policy has more than one rule"};
const Code kTardiskEntry{"tardisk-entry", kError,
                         "An entry among tardisks or their policies is no regular file"};
const Code kTreeMarker{"tree-marker", kError, "\"/*\" does not end the path"};
const Code kUnknownDomain{"unknown-domain", kError, "A rule names a domain that is not defined"};
const Code kUnknownWord{"unknown-word", kError,
                        "A word is not in the host's table of labels, kinds, capabilities, checks "
                        "or system calls"};
const Code kUnreadable{"unreadable", kError, "A policy file or directory cannot be read"};

const Code kByteOrderMark{"byte-order-mark", kWarning,
                          "A byte order mark is part of the first word"};
const Code kCannotStart{"cannot-start", kWarning, "No program can start in a domain"};
const Code kCarriageReturn{"carriage-return", kWarning, "A carriage return is part of a word"};
const Code kContradictingRule{"contradicting-rule", kWarning,
                              "A later rule replaces an earlier one"};
const Code kDuplicateObject{"duplicate-object", kWarning, "An object is declared twice"};
const Code kDuplicateRule{"duplicate-rule", kWarning, "A rule is written twice"};
const Code kEditorCopy{"editor-copy", kWarning,
                       "A file looks like a left-over copy of another one"};
const Code kInstalledOnly{"installed-only", kWarning,
                          "A domain that every host needs is installed, but no file defines it"};
const Code kLongLine{"long-line", kWarning, "A line over 1023 characters ends its file"};
const Code kMissingPath{"missing-path", kWarning, "A path does not exist under this root"};
const Code kNulByte{"nul-byte", kWarning, "A NUL byte ends its line"};
const Code kRelativePath{"relative-path", kWarning, "A path does not begin with a slash"};
const Code kSkippedEntry{"skipped-entry", kWarning,
                         "A directory entry is no regular file and is skipped"};
const Code kStarInPath{"star-in-path", kWarning, "A star in a path does not mean what it seems to"};
const Code kTab{"tab", kWarning, "A tab is part of a word"};
const Code kTwoLabels{"two-labels", kWarning, "Two lines give one file different labels"};
const Code kUnknownPort{"unknown-port", kWarning, "A rule is about a port beyond 65535"};
const Code kUnreachableDomain{"unreachable-domain", kWarning, "Nothing enters a domain"};
const Code kUntypedEntries{"untyped-entries", kWarning,
                           "A file system does not tell what its entries are: a load skips them"};
const Code kUnusedObject{"unused-object", kWarning, "Nobody uses an object"};

}  // namespace Codes

namespace {

constexpr std::array<const Code*, 36> kAll = {
    &Codes::kArgumentCount,
    &Codes::kBadName,
    &Codes::kBadPermissions,
    &Codes::kCannotLabel,
    &Codes::kGrantWord,
    &Codes::kMissingDomain,
    &Codes::kNoTardisk,
    &Codes::kParameterConflict,
    &Codes::kRuleType,
    &Codes::kSecondPolicy,
    &Codes::kSecondRule,
    &Codes::kTardiskEntry,
    &Codes::kTreeMarker,
    &Codes::kUnknownDomain,
    &Codes::kUnknownWord,
    &Codes::kUnreadable,
    &Codes::kByteOrderMark,
    &Codes::kCannotStart,
    &Codes::kCarriageReturn,
    &Codes::kContradictingRule,
    &Codes::kDuplicateObject,
    &Codes::kDuplicateRule,
    &Codes::kEditorCopy,
    &Codes::kInstalledOnly,
    &Codes::kLongLine,
    &Codes::kMissingPath,
    &Codes::kNulByte,
    &Codes::kRelativePath,
    &Codes::kSkippedEntry,
    &Codes::kStarInPath,
    &Codes::kTab,
    &Codes::kTwoLabels,
    &Codes::kUnknownPort,
    &Codes::kUnreachableDomain,
    &Codes::kUntypedEntries,
    &Codes::kUnusedObject,
};

}  // namespace

std::span<const Code* const> AllCodes() { return kAll; }

const Code* FindCode(const std::string& name) {
  const auto found =
      std::ranges::find_if(kAll, [&](const Code* code) { return code->name == name; });
  return found == std::end(kAll) ? nullptr : *found;
}

std::string WhyNoCode(const std::string& name) {
  if (FindCode(name) != nullptr) return "";
  std::vector<std::string> names;
  for (const Code* code : AllCodes()) names.emplace_back(code->name);
  const std::string nearest = NearestWord(name, names);
  return "there is no problem '" + name + "'" +
         (nearest.empty() ? "; 'secpolicy explain' lists all"
                          : "; did you mean '" + nearest + "'?");
}

const Code& CodeOf(SecPolicy::Fault fault) {
  switch (fault) {
    case SecPolicy::Fault::kRuleType:
      return Codes::kRuleType;
    case SecPolicy::Fault::kArgumentCount:
      return Codes::kArgumentCount;
    case SecPolicy::Fault::kGrantWord:
      return Codes::kGrantWord;
    case SecPolicy::Fault::kUnknownDomain:
      return Codes::kUnknownDomain;
    case SecPolicy::Fault::kTreeMarker:
      return Codes::kTreeMarker;
    case SecPolicy::Fault::kSecondRule:
      return Codes::kSecondRule;
    case SecPolicy::Fault::kUnknownWord:
      break;
  }
  return Codes::kUnknownWord;
}

const char* SeverityName(Severity severity) {
  return severity == Severity::kError ? "error" : "warning";
}

DiagnosticList::DiagnosticList(const std::vector<std::string>& codes)
    : unwanted(codes.begin(), codes.end()) {}

void DiagnosticList::BeginFile(const std::string& file) {
  fileOrder.try_emplace(file, fileOrder.size());
}

void DiagnosticList::Add(Diagnostic diagnostic) {
  if (diagnostic.code->severity == Severity::kWarning && unwanted.contains(diagnostic.code->name)) {
    return;
  }
  BeginFile(diagnostic.file);
  diagnostics.push_back(std::move(diagnostic));
}

void DiagnosticList::KeepFile(const std::string& file) {
  std::erase_if(diagnostics, [&](const Diagnostic& diagnostic) { return diagnostic.file != file; });
}

void DiagnosticList::Sort() {
  const auto place = [this](const Diagnostic& diagnostic) {
    return std::tuple(diagnostic.code->severity, fileOrder.at(diagnostic.file), diagnostic.line,
                      diagnostic.column);
  };
  std::stable_sort(
      diagnostics.begin(), diagnostics.end(),
      [&](const Diagnostic& one, const Diagnostic& other) { return place(one) < place(other); });
}

void DiagnosticList::Select(const Selection& selection) {
  shown.clear();
  for (const Diagnostic& diagnostic : diagnostics) {
    if (shown.size() == selection.most) return;
    const Code& code = *diagnostic.code;
    if (selection.errorsOnly && code.severity != Severity::kError) continue;
    if (!selection.codes.empty() && !selection.codes.contains(code.name)) continue;
    shown.push_back(diagnostic);
  }
}

std::vector<std::pair<const Code*, std::size_t>> DiagnosticList::Tally() const {
  std::vector<std::pair<const Code*, std::size_t>> tally;
  for (const Code* code : AllCodes()) {
    const auto count =
        std::count_if(diagnostics.begin(), diagnostics.end(),
                      [&](const Diagnostic& diagnostic) { return diagnostic.code == code; });
    if (count > 0) tally.emplace_back(code, static_cast<std::size_t>(count));
  }
  return tally;
}

std::size_t DiagnosticList::Count(Severity severity) const {
  return static_cast<std::size_t>(std::count_if(
      diagnostics.begin(), diagnostics.end(),
      [&](const Diagnostic& diagnostic) { return diagnostic.code->severity == severity; }));
}

}  // namespace SecPolicyCli
