#pragma once

#include <cstddef>
#include <limits>
#include <map>
#include <set>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "secpolicy/observed/policy_observer.h"

namespace SecPolicyCli {

enum class Severity { kError, kWarning };

// The stable name of one kind of problem. An error is what keeps a load from ending well; a warning
// is what a load accepts although it can hardly be meant.
struct Code {
  const char* name;
  Severity severity;
  const char* summary;
};

namespace Codes {

extern const Code kArgumentCount;
extern const Code kBadName;
extern const Code kBadPermissions;
extern const Code kCannotLabel;
extern const Code kGrantWord;
extern const Code kMissingDomain;
extern const Code kNoTardisk;
extern const Code kParameterConflict;
extern const Code kRuleType;
extern const Code kSecondPolicy;
extern const Code kSecondRule;
extern const Code kTardiskEntry;
extern const Code kTreeMarker;
extern const Code kUnknownDomain;
extern const Code kUnknownWord;
extern const Code kUnreadable;

extern const Code kByteOrderMark;
extern const Code kCannotStart;
extern const Code kCarriageReturn;
extern const Code kContradictingRule;
extern const Code kDuplicateObject;
extern const Code kDuplicateRule;
extern const Code kEditorCopy;
extern const Code kInstalledOnly;
extern const Code kLongLine;
extern const Code kMissingPath;
extern const Code kNulByte;
extern const Code kRelativePath;
extern const Code kSkippedEntry;
extern const Code kStarInPath;
extern const Code kTab;
extern const Code kTwoLabels;
extern const Code kUnknownPort;
extern const Code kUnreachableDomain;
extern const Code kUntypedEntries;
extern const Code kUnusedObject;

}  // namespace Codes

// All codes: the errors and then the warnings, each in order of name.
std::span<const Code* const> AllCodes();

// The code with this name; null when there is none.
const Code* FindCode(const std::string& name);

// Why `name` cannot be the name of a problem; empty when it can.
std::string WhyNoCode(const std::string& name);

// The code of a line that the library refuses.
const Code& CodeOf(SecPolicy::Fault fault);

// "error" or "warning".
const char* SeverityName(Severity severity);

// What to do about a problem.
struct Hint {
  Hint() = default;  // nothing is known
  Hint(const char* advice) : text(advice) {}
  Hint(std::string advice, std::string better = {})
      : text(std::move(advice)), replacement(std::move(better)) {}

  std::string text;
  std::string replacement;  // for the words that the problem is about; empty when not just that

  bool operator==(const Hint&) const = default;
};

// One problem. Lines and columns count from 1; line 0 is the file as a whole. Columns and lengths
// count characters, a byte that belongs to none as one.
struct Diagnostic {
  const Code* code = nullptr;
  std::string file;
  unsigned int line = 0;
  std::size_t column = 0;
  std::size_t length = 0;
  std::string message;
  Hint hint;
  std::string source;  // the bytes of the line

  bool operator==(const Diagnostic&) const = default;
};

// Which of the problems are shown.
struct Selection {
  bool errorsOnly = false;
  std::set<std::string> codes;  // by name; empty: all
  std::size_t most = std::numeric_limits<std::size_t>::max();
};

// The problems of one check.
class DiagnosticList {
 public:
  // `codes` are the names of the warnings that are not wanted.
  explicit DiagnosticList(const std::vector<std::string>& codes);

  // Tells that the problems of `file` come after those of all files that were told before.
  void BeginFile(const std::string& file);

  void Add(Diagnostic diagnostic);

  bool Knows(const std::string& file) const { return fileOrder.contains(file); }

  // Forgets the problems of all other files.
  void KeepFile(const std::string& file);

  // Brings the problems into their order: errors before warnings, and either by file, line and
  // column.
  void Sort();

  // Chooses those that are shown. The others count.
  void Select(const Selection& selection);

  // What the latest selection chose; nothing before the first.
  const std::vector<Diagnostic>& Shown() const { return shown; }

  const std::vector<Diagnostic>& All() const { return diagnostics; }

  std::size_t Count(Severity severity) const;
  std::size_t Count() const { return diagnostics.size(); }

  // How many there are of each kind, errors first and then in order of name.
  std::vector<std::pair<const Code*, std::size_t>> Tally() const;

  // What the policy was checked against, in reports: what is "installed", or as after a "boot".
  std::string against = "boot";

 private:
  std::set<std::string> unwanted;
  std::map<std::string, std::size_t> fileOrder;
  std::vector<Diagnostic> diagnostics;
  std::vector<Diagnostic> shown;
};

}  // namespace SecPolicyCli
