#include "options.h"

#include <iostream>
#include <string_view>
#include <vector>

#include "text/visible.h"
#include "verb.h"

namespace SecPolicyLog {
namespace {

constexpr std::string_view kHelp =
    "Usage: secpolicy-log [--once] [--format FORMAT]\n"
    "Tells what the module refuses, as it happens: in which domain, to which program, and which\n"
    "rule decides. The journal is told, too, and 'secpolicy why --last-refusal' knows it then.\n"
    "\n"
    "  --once             tell what there is, and end\n"
    "  --format FORMAT    how to write a refusal to standard output: text or json, one line each\n"
    "  --help             print this text\n"
    "  --version          print the version\n"
    "\n"
    "Exit status: 0 it was ended, or the module was; 1 something failed, 2 wrong usage.\n";

constexpr std::string_view kVersion = "secpolicy-log " SECPOLICY_VERSION "\n";

// The words of the command line, from left to right.
using Words = std::vector<std::string>;

std::optional<Options> Refuse(const std::string& what, int* exitCode) {
  std::cerr << "secpolicy-log: " << SecPolicyCli::Visible(what)
            << ". 'secpolicy-log --help' explains the usage" << std::endl;
  *exitCode = SecPolicyCli::kUsage;
  return std::nullopt;
}

std::optional<Options> Print(std::string_view text, int* exitCode) {
  std::cout << text << std::flush;
  *exitCode = std::cout.good() ? SecPolicyCli::kWell : SecPolicyCli::kFailed;
  return std::nullopt;
}

}  // namespace

std::optional<Options> ReadOptions(int argc, char** argv, int* exitCode) {
  const Words words(argv + (argc > 0 ? 1 : 0), argv + argc);
  Options options;
  for (auto word = words.begin(); word != words.end(); ++word) {
    if (*word == "--help") return Print(kHelp, exitCode);
    if (*word == "--version") return Print(kVersion, exitCode);
    if (*word == "--once") {
      options.isOnce = true;
    } else if (*word == "--format") {
      if (++word == words.end()) return Refuse("--format needs a value", exitCode);
      if (*word != "text" && *word != "json")
        return Refuse("there is no format '" + *word + "'; there are text and json", exitCode);
      options.isJson = *word == "json";
    } else {
      return Refuse("there is no option '" + *word + "'", exitCode);
    }
  }
  return options;
}

}  // namespace SecPolicyLog
