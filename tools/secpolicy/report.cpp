#include <iostream>
#include <memory>
#include <string>

#include "command_line.h"
#include "ending.h"
#include "report/page.h"
#include "report/report_json.h"
#include "report/report_source.h"
#include "text/format.h"
#include "text/replace_file.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

constexpr char kStandardOutput[] = "-";

struct Options {
  std::string policy = "installed";
  std::string output;
  std::string against;
  std::string title;
};

std::size_t CountRules(const Policy::InstalledPolicy& policy) {
  std::size_t count = 0;
  for (const Policy::InstalledDomain& domain : policy.domains) count += domain.rules.size();
  return count;
}

std::string TitleOf(const std::string& policy) {
  return policy == "installed" ? "Installed policy" : "Policy " + policy;
}

ExitCode Report(const Options& options) {
  ReportSource source = ReadReportSource(options.policy, options.against);
  source.title = options.title.empty() ? TitleOf(options.policy) : options.title;
  const std::string page = MakePage(source.title, ReportToJson(source));
  if (options.output == kStandardOutput) {
    std::cout << page;
  } else {
    ReplaceFile(options.output, page);
  }
  Summarize("report", "done (" + CountOf(source.policy.domains.size(), "domain") + ", " +
                          CountOf(CountRules(source.policy), "rule") + ")");
  return kWell;
}

Action Define(Syntax& syntax) {
  const auto options = std::make_shared<Options>();
  syntax
      .AddOption("POLICY", options->policy,
                 "A policy directory, 'installed', or a saved state, as for 'secpolicy diff'")
      .ShowDefault();
  syntax
      .AddOption("-o,--output", options->output,
                 "Put the page into FILE, below the root; '-' is standard output")
      .NameValue("FILE")
      .Require();
  syntax
      .AddOption("--against", options->against,
                 "Show how the policy differs from this one, too; the same words")
      .NameValue("POLICY");
  syntax.AddOption("--title", options->title, "What the page is headed by")
      .NameValue("TEXT")
      .Offer(OfferNothing());
  return [options] { return Report(*options); };
}

}  // namespace

const Verb kReport = {
    "report", "Make a page of a policy to look at in a browser",
    "Writes one file that needs no network and nothing else: every rule with its file and line,\n"
    "domains, labels and files to search and follow, the graph of transitions, who may do what "
    "and\n"
    "why, what of the installed policy this kernel can enforce, and with --against how it differs\n"
    "from another one. The same policy makes the same bytes. Changes nothing. Every path is below\n"
    "the root.\n"
    "\n"
    "Examples:\n"
    "  secpolicy report -o /tmp/policy.html\n"
    "  secpolicy report ./new --against installed -o /tmp/change.html   what would be new?\n"
    "  secpolicy --root r report /new -o /page.html      of r/new, into r/page.html\n"
    "  secpolicy --root r report -o - >policy.html",
    Define};

}  // namespace SecPolicyCli
