#include <unistd.h>

#include <CLI/App.hpp>
#include <cerrno>
#include <string>
#include <vector>

#include "label/label_actions.h"
#include "library_call.h"
#include "root.h"
#include "scratch/used_state.h"
#include "secpolicy/policy_root.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

struct Arguments {
  std::string label;
  std::vector<std::string> paths;
  std::string policy = SecPolicy::kPolicyRoot;
  bool wholeTrees = false;
  bool dryRun = false;

  std::string LabelDir() const { return policy + "/" + SecPolicy::kFileLabelsDir; }
};

// One thing to do with labels.
struct Kind {
  const char* name;
  const char* summary;
  const char* help;
  void (*addArguments)(CLI::App& app, Arguments& arguments);
  std::string (*run)(LabelRun& run, const Arguments& arguments);
};

void AddPaths(CLI::App& app, Arguments& arguments, const char* meaning, bool required) {
  app.add_option("PATH", arguments.paths, meaning)->required(required);
}

void AddWholeTrees(CLI::App& app, Arguments& arguments) {
  app.add_flag("-R,--recursive", arguments.wholeTrees, "Everything below the directories too");
}

void AddPolicy(CLI::App& app, Arguments& arguments) {
  app.add_option("--policy", arguments.policy, "The policy directory, as seen from the root")
      ->type_name("DIR")
      ->capture_default_str();
}

constexpr Kind kKinds[] = {
    {"get", "Print the labels of files",
     "Prints 'PATH: LABEL' for each file. In a tree, links and sockets are left out: they carry "
     "no\n"
     "label.\n"
     "\n"
     "Examples:\n"
     "  secpolicy label get /usr/sbin/sshd\n"
     "  secpolicy label get -R /etc | grep -v ': unlabeled$'",
     [](CLI::App& app, Arguments& arguments) {
       AddWholeTrees(app, arguments);
       AddPaths(app, arguments, "The files", true);
     },
     [](LabelRun& run, const Arguments& arguments) {
       return ShowLabels(run, arguments.paths, arguments.wholeTrees);
     }},
    {"set", "Give files a label, until the next load or relabel",
     "Gives the files a label that the policy declares, in place of the one that they have. A "
     "load\n"
     "or relabel gives those that the policy names the policy's label again. A tree ends at the\n"
     "first file that fails.\n"
     "\n"
     "Examples:\n"
     "  secpolicy label set sshKey /etc/ssh/new_key\n"
     "  secpolicy label set -R ioFilterData /var/cache/io-filters",
     [](CLI::App& app, Arguments& arguments) {
       AddWholeTrees(app, arguments);
       app.add_option("LABEL", arguments.label, "The object label")->required();
       AddPaths(app, arguments, "The files", true);
     },
     [](LabelRun& run, const Arguments& arguments) {
       return GiveLabel(run, arguments.label, arguments.paths, arguments.wholeTrees);
     }},
    {"verify", "Print the files whose label is not the policy's",
     "Compares the label of every file that fileLabels/ of the policy names with the one that a\n"
     "load gives it, and prints each difference with the line that decides. Changes nothing. Exit\n"
     "status: 0 all as the policy says, 1 not so.\n"
     "\n"
     "Examples:\n"
     "  secpolicy label verify                    all files that the policy names\n"
     "  secpolicy label verify /etc /usr/sbin     those that are there",
     [](CLI::App& app, Arguments& arguments) {
       AddPolicy(app, arguments);
       AddPaths(app, arguments, "Only what is at or below one of these", false);
     },
     [](LabelRun& run, const Arguments& arguments) {
       return VerifyLabels(run, arguments.LabelDir(), arguments.paths);
     }},
    {"relabel", "Give files the label that the policy says",
     "Gives every file that fileLabels/ of the policy names the label that a load gives it, and\n"
     "prints the number of files for each label. Other files keep theirs. A file that fails is\n"
     "reported, and the others are done. Shows the progress on a terminal.\n"
     "\n"
     "Examples:\n"
     "  secpolicy label relabel --dry-run         print what would change, and change nothing\n"
     "  secpolicy label relabel\n"
     "  secpolicy label relabel /var              only what is at or below /var",
     [](CLI::App& app, Arguments& arguments) {
       AddPolicy(app, arguments);
       app.add_flag("-n,--dry-run", arguments.dryRun,
                    "Print what would change, and change nothing");
       AddPaths(app, arguments, "Only what is at or below one of these", false);
     },
     [](LabelRun& run, const Arguments& arguments) {
       return Relabel(run, arguments.LabelDir(), arguments.paths, arguments.dryRun);
     }},
};

ExitCode Run(const Kind& kind, const Arguments& arguments) {
  const std::string verb = std::string("label ") + kind.name;
  if (access(StatePath().c_str(), F_OK) != 0 && errno == ENOENT) {
    return Refuse(verb,
                  "nothing is installed below this root, so there are no labels. Run 'secpolicy "
                  "boot' first, or name the root that was booted (--root DIR).");
  }
  std::string ending;
  return CallLibrary(
      verb, "",
      [&] {
        LabelRun run;
        ending = kind.run(run, arguments);
      },
      AdviseOnPrivilege, [&] { return ending; });
}

Action Define(CLI::App& app) {
  app.require_subcommand(1);
  const auto arguments = std::make_shared<Arguments>();
  const auto action = std::make_shared<Action>();
  for (const Kind& kind : kKinds) {
    CLI::App* const subcommand = app.add_subcommand(kind.name, kind.summary);
    subcommand->footer(kind.help);
    kind.addArguments(*subcommand, *arguments);
    subcommand->parse_complete_callback(
        [=, &kind] { *action = [=, &kind] { return Run(kind, *arguments); }; });
  }
  return [action] { return (*action)(); };
}

}  // namespace

const Verb kLabel = {
    "label", "Show, give and verify the labels of files",
    "What gives a file its label in a load is a line of fileLabels/: 'verify' compares the files\n"
    "with those lines, and 'relabel' applies them again. 'secpolicy label KIND --help' explains "
    "each.\n"
    "\n"
    "Examples:\n"
    "  secpolicy label get -R /etc/ssh           which labels are there?\n"
    "  secpolicy label set sshKey /etc/ssh/new_key\n"
    "  secpolicy label verify                    which files differ from the policy?\n"
    "  secpolicy label relabel --dry-run",
    Define};

}  // namespace SecPolicyCli
