#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <iterator>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <system_error>
#include <vector>

#include "check/check_run.h"
#include "check/report_format.h"
#include "command_line.h"
#include "ending.h"
#include "host/linux/common/host_error.h"
#include "host/linux/operation/policy_load.h"
#include "host/linux/operation/state_use.h"
#include "kitlibs/file.h"
#include "secpolicy/policy_root.h"
#include "text/format.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

using Write = void (*)(const DiagnosticList& diagnostics, std::ostream& output);

const std::map<std::string, Write> kFormats = {
    {"text", WriteText}, {"json", WriteJson}, {"sarif", WriteSarif}};

struct Options {
  std::string path = SecPolicy::kPolicyRoot;
  bool fresh = false;
  bool warningsAreErrors = false;
  bool fromStandardInput = false;
  bool errorsOnly = false;
  std::string most;
  std::string format;
  std::vector<std::string> wanted;
  std::vector<std::string> unwanted;
};

// What is checked: a policy directory, and the one file in it that is asked about, if any.
struct Subject {
  std::string dir;
  std::string file;
};

void AddNames(const std::string& dir, const std::string& prefix, std::vector<std::string>& names) {
  if (!File_IsDirectory(dir.c_str())) return;
  std::map<std::string, std::string> files;
  SecPolicy::GetFileList(dir, files);
  for (const auto& [path, name] : files) names.push_back(prefix + name);
}

// As for a load, domains that earlier loads have defined and no file defines any more are not
// there.
void HideOldDomains(LinuxHost::PolicyTransaction& load, const std::string& root) {
  const std::string domains = root + "/" + SecPolicy::kDomainsDir;
  std::vector<std::string> names;
  AddNames(domains, "", names);
  AddNames(domains + "/" + SecPolicy::kPartnersDir, SecPolicy::kPartnerPrefix, names);
  load.BeginLoad({.kind = LinuxHost::LoadKind::kFull, .directory = root, .domains = names});
}

// In the order in which a boot comes to the files. The directories of early boot, partners and
// tardisks may be missing.
void CheckPolicy(CheckRun& run, const std::string& root) {
  const std::string domains = root + "/" + SecPolicy::kDomainsDir;
  const std::string earlyDomains = root + "/" + SecPolicy::kEarlyDir + "/" + SecPolicy::kDomainsDir;
  const std::string partners = domains + "/" + SecPolicy::kPartnersDir;
  const std::string tardisks = root + "/" + SecPolicy::kTardisksDir;
  CheckObjects(run, root + "/" + SecPolicy::kObjectsDir);
  if (File_IsDirectory(earlyDomains.c_str())) CheckDomains(run, earlyDomains, "");
  CheckDomains(run, domains, "", SecPolicy::kPartnersDir);
  if (File_IsDirectory(partners.c_str())) CheckDomains(run, partners, SecPolicy::kPartnerPrefix);
  if (File_IsDirectory(tardisks.c_str())) CheckTardisks(run, tardisks);
  CheckFileLabels(run, root + "/" + SecPolicy::kFileLabelsDir);
  CheckUse(run, domains);
}

bool HoldsDomains(const std::filesystem::path& dir) {
  return File_IsDirectory((dir / SecPolicy::kDomainsDir).c_str());
}

// The policy directory that the file belongs to; that of early boot is part of the one above it.
std::optional<Subject> FindPolicyOf(const std::filesystem::path& file) {
  std::filesystem::path dir = file.parent_path();
  while (!HoldsDomains(dir)) {
    if (!dir.has_relative_path()) return std::nullopt;
    dir = dir.parent_path();
  }
  if (dir.filename() == SecPolicy::kEarlyDir && HoldsDomains(dir.parent_path())) {
    dir = dir.parent_path();
  }
  return Subject{.dir = dir, .file = file};
}

std::optional<Subject> FindSubject(const std::string& path) {
  if (File_IsDirectory(path.c_str())) return Subject{.dir = path, .file = ""};
  std::error_code error;
  if (!std::filesystem::is_regular_file(path, error)) return std::nullopt;
  return FindPolicyOf(std::filesystem::absolute(path).lexically_normal());
}

// Takes what standard input holds for the content of `file`.
void TakeStandardInput(CheckRun& run, const std::string& file) {
  const std::string content = run.scratch.DirectoryPath() + "/content";
  std::ofstream output(content, std::ios::binary);
  std::copy(std::istreambuf_iterator<char>(std::cin), {}, std::ostreambuf_iterator<char>(output));
  output.flush();
  if (!output) LinuxHost::ThrowErrno("cannot write ", content);
  run.contents.emplace(file, content);
}

Selection SelectionOf(const Options& options) {
  Selection selection;
  selection.errorsOnly = options.errorsOnly;
  selection.codes.insert(options.wanted.begin(), options.wanted.end());
  if (!options.most.empty()) selection.most = std::stoul(options.most);
  return selection;
}

