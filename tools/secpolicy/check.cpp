#include <filesystem>
#include <iostream>
#include <map>
#include <string>
#include <vector>

#include "check/check_run.h"
#include "check/report_format.h"
#include "command_line.h"
#include "ending.h"
#include "host/linux/operation/policy_load.h"
#include "host/linux/operation/state_use.h"
#include "kitlibs/file.h"
#include "policy_dir.h"
#include "secpolicy/policy_root.h"
#include "text/format.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

using Write = void (*)(const DiagnosticList& diagnostics, std::ostream& output);

const std::map<std::string, Write> kFormats = {
    {"text", WriteText}, {"json", WriteJson}, {"sarif", WriteSarif}};

struct Options {
  bool fresh = false;
  bool warningsAreErrors = false;
  std::string format;
  std::vector<std::string> unwanted;
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

ExitCode Check(const std::string& dir, const Options& options) {
  if (!File_IsDirectory(dir.c_str())) {
    return Refuse("check", "there is no directory " + dir +
                               " below this root. Name the directory of the policy, or the root "
                               "that it is in (--root DIR).");
  }
  CheckRun run(options.fresh, options.unwanted);
  LinuxHost::PolicyTransaction load(LinuxHost::CurrentState());
  HideOldDomains(load, dir);
  CheckPolicy(run, dir);
  run.diagnostics.Sort();
  run.diagnostics.against = run.scratch.IsCopy() ? "installed" : "boot";
  kFormats.at(options.format)(run.diagnostics, std::cout);

  const std::size_t errors = run.diagnostics.Count(Severity::kError);
  const std::size_t warnings = run.diagnostics.Count(Severity::kWarning);
  const std::string why = run.scratch.WhyNoCopy();
  Summarize("check", (errors + warnings == 0
                          ? "no problems"
                          : CountOf(errors, "error") + ", " + CountOf(warnings, "warning")) +
                         (why.empty() ? "" : "; checked as after a boot, since " + why));
  return errors > 0 || (options.warningsAreErrors && warnings > 0) ? kFailed : kWell;
}

std::string CheckWarningName(const std::string& name) {
  for (const Code* code : AllCodes()) {
    if (code->name != name) continue;
    if (code->severity == Severity::kWarning) return "";
    return "'" + name + "' is an error: a load does not end well with it";
  }
  return "there is no warning '" + name + "'";
}

Action Define(Syntax& syntax) {
  const auto options = std::make_shared<Options>();
  const auto dir = AddPolicyDir(syntax, SecPolicy::kPolicyRoot);
  syntax.AddFlag("--fresh", options->fresh,
                 "Check as after a boot, whatever is installed on this host now");
  syntax.AddFormat(options->format, "the problems", {"text", "json", "sarif"});
  syntax.AddFlag("--werror", options->warningsAreErrors, "End with 1 for warnings too");
  syntax.AddList("--disable", options->unwanted, "Leave out this warning; may be given repeatedly")
      .Check(CheckWarningName)
      .NameValue("CODE");
  return [dir, options] { return Check(*dir, *options); };
}

}  // namespace

const Verb kCheck = {
    "check", "Look for every problem of the policy files, and change nothing",
    "Reads the whole policy as a load would, against a copy of what is installed, and prints "
    "every\n"
    "problem with its file, line and column: what a load refuses (errors), and what it accepts\n"
    "although it can hardly be meant (warnings). Needs no privilege. Exit status: 0 no errors,\n"
    "1 errors, or with --werror warnings.\n"
    "\n"
    "Examples:\n"
    "  secpolicy check                            the host's policy\n"
    "  secpolicy check --fresh ./my-policy        a directory, as if on a newly booted host\n"
    "  secpolicy check --werror --disable missing-path\n"
    "  secpolicy check --format sarif >check.sarif",
    Define};

}  // namespace SecPolicyCli
