#include <exception>
#include <iostream>

#include "command_line.h"
#include "compare/policy_diff.h"
#include "ending.h"
#include "host/linux/operation/log_use.h"
#include "refusal.h"
#include "root.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

struct Options {
  std::string before;
  std::string after;
  std::string format;
  bool stat = false;
};

ExitCode Compare(const Options& options) {
  const LinuxHost::DroppedLog dropped;
  SecPolicy::PolicyObserver nobody;
  Side before = ReadSide(options.before, nobody);
  Side after = ReadSide(options.after, nobody);
  if (before.labels.has_value() != after.labels.has_value()) {
    Summarize("diff",
              "file labels and the transitions of tardisks are left out: a directory has the "
              "labels only, and a state the transitions");
  }
  const Comparison diff = Diff(std::move(before), std::move(after));
  const auto write = options.stat               ? WriteDiffStat
                     : options.format == "json" ? WriteDiffJson
                                                : WriteDiffText;
  write(diff, std::cout);
  Summarize("diff", diff.IsSame() ? "the same" : "different");
  return diff.IsSame() ? kWell : kFailed;
}

// A program has to tell "different" from "not compared".
ExitCode CompareOrRefuse(const Options& options) {
  try {
    return Compare(options);
  } catch (const Refusal& refusal) {
    Summarize("diff", refusal.what());
  } catch (const std::exception& failure) {
    Summarize("diff", WithAdvice(failure.what()));
  }
  return kUsage;
}

Action Define(Syntax& syntax) {
  const auto options = std::make_shared<Options>();
  syntax.AddOption("A", options->before, "A policy directory, 'installed', or a saved state")
      .Require();
  syntax.AddOption("B", options->after, "What it is compared with; the same").Require();
  const Option format = syntax.AddFormat(options->format, "the differences", {"text", "json"});
  syntax.AddFlag("--stat", options->stat, "Only count what differs").Exclude(format);
  return [options] { return CompareOrRefuse(*options); };
}

}  // namespace

const Verb kDiff = {
    "diff",
    "Compare two policies: directories, what is installed, saved states",
    "Prints how B differs from A: domains, enforcement levels, rules, objects, and of two\n"
    "directories the file labels. A name with a slash is a policy directory; 'installed' is what\n"
    "is installed now; any other name is a saved state or, where there is none of that name, a\n"
    "policy directory (./NAME is always one). A directory is what it installs on an empty host,\n"
    "with its early and partner domains; compared with a state, the transitions of tardisks are\n"
    "left out. Changes nothing. Exit status: 0 the same, 1 different, 2 not\n"
    "compared.\n"
    "\n"
    "Examples:\n"
    "  secpolicy diff installed /etc/zorvan/secpolicy     what was edited since the load?\n"
    "  secpolicy diff ./old ./new                         two directories\n"
    "  secpolicy diff --stat ./old ./new                  how much, and where?\n"
    "  secpolicy diff before-upgrade installed            since 'secpolicy save before-upgrade'",
    Define,
    nullptr,
    true};

}  // namespace SecPolicyCli
