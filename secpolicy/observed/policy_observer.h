#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <utility>

#include "braxo/lib/exception.h"
#include "secpolicy/labels/file_label_policy.h"
#include "teskctl/security.h"

// For those who link the library's objects in and want to know what a load does while it does it.
// Who uses the shared library has only the reports.
namespace SecPolicy {

// What is wrong with a line of a policy file.
enum class Fault {
  kRuleType,       // its first word is no kind of rule
  kArgumentCount,  // it has too many or too few words
  kGrantWord,      // the last word is neither "grant" nor "revoke"
  kUnknownDomain,  // the host does not find it, or fails when it is asked
  kUnknownWord,    // the same, of the table that it has to be in
  kTreeMarker,     // "/*" stands elsewhere than at the end
  kSecondRule,     // only one rule of the kind is allowed
};

// Why something of a policy cannot be read or installed.
struct Problem {
  static constexpr std::size_t kWholeLine = static_cast<std::size_t>(-1);

  std::string file = {};            // the policy file or directory that it is about
  unsigned int line = 0;            // 0: the whole file, or it is not known which
  std::optional<Fault> fault = {};  // only of a line that cannot be read
  std::size_t word = kWholeLine;    // of such a line the word to blame; its first one is 0
  std::string reason = {};          // the error's text; of such a line without the place
};

// A failure that is about a line. Who reads the file tells its problem, and throws on what is no
// more than a BraxoException.
class LineFailure : public Braxo::Lib::BraxoException {
 public:
  // `cause` names no file.
  LineFailure(const std::string& text, Problem cause)
      : BraxoException(text), problem(std::move(cause)) {}

  Problem problem;
};

enum class LoadPhase { kObjects, kDomains, kPartnerDomains, kTardisks, kFileLabels };

using FileLabel = FileLabelPolicy::FileLabel;

// Is told what a load, a restore or a display does, as it happens; nothing that it does changes
// what they do. It must not throw. What is handed to it is only borrowed. This one does nothing.
class PolicyObserver {
 public:
  PolicyObserver() = default;
  PolicyObserver(const PolicyObserver&) = delete;
  PolicyObserver& operator=(const PolicyObserver&) = delete;
  virtual ~PolicyObserver() = default;

  // A phase ends, also when it fails. Partner domains are no phase where there are none.
  virtual void OnEnd(LoadPhase) {}

  // An error is about to be written to standard error.
  virtual void OnError(const std::string& /*message*/) {}

  // What an error was about, before the error. Errors that only sum up, and those that are about no
  // policy file, have no problem.
  virtual void OnProblem(const Problem&) {}

  // A rule about a path is about to be installed. The host is told the line of every rule but
  // these.
  virtual void OnPathRule(const TeskCtl::Security::TeskAccess_FilePathAccessRule&) {}

  // A line of the file labels was read, whether or not it can be given; or a tardisk has got the
  // label of its policy.
  virtual void OnFileLabel(const FileLabel&) {}

  // A transition that belongs to a tardisk was installed for the line `rule.line` of `policyFile`.
  virtual void OnTardiskTransition(const TeskCtl::Security::TeskAccess_DomTransRule& /*rule*/,
                                   const std::string& /*policyFile*/) {}

  // The load is about to end the process: there is no domain of this name.
  virtual void OnMissingDomain(const std::string& /*name*/) {}
};

}  // namespace SecPolicy
