#include <algorithm>
#include <filesystem>
#include <iostream>
#include <memory>
#include <string>

#include "begin/new_file.h"
#include "begin/starter_policy.h"
#include "command_line.h"
#include "ending.h"
#include "policy_dir.h"
#include "query/named.h"
#include "root.h"
#include "secpolicy/policy_root.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

struct Options {
  std::string name;
  std::string policyDir = SecPolicy::kPolicyRoot;
};

ExitCode MakeDomain(const Options& options) {
  if (const auto refused = RefuseMissingDir("new domain", options.policyDir)) return *refused;
  const std::string file = DomainFile(options.name, options.policyDir);
  if (std::filesystem::exists(file)) {
    return Refuse("new domain", "there is a domain " + options.name + " already: " +
                                    OutsidePath(file) + " defines it. Nothing was written.");
  }
  return CallLibrary(
      "new domain",
      [&](ErrorList&) {
        WriteNewFile(file, StarterDomain(options.name));
        std::cout << Visible(OutsidePath(file)) << '\n';
      },
      AdviseOnPrivilege,
      [&] {
        return "done. Write into the file what it may do, and into that of hostDom who gets "
               "there; " +
               Call("check") + " reads both.";
      });
}

Action DefineDomain(Syntax& syntax) {
  const auto options = std::make_shared<Options>();
  syntax.AddOption("NAME", options->name, "The name of the domain")
      .Check(WhyNoDomainName)
      .Require();
  syntax.AddOption("--policy", options->policyDir, "The policy directory, as seen from the root")
      .NameValue("DIR")
      .ShowDefault();
  return [options] { return MakeDomain(*options); };
}

const Kind kKinds[] = {{"domain", "Write the file of a new domain, with comments",
                        "Example:\n"
                        "  secpolicy new domain webDom",
                        DefineDomain}};

Action Define(Syntax& syntax) { return syntax.AddKinds(kKinds); }

}  // namespace

const Verb kNew = {
    "new", "Write a skeleton of what a policy needs",
    "Writes a file with comments that say what belongs into it, and overwrites none.\n"
    "\n"
    "Example:\n"
    "  secpolicy new domain webDom",
    Define};

}  // namespace SecPolicyCli
