#include <iostream>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "check/check_options.h"
#include "check/policy_check.h"
#include "check/report_format.h"
#include "command_line.h"
#include "ending.h"
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

ExitCode Report(const CheckReport& report, const Options& options) {
  kFormats.at(options.format)(report.diagnostics, std::cout);
  const std::string& why = report.whyFresh;
  Summarize("check", DescribeFound(report.diagnostics) +
                         (why.empty() ? "" : "; checked as after a boot, since " + why));
  const std::size_t wrong = options.warningsAreErrors ? report.diagnostics.Count()
                                                      : report.diagnostics.Count(Severity::kError);
  return wrong > 0 ? kFailed : kWell;
}

ExitCode Check(const Options& options) {
  CheckReport report = CheckPolicy({.path = options.path,
                                    .fresh = options.fresh,
                                    .content = options.fromStandardInput ? &std::cin : nullptr,
                                    .unwanted = options.unwanted});
  report.diagnostics.Select(SelectionOf(options));
  return Report(report, options);
}

std::string CheckNumber(const std::string& word) {
  const bool isNumber = !word.empty() && word.size() < 10 &&
                        word.find_first_not_of("0123456789") == std::string::npos;
  return isNumber ? "" : "'" + word + "' is not a number";
}

Action Define(Syntax& syntax) {
  const auto options = std::make_shared<Options>();
  syntax
      .AddOption("DIR", options->path,
                 "The policy directory, or a file in it, as seen from the root")
      .Offer(OfferFiles())
      .ShowDefault();
  AddFresh(syntax, options->fresh);
  syntax.AddFormat(options->format, "the problems", {"text", "json", "sarif"});
  syntax.AddFlag("--stdin", options->fromStandardInput,
                 "Take standard input for the content of the file");
  syntax.AddFlag("--errors-only", options->errorsOnly, "Show no warnings");
  syntax.AddList("--only", options->wanted, "Show only this problem; may be given repeatedly")
      .Check(WhyNoCode)
      .NameValue("CODE");
  syntax.AddOption("--max", options->most, "Show at most so many problems")
      .Check(CheckNumber)
      .NameValue("N");
  syntax.AddFlag("--werror", options->warningsAreErrors, "End with 1 for warnings too");
  AddUnwantedCodes(syntax, options->unwanted);
  return [options] { return Check(*options); };
}

}  // namespace

const Verb kCheck = {
    "check",
    "Look for every problem of the policy files, and change nothing",
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
    Define,
    nullptr,
    true};

}  // namespace SecPolicyCli
