#include <fcntl.h>
#include <unistd.h>

#include <exception>
#include <iostream>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "command_line.h"
#include "complete/completion.h"
#include "ending.h"
#include "host/linux/kernel/module_publication.h"
#include "host/linux/operation/log_use.h"
#include "host/linux/operation/state_use.h"
#include "refusal.h"
#include "root.h"
#include "terminal/color.h"
#include "terminal/pager.h"
#include "terminal/size.h"
#include "text/terminal_guard.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

const VerbGroup kVerbs[] = {
    {"Write a policy", {&kInit, &kNew, &kCheck, &kExplain, &kWords, &kLsp}},
    {"Install it",
     {&kBoot, &kLoad, &kLoadEarly, &kBundle, &kRestore, &kSettings, &kLabel, &kModule}},
    {"See what is installed", {&kStatus, &kDisplay, &kGraph, &kReport, &kDiff, &kDrift}},
    {"Ask about it", {&kWhy, &kWhoCan, &kRules, &kPath, &kFeatures}},
    {"Change it at run time", {&kDomain, &kFilePolicy, &kCapability, &kParamCheck}},
    {"Run programs in it", {&kRun, &kExec, &kObserve}},
    {"Go back", {&kSave, &kHistory, &kSaved, &kRollback}}};

constexpr char kAbout[] =
    "Installs a host's security policy from plain-text files and shows what is installed.";

constexpr char kFooter[] =
    "For example, as an ordinary user, in a directory of your own:\n"
    "  mkdir r\n"
    "  secpolicy --root r init                      # write a first policy\n"
    "  secpolicy --root r new domain webDom         # and a domain for your program\n"
    "  secpolicy --root r check                     # find every problem of the files\n"
    "  secpolicy --root r explain unknown-word      # what does this one mean?\n"
    "  secpolicy --root r boot                      # label files, install the policy\n"
    "  secpolicy --root r status                    # did that go well?\n"
    "  secpolicy --root r display                   # look at what is installed now\n"
    "  secpolicy --root r why hostDom read /etc     # may it, and which rule says so?\n"
    "  secpolicy --root r who-can use cap_sys_boot  # which domains may?\n"
    "  secpolicy --root r rules --label policyFile  # which rules speak of it?\n"
    "  secpolicy --root r path hostDom appDom       # how is it reached?\n"
    "  secpolicy --root r words calls               # what can stand behind -s?\n"
    "  secpolicy --root r graph >domains.dot        # draw the domains\n"
    "  secpolicy --root r report -o /policy.html    # all of it, to look at in a browser\n"
    "  secpolicy --root r features --for webDom     # what can this kernel enforce?\n"
    "  secpolicy --root r run webDom --explain      # and what is the kernel told?\n"
    "  secpolicy --root r load --plan               # what would an edit change?\n"
    "  secpolicy --root r load -v                   # install it again, and watch\n"
    "  secpolicy --root r load-early                # only what early boot needs\n"
    "  secpolicy --root r label verify              # which files differ from it?\n"
    "  secpolicy --root r drift                     # what is not as the policy says?\n"
    "  secpolicy --root r save good                 # keep what is installed now\n"
    "  secpolicy --root r settings enforcement webDom permissive\n"
    "  secpolicy --root r restore                   # apply the stored level\n"
    "  secpolicy --root r domain create job7        # one until the next boot\n"
    "  secpolicy --root r file-policy add job7 rw /srv/jobs/7\n"
    "  secpolicy --root r capability grant job7 cap_net_bind_service\n"
    "  secpolicy --root r param-check set job7 bind_port 80 grant\n"
    "  secpolicy --root r diff good installed       # how do two policies differ?\n"
    "  secpolicy --root r history                   # what is saved?\n"
    "  secpolicy --root r saved show good           # and what does it hold?\n"
    "  secpolicy --root r rollback good             # put it back\n"
    "\n"
    "With programs below the root, or on a host that was booted:\n"
    "  secpolicy run appDom -- /bin/sh              # in this domain\n"
    "  secpolicy exec -- /usr/sbin/sshd             # in that of its label\n"
    "  secpolicy module start                       # every process, by the kernel itself\n"
    "  secpolicy observe -- /usr/bin/webd           # which rules would it need?\n"
    "  secpolicy lsp                                # for an editor, as one types\n"
    "  secpolicy bundle show web.bundle             # what was signed for many hosts?\n"
    "\n"
    "'secpolicy help VERB' explains one verb. The files are described in secpolicy(5).\n"
    "\n"
    "Exit status: 0 all well, 1 something failed, 2 wrong usage, 3 stopped because a domain that\n"
    "every host needs is missing.";

