#include <queue>

#include "check_run.h"
#include "rule_form.h"
#include "secpolicy/policy_root.h"
#include "secpolicy/tardisk/tardisk_exception_rules.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;
using Words = SourceFile::Words;

constexpr char kExceptionRule[] = "-E";
constexpr std::uint32_t kNoSuchLabel = 1;

void Refuse(CheckRun& run, const SourceFile& file, unsigned int line, const Words& words,
            const std::string& failure) {
  const std::string prefix =
      "Error in parsing policy for domain: " + file.Path() + ": " + std::to_string(line) + " : ";
  const std::string message = failure.starts_with(prefix) ? failure.substr(prefix.size()) : failure;
  const Code& code = CodeOfRefusal(message);
  const std::size_t word = FindBlamedWord(code, message, words);
  const bool wholeLine = word == words.size();
  const std::string hint =
      &code == &Codes::kRuleType ? "write: -E LABEL DOMAIN" : HintForRule(run, code, words, word);
  run.diagnostics.Add(file.AtWords(code, line, wholeLine ? 0 : word,
                                   wholeLine ? words.size() - 1 : word, message, hint));
}

// An exception names a label only to set it: what the host thinks of it shows no earlier.
void CheckLabel(CheckRun& run, const SourceFile& file, unsigned int line,
                const std::string& tardisk, const std::string& label) {
  if (run.access.LookupLabel(label, TESKACCESS_LABEL_OBJECT) != kNoSuchLabel) return;
  run.diagnostics.Add(file.AtWord(Codes::kUnknownWord, line, 1,
                                  "Invalid label (" + label + ") for file " + tardisk,
                                  HintForLabel(run, label)));
}

void CheckLines(CheckRun& run, const SourceFile& file, const std::string& tardisk) {
  SecPolicy::TardiskExceptionRules rules;
  for (const auto& [line, words] : file.Lines()) {
    try {
      if (words.front() != kExceptionRule) {
        SecPolicy::RaiseTardiskParseError(
            file.Path(), line, "invalid tardisk policy rule type (" + words.front() + ")");
      }
      std::queue<std::string> arguments;
      for (std::size_t i = 1; i < words.size(); ++i) arguments.push(words[i]);
      rules.AddRule(line, tardisk, file.Path(), arguments, run.access);
    } catch (const BraxoException& failure) {
      Refuse(run, file, line, words, failure.what());
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