std::string DescribeFound(const DiagnosticList& diagnostics) {
  if (diagnostics.Count() == 0) return "no problems";
  const std::size_t shown = diagnostics.Shown().size();
  return CountOf(diagnostics.Count(Severity::kError), "error") + ", " +
         CountOf(diagnostics.Count(Severity::kWarning), "warning") +
         (shown < diagnostics.Count() ? "; " + std::to_string(shown) + " shown" : "");
}

ExitCode Check(const Options& options) {
  const std::optional<Subject> subject = FindSubject(options.path);
  if (!subject) {
    return Refuse("check", "there is no policy at " + options.path +
                               " below this root. Name the directory of the policy or a file in "
                               "it, or the root that it is in (--root DIR).");
  }
  if (options.fromStandardInput && subject->file.empty()) {
    return Refuse("check", "name the file that standard input holds the content of.");
  }
  CheckRun run(options.fresh, options.unwanted);
  if (options.fromStandardInput) TakeStandardInput(run, subject->file);
  LinuxHost::PolicyTransaction load(LinuxHost::CurrentState());
  HideOldDomains(load, subject->dir);
  CheckPolicy(run, subject->dir);
  if (!subject->file.empty()) {
    if (!run.diagnostics.Knows(subject->file)) {
      return Refuse("check", "a load does not read " + subject->file +
                                 ": it is in none of the directories of a policy.");
    }
    run.diagnostics.KeepFile(subject->file);
  }
  run.diagnostics.Sort();
  run.diagnostics.Select(SelectionOf(options));
  run.diagnostics.against = run.scratch.IsCopy() ? "installed" : "boot";
  kFormats.at(options.format)(run.diagnostics, std::cout);

  const std::string why = run.scratch.WhyNoCopy();
  Summarize("check", DescribeFound(run.diagnostics) +
                         (why.empty() ? "" : "; checked as after a boot, since " + why));
  const std::size_t wrong =
      options.warningsAreErrors ? run.diagnostics.Count() : run.diagnostics.Count(Severity::kError);
  return wrong > 0 ? kFailed : kWell;
}

std::string CheckCodeName(const std::string& name) {
  return FindCode(name) != nullptr ? "" : "there is no problem '" + name + "'";
}

std::string CheckNumber(const std::string& word) {
  const bool isNumber = !word.empty() && word.size() < 10 &&
                        word.find_first_not_of("0123456789") == std::string::npos;
  return isNumber ? "" : "'" + word + "' is not a number";
}

std::string CheckWarningName(const std::string& name) {
  const Code* const code = FindCode(name);
  if (code == nullptr) return "there is no warning '" + name + "'";
  if (code->severity == Severity::kWarning) return "";
  return "'" + name + "' is an error: a load does not end well with it";
}

Action Define(Syntax& syntax) {
  const auto options = std::make_shared<Options>();
  syntax
      .AddOption("DIR", options->path,
                 "The policy directory, or a file in it, as seen from the root")
      .Offer(OfferFiles())
      .ShowDefault();
  syntax.AddFlag("--fresh", options->fresh,
                 "Check as after a boot, whatever is installed on this host now");
  syntax.AddFormat(options->format, "the problems", {"text", "json", "sarif"});
  syntax.AddFlag("--stdin", options->fromStandardInput,
                 "Take standard input for the content of the file");
  syntax.AddFlag("--errors-only", options->errorsOnly, "Show no warnings");
  syntax.AddList("--only", options->wanted, "Show only this problem; may be given repeatedly")
      .Check(CheckCodeName)
      .NameValue("CODE");
  syntax.AddOption("--max", options->most, "Show at most so many problems")
      .Check(CheckNumber)
      .NameValue("N");
  syntax.AddFlag("--werror", options->warningsAreErrors, "End with 1 for warnings too");
  syntax.AddList("--disable", options->unwanted, "Leave out this warning; may be given repeatedly")
      .Check(CheckWarningName)
      .NameValue("CODE")
      .Offer(OfferCodes(true));
  return [options] { return Check(*options); };
}

}  // namespace

const Verb kCheck = {
    "check", "Look for every problem of the policy files, and change nothing",
    "Reads the whole policy as a load would, against a copy of what is installed, and prints "
    "every\n"
    "problem with its file, line and column: what a load refuses (errors), and then what it\n"
    "accepts although it can hardly be meant (warnings). Of a file, tells its problems alone.\n"
    "Needs no privilege. Exit status: 0 no errors, 1 errors, or with --werror warnings, whether\n"
    "they are shown or not.\n"
    "\n"
    "Examples:\n"
    "  secpolicy check                            the host's policy\n"
    "  secpolicy check --fresh ./my-policy        a directory, as if on a newly booted host\n"
    "  secpolicy check --werror --disable missing-path\n"
    "  secpolicy check --errors-only --max 20     what to mend first\n"
    "  secpolicy check ./my-policy/domains/webDom one file, beside the others\n"
    "  secpolicy check --format sarif >check.sarif",
    Define};

}  // namespace SecPolicyCli
