#include <CLI/App.hpp>
#include <CLI/Config.hpp>
#include <CLI/Formatter.hpp>
#include <exception>
#include <iostream>
#include <string>
#include <vector>

#include "host/linux/system_log.h"
#include "root.h"
#include "text/suggestion.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

constexpr const Verb* kVerbs[] = {&kBoot,    &kCheck,    &kLoad,   &kLoadEarly, &kRestore, &kStatus,
                                  &kDisplay, &kWhy,      &kWhoCan, &kGraph,     &kDiff,    &kSave,
                                  &kHistory, &kRollback, &kLabel,  &kSettings};

constexpr char kAbout[] =
    "Installs a host's security policy from plain-text files and shows what is installed.";

constexpr char kFooter[] =
    "A first session, as an ordinary user, on a root of your own:\n"
    "  secpolicy --root ./r boot                        unpack the tardisks and install the "
    "policy\n"
    "  secpolicy --root ./r status                      is it loaded, and did it go well?\n"
    "  secpolicy --root ./r display                     look at what is installed now\n"
    "  secpolicy --root ./r why sshDom read /etc/ssh    may it, and which rule says so?\n"
    "  secpolicy --root ./r who-can use cap_sys_boot    which domains may?\n"
    "  secpolicy --root ./r graph --format svg >g.svg   the domains and their transitions\n"
    "  secpolicy --root ./r check                       find every problem of the policy files\n"
    "  secpolicy --root ./r load --plan                 what would a load change?\n"
    "  secpolicy --root ./r load -v                     install it again after an edit, and watch\n"
    "  secpolicy --root ./r load-early                  install only what early boot needs\n"
    "  secpolicy --root ./r label verify                which files have another label than they "
    "should?\n"
    "  secpolicy --root ./r diff ./old installed        how do two policies differ?\n"
    "  secpolicy --root ./r save good                   keep what is installed under a name\n"
    "  secpolicy --root ./r history                     what is saved?\n"
    "  secpolicy --root ./r rollback good               put it back\n"
    "  secpolicy --root ./r settings enforcement appDom permissive\n"
    "  secpolicy --root ./r restore                     apply the stored level\n"
    "\n"
    "'secpolicy VERB --help' explains one verb. The files are described in secpolicy(5).\n"
    "\n"
    "Exit status: 0 all well, 1 something failed, 2 wrong usage, 3 stopped because a domain that\n"
    "every host needs is missing.";

std::vector<std::string> VerbNames() {
  std::vector<std::string> names;
  for (const Verb* verb : kVerbs) names.emplace_back(verb->name);
  return names;
}

// ": one of A, B" for a verb that has kinds and was given none; else nothing.
std::string KindsOf(const CLI::App& verb) {
  if (!verb.get_subcommands().empty()) return "";
  std::string kinds;
  for (const CLI::App* kind : verb.get_subcommands([](const CLI::App*) { return true; })) {
    kinds += (kinds.empty() ? ": one of " : ", ") + kind->get_name();
  }
  return kinds;
}

// The message for a command line that cannot be understood, and where to read on.
std::string ExplainUsage(const CLI::App* app, const CLI::Error& error) {
  std::string command = "secpolicy";
  for (const CLI::App* verb : app->get_subcommands())
    command += std::string(" ") + verb->get_name();
  const std::vector<std::string> unknown = app->remaining();
  std::string problem = error.what();
  if (app->get_subcommands().empty() && !unknown.empty()) {
    problem = "there is no verb or option '" + unknown.front() + "'";
    const std::string nearest = NearestWord(unknown.front(), VerbNames());
    if (!nearest.empty()) problem += "; did you mean '" + nearest + "'?";
  } else if (!app->get_subcommands().empty() && error.get_name() == "RequiredError") {
    problem += KindsOf(*app->get_subcommands().front());
  }
  return "secpolicy: " + problem + "\n'" + command + " --help' explains the usage.\n";
}

// A verb that ended well has failed all the same when its output is lost.
ExitCode FlushOutput(ExitCode code) {
  std::cout.flush();
  if (std::cout.good()) return code;
  std::cerr << "secpolicy: standard output could not be written, so it is not complete"
            << std::endl;
  return code == kWell ? kFailed : code;
}

int Run(int argc, char** argv) {
  CLI::App app(kAbout, "secpolicy");
  std::string root;
  bool verbose = false;
  Action action;
  void (*prepare)() = nullptr;

  app.require_subcommand(1);
  app.fallthrough();
  app.footer(kFooter);
  app.failure_message(ExplainUsage);
  app.set_version_flag("--version", "secpolicy " SECPOLICY_VERSION);
  const CLI::Option* const rootOption =
      app.add_option("--root", root, "Work below DIR as if it were /; needs no privilege")
          ->type_name("DIR");
  app.add_flag("-v,--verbose", verbose, "Show the progress on standard error too");
  // Only the verb that is asked for gets its options: to define them all would slow every start.
  for (const Verb* verb : kVerbs) {
    CLI::App* const subcommand = app.add_subcommand(verb->name, verb->summary);
    subcommand->preparse_callback([&, verb, subcommand](std::size_t /*rest*/) {
      subcommand->footer(verb->help);
      action = verb->define(*subcommand);
      prepare = verb->prepare;
    });
  }

  try {
    app.parse(argc, argv);
  } catch (const CLI::ParseError& error) {
    return app.exit(error) == 0 ? kWell : kUsage;
  }
  bool isInRoot = false;
  try {
    if (prepare != nullptr) prepare();
    if (rootOption->count() > 0) EnterRoot(root);
    isInRoot = true;
    if (verbose) LinuxHost::ShowInformation();
    return FlushOutput(action());
  } catch (const std::exception& failure) {
    const std::string advice = isInRoot ? AdviseOnPrivilege() : "";
    std::cerr << "secpolicy: " << failure.what() << (advice.empty() ? "" : ". ") << advice
              << std::endl;
    return kFailed;
  }
}

}  // namespace
}  // namespace SecPolicyCli

int main(int argc, char** argv) { return SecPolicyCli::Run(argc, argv); }
