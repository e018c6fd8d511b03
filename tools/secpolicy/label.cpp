#include <string>
#include <vector>

#include "command_line.h"
#include "ending.h"
#include "host/linux/operation/state_use.h"
#include "label/label_actions.h"
#include "root.h"
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
  std::string format;

  std::string LabelDir() const { return policy + "/" + SecPolicy::kFileLabelsDir; }
};

// One thing to do with labels.
struct LabelKind {
  const char* name;
  const char* summary;
  const char* help;
  void (*addArguments)(Syntax& syntax, Arguments& arguments);
  std::string (*run)(LabelRun& run, const Arguments& arguments);
};

void AddPaths(Syntax& syntax, Arguments& arguments, const char* meaning, bool required) {
  syntax.AddList("PATH", arguments.paths, meaning).Require(required);
}

void AddWholeTrees(Syntax& syntax, Arguments& arguments) {
  syntax.AddFlag("-R,--recursive", arguments.wholeTrees, "Everything below the directories too");
}

void AddPolicy(Syntax& syntax, Arguments& arguments) {
  syntax.AddOption("--policy", arguments.policy, "The policy directory, as seen from the root")
      .NameValue("DIR")
      .ShowDefault();
}

void AddFormat(Syntax& syntax, Arguments& arguments) {
  syntax.AddFormat(arguments.format, "it", {"text", "json"});
}

constexpr LabelKind kLabelKinds[] = {
    {"get", "Print the labels of files",
     "Prints 'PATH: LABEL' for each file, and '(inherited)' where that is the label of a "
     "directory\n"
     "above. In a tree, links and sockets are left out: they have no label.\n"
     "\n"
     "Examples:\n"
     "  secpolicy label get /usr/sbin/sshd\n"
     "  secpolicy label get -R /etc | grep -v ': unlabeled'\n"
     "  secpolicy label get -R /etc --format json | jq -r '.files[] | select(.inherited) | .path'",
     [](Syntax& syntax, Arguments& arguments) {
       AddFormat(syntax, arguments);
       AddWholeTrees(syntax, arguments);
       AddPaths(syntax, arguments, "The files", true);
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
     [](Syntax& syntax, Arguments& arguments) {
       AddWholeTrees(syntax, arguments);
       syntax.AddOption("LABEL", arguments.label, "The object label, by its name or its number")
           .Require()
           .Offer(OfferObjects());
       AddPaths(syntax, arguments, "The files", true);
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
     [](Syntax& syntax, Arguments& arguments) {
       AddFormat(syntax, arguments);
       AddPolicy(syntax, arguments);
       AddPaths(syntax, arguments, "Only what is at or below one of these", false);
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
     [](Syntax& syntax, Arguments& arguments) {
       AddFormat(syntax, arguments);
       AddPolicy(syntax, arguments);
       syntax.AddFlag("-n,--dry-run", arguments.dryRun,
                      "Print what would change, and change nothing");
       AddPaths(syntax, arguments, "Only what is at or below one of these", false);
     },
     [](LabelRun& run, const Arguments& arguments) {
       return Relabel(run, arguments.LabelDir(), arguments.paths, arguments.dryRun);
     }},
};

ExitCode Run(const LabelKind& kind, const Arguments& arguments) {
  const std::string verb = std::string("label ") + kind.name;
  if (LinuxHost::IsStateMissing()) return RefuseWithoutState(verb);
  std::string ending;
  return CallLibrary(
      verb,
      [&](ErrorList& errors) {
        LabelRun run(errors, arguments.format == "json");
        ending = kind.run(run, arguments);
      },
      AdviseOnPrivilege, [&] { return ending; });
}

Action DefineKind(const LabelKind& kind, Syntax& syntax) {
  const auto arguments = std::make_shared<Arguments>();
  kind.addArguments(syntax, *arguments);
  return [=, &kind] { return Run(kind, *arguments); };
}

Action Define(Syntax& syntax) {
  std::vector<Kind> kinds;
  for (const LabelKind& kind : kLabelKinds) {
    kinds.push_back({kind.name, kind.summary, kind.help,
                     [&kind](Syntax& arguments) { return DefineKind(kind, arguments); }});
  }
  return syntax.AddKinds(kinds);
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