// What the command writes to.
class Terminal {
 public:
  // The guards are there first, so that every text is safe.
  void Prepare(const CommandLine& line, bool isLong) {
    const std::optional<TerminalSize> size = SizeOfTerminal(STDOUT_FILENO);
    if (size && isLong && line.IsPagerWanted()) StartPager(*size);
    if (WantsColors(line.ColorChoice(), size.has_value())) AllowColors(std::cout, output.Target());
  }

  ExitCode End(ExitCode code) {
    std::cout.flush();
    return !pager || pager->End() || code != kWell ? code : kFailed;
  }

 private:
  void StartPager(const TerminalSize& size) {
    const std::vector<std::string> command = PagerCommand();
    if (command.empty()) return;
    pager.emplace(command, size);
    output.ForwardTo(*pager);
    if (IsSameTerminal(STDOUT_FILENO, STDERR_FILENO)) errors.ForwardTo(*pager);
  }

  std::optional<Pager> pager;
  TerminalGuard output{std::cout, STDOUT_FILENO};
  TerminalGuard errors{std::cerr, STDERR_FILENO};
};

// A verb that ended well has failed all the same when its output is lost.
ExitCode FlushOutput(ExitCode code) {
  std::cout.flush();
  if (std::cout.good()) return code;
  std::cerr << "secpolicy: standard output could not be written, so it is not complete"
            << std::endl;
  return code == kWell ? kFailed : code;
}

ExitCode Act(const CommandLine& commandLine, Terminal& terminal) {
  bool isInRoot = false;
  try {
    terminal.Prepare(commandLine, commandLine.AskedVerb().isLong);
    commandLine.Prepare();
    if (const auto root = commandLine.Root()) EnterRoot(*root);
    isInRoot = true;
    std::optional<LinuxHost::ShownLog> shown;
    if (commandLine.IsVerbose()) shown.emplace();
    return FlushOutput(commandLine.Act());
  } catch (const QuestionError& error) {
    Summarize(commandLine.AskedCommand(), error.what());
    std::cerr << "'secpolicy " << commandLine.AskedCommand() << " --help' explains the usage."
              << std::endl;
    return kUsage;
  } catch (const Refusal& refusal) {
    return Refuse(commandLine.AskedCommand(), refusal.what());
  } catch (const std::exception& failure) {
    const std::string message = isInRoot ? WithAdvice(failure.what()) : failure.what();
    std::cerr << "secpolicy: " << commandLine.AskedCommand() << ": " << VisibleLines(message)
              << std::endl;
    return kFailed;
  }
}

// The commits of a verb are told the module at once, and loudly where that fails.
ExitCode ActAndPublish(const CommandLine& commandLine, Terminal& terminal) {
  const LinuxHost::HeldPublication held;
  const ExitCode code = Act(commandLine, terminal);
  try {
    LinuxHost::PublishCommitted();
    return code;
  } catch (const std::exception& failure) {
    Summarize(commandLine.AskedCommand(),
              std::string("the policy is installed, and the kernel was not told of it: ") +
                  failure.what());
    return code == kWell ? kFailed : code;
  }
}

ExitCode Run(int argc, char** argv, Terminal& terminal) {
  CommandLine commandLine({kAbout, kFooter, "secpolicy " SECPOLICY_VERSION}, kVerbs);
  if (argc > 1 && std::string_view(argv[1]) == kAskForWords) {
    return Complete(commandLine, {argv + 2, argv + argc});
  }
  const auto showHelp = [&](const std::string& text) {
    terminal.Prepare(commandLine, true);
    std::cout << FitTerminal(text);
  };
  if (const auto end = commandLine.Read(argc, argv, showHelp)) return *end;
  return ActAndPublish(commandLine, terminal);
}

// Puts something that can be neither read nor written in place of the standard descriptors that the
// caller has closed: a file that is opened next would be taken for one of them. Not /dev/null,
// which a root may lack and which would let output vanish unseen.
void TakeClosedDescriptors() {
  int lowest = STDIN_FILENO;
  while (lowest >= 0 && lowest <= STDERR_FILENO) lowest = open("/", O_PATH | O_CLOEXEC);
  if (lowest >= 0) close(lowest);
}

}  // namespace
}  // namespace SecPolicyCli

int main(int argc, char** argv) {
  SecPolicyCli::TakeClosedDescriptors();
  LinuxHost::OwnProcess();
  SecPolicyCli::Terminal terminal;
  return terminal.End(SecPolicyCli::Run(argc, argv, terminal));
}
