#include "check_run.h"
#include "rule_form.h"
#include "secpolicy/observed/policy_lines.h"
#include "secpolicy/policy_root.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;

// An exception names a label only to set it: what the host thinks of it shows no earlier.
void CheckLabel(CheckRun& run, const SourceFile& file, unsigned int line,
                const std::string& tardisk, const std::string& label) {
  if (IsObjectLabel(run, label)) return;
  run.diagnostics.Add(file.AtWord(Codes::kUnknownWord, line, 1,
                                  "Invalid label (" + label + ") for file " + tardisk,
                                  HintForLabel(run, label)));
}

void CheckLines(CheckRun& run, const SourceFile& file, const std::string& tardisk) {
  SecPolicy::TardiskLines lines(file.Path(), tardisk);
  for (const auto& [line, words] : file.Lines()) {
    try {
      lines.Read(line, file.TokensOf(line), run.access);
    } catch (const SecPolicy::LineFailure& failure) {
      const SecPolicy::Problem& problem = failure.problem;
      const bool isNoRule = problem.fault == SecPolicy::Fault::kRuleType;
      AddRefusal(run, file, problem,
                 isNoRule ? Hint("write: -E LABEL DOMAIN")
                          : HintForRule(run, CodeOf(*problem.fault), words, problem.word));
      continue;
    }
    run.usedLabels.insert(words[1]);
    run.enteredDomains.insert(words[2]);
    CheckLabel(run, file, line, tardisk, words[1]);
  }
}

// Two policies of one tardisk: a load takes the one that the directory lists first.
void CheckOrigin(CheckRun& run, const SourceFile& file, const std::string& tardisk,
                 std::set<std::string>& tardisks) {
  if (tardisk.empty()) {
    run.diagnostics.Add(file.About(Codes::kNoTardisk,
                                   "No backing tardisk for policy file " + file.Path(),
                                   "put the file into a tardisk's archive and boot"));
  } else if (!tardisks.insert(tardisk).second) {
    run.diagnostics.Add(file.About(Codes::kSecondPolicy,
                                   "More than one exception specification for tardisk " + tardisk));
  }
}

// As the library names it, without the slash at its end.
std::string ImagesDir() {
  std::string dir = SecPolicy::kTardiskImagesDir;
  dir.pop_back();
  return dir;
}

}  // namespace

void CheckTardisks(CheckRun& run, const std::string& dir) {
  // A load reads no other directory. A new state does not know yet what a boot will unpack.
  const bool isLoaded = run.scratch.IsCopy() &&
                        dir == std::string(SecPolicy::kPolicyRoot) + "/" + SecPolicy::kTardisksDir;
  const Code& skipped = isLoaded ? Codes::kTardiskEntry : Codes::kSkippedEntry;
  if (isLoaded) CheckEntries(run, ImagesDir(), "", skipped);
  std::set<std::string> tardisks;
  for (const NamedFile& named : OpenPolicyFiles(run, dir, "", skipped)) {
    const SourceFile& file = *named.file;
    std::string tardisk;
    if (isLoaded) {
      try {
        tardisk = SecPolicy::TardiskPolicy(file.Path()).GetBackingTardiskPath();
      } catch (const BraxoException& failure) {
        run.diagnostics.Add(file.About(Codes::kUnreadable, failure.what()));
      }
      CheckOrigin(run, file, tardisk, tardisks);
    }
    CheckLines(run, file, tardisk.empty() ? file.Path() : tardisk);
  }
}

}  // namespace SecPolicyCli
