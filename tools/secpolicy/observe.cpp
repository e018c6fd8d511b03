#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <iostream>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "command_line.h"
#include "ending.h"
#include "host/enforce/supervise/asked.h"
#include "host/linux/common/descriptor.h"
#include "host/linux/common/host_error.h"
#include "host/linux/common/write_all.h"
#include "installed/installed_policy.h"
#include "observe/asked_rules.h"
#include "observe/proposal.h"
#include "observe/watch.h"
#include "policy/call_set.h"
#include "query/ask.h"
#include "query/named.h"
#include "query/question.h"
#include "root.h"
#include "text/format.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

using LinuxHost::Descriptor;
using LinuxHost::ThrowErrno;

struct Options {
  std::string domain;
  std::string file;
  std::vector<std::string> command;
};

// A file that is made before anything is watched, so that nothing is watched in vain. It goes again
// when nothing was written, and never takes the place of another.
class NewFile {
 public:
  explicit NewFile(const std::string& file)
      : path(file),
        name(OutsidePath(file)),
        created(open(file.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, kMode)) {
    if (created.IsOpen()) return;
    if (errno != EEXIST) ThrowErrno("cannot make ", name);
    throw LinuxHost::HostError(
        EEXIST, name + " is there already, and stays as it is: name a new file, or leave --write " +
                    "out and copy the lines that are printed");
  }
  NewFile(const NewFile&) = delete;
  NewFile& operator=(const NewFile&) = delete;
  ~NewFile() {
    if (!isWritten) unlink(path.c_str());
  }

  const std::string& Name() const { return name; }

  void Write(const std::string& text) {
    if (!LinuxHost::WriteAll(created.Number(), text)) ThrowErrno("cannot write ", name);
    isWritten = true;
  }

 private:
  static constexpr mode_t kMode = 0644;

  const std::string path;
  const std::string name;  // for people
  const Descriptor created;
  bool isWritten = false;
};

// Not what every program does and nothing can be learnt from.
bool IsNoticed(std::string_view call) {
  static const Policy::CallSet& start = *Policy::FindCallSet("@start");
  return Enforce::AsksMore(call) || !start.Has(call);
}

// A socket that is only made says nothing of what it is for: programs try out what there is, and a
// pair reaches nobody else.
bool IsOnlyTried(const Enforce::Attempt& attempt, const Policy::Question& question) {
  const auto* const asked = std::get_if<Policy::ParameterQuestion>(&question);
  if (asked == nullptr) return false;
  const bool isPair = attempt.call == "socketpair";
  return (isPair && asked->check == "socket_family") ||
         ((isPair || attempt.call == "socket") && asked->check == "socket_type");
}

WatchedEnd Observe(const Options& options, SecPolicy::TeskAccessInterfaceImpl& access,
                   Observations& observations) {
  const auto notice = [&](const Enforce::Attempt& attempt) {
    if (!attempt.isStart) {
      observations.Note(Policy::WordsQuestion{.kind = Policy::RuleKind::kSyscall,
                                              .words = {std::string(attempt.call)}},
                        attempt.program);
    }
    const std::string& program = attempt.isStart ? options.command.front() : attempt.program;
    for (const Policy::Question& asked : attempt.asked) {
      if (IsOnlyTried(attempt, asked)) continue;
      observations.Note(WithLabel(asked, access), program);
    }
  };
  return RunWatched("observe", options.command, {.isNoticed = IsNoticed, .notice = notice});
}

std::string TextOf(const Options& options, const std::vector<std::string>& lines) {
  std::string command;
  for (const std::string& word : options.command) command += " " + Visible(word);
  std::string text = "# Proposed from one run of" + command + "\n";
  for (const std::string& line : lines) text += line + "\n";
  return text;
}

ExitCode Propose(const Options& options) {
  SecPolicy::TeskAccessInterfaceImpl access;
  Policy::InstalledDomain domain;
  if (!options.domain.empty()) domain = RequireInstalledDomain(options.domain, access);
  std::optional<NewFile> file;
  if (!options.file.empty()) file.emplace(options.file);
  Observations observations;
  const WatchedEnd end = Observe(options, access, observations);
  if (!end.isStarted) return end.exitCode;
  const std::vector<std::string> lines = SecPolicyCli::Propose(observations, domain);
  const std::string text = TextOf(options, lines);
  if (!file) {
    std::cout << text;
    return end.exitCode;
  }
  file->Write(text);
  Summarize("observe", CountOf(lines.size(), "line") + " proposed in " + file->Name());
  return end.exitCode;
}

ExitCode Start(const Options& options) {
  try {
    return Propose(options);
  } catch (const LinuxHost::HostError& failure) {
    Summarize("observe", WithAdvice(failure.what()));
  } catch (const Braxo::Lib::BraxoException& failure) {
    Summarize("observe", failure.what());
  }
  return kNotConfined;
}

// All that was given may stand behind "--": then there is no domain.
void TellDomainFromCommand(Options& options, std::size_t wordsBehindDashes) {
  if (!options.domain.empty() && options.command.size() < wordsBehindDashes) {
    options.command.insert(options.command.begin(), std::exchange(options.domain, {}));
  }
  if (options.command.empty()) throw QuestionError("CMD is required, behind --");
}

Action Define(Syntax& syntax) {
  const auto options = std::make_shared<Options>();
  syntax.AddOption("DOMAIN", options->domain,
                   "Leave out what the rules of this domain grant, by its name or its number");
  syntax.AddList("CMD", options->command, "The program and its arguments, behind --");
  syntax
      .AddOption("--write", options->file,
                 "Write the lines to a new file, whose path begins at the root")
      .NameValue("FILE");
  return [=, wordsBehindDashes = syntax.WordsBehindDashes()] {
    const auto start = [=] {
      TellDomainFromCommand(*options, wordsBehindDashes);
      return Start(*options);
    };
    return Ask("observe", start, kNotConfined);
  };
}

}  // namespace

const Verb kObserve = {
    "observe", "Run a program, watch what it does, and propose the rules for it",
    "Starts CMD without a domain, refuses nothing, and when it and all that it started have "
    "ended,\n"
    "prints the lines of a policy file by which a domain could have run it: system calls, checks,\n"
    "capabilities, and files by their labels, where they have one, else by their paths. Behind\n"
    "each line stands why it is there. With DOMAIN, what its installed rules grant is left out.\n"
    "The root has to be booted, as the labels of its files are looked at, and FILE is seen from\n"
    "there, as CMD is: with --root r, /etc/x is r/etc/x.\n"
    "A run shows only what it did: look at every line, and let the domain be permissive for a\n"
    "while.\n"
    "\n"
    "Exit status: that of CMD; 126 when it could not be watched or started, 127 when there is no\n"
    "such program, 2 for wrong usage.\n"
    "\n"
    "Examples:\n"
    "  secpolicy observe --write /etc/zorvan/secpolicy/domains/webDom -- /usr/sbin/webd\n"
    "  secpolicy observe webDom -- /usr/sbin/webd -t     what is still missing?",
    Define, OpenProc};

}  // namespace SecPolicyCli
