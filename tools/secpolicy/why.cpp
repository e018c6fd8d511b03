#include <iostream>
#include <memory>
#include <string>
#include <vector>

#include "command_line.h"
#include "installed/installed_json.h"
#include "installed/installed_policy.h"
#include "query/answer.h"
#include "query/ask.h"
#include "query/named.h"
#include "query/question.h"
#include "refusal.h"
#include "refusals/last_refusal.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

struct Arguments {
  std::string domain;
  std::vector<std::string> words;
  bool isLastRefusal = false;
};

ExitCode Answer(const Arguments& asked, const std::string& format) {
  SecPolicy::TeskAccessInterfaceImpl access;
  const Policy::InstalledDomain domain = RequireInstalledDomain(asked.domain, access);
  const Question question = ReadQuestion(asked.words, access);
  const Policy::Decision decision = Policy::Decide(question.asked, domain);
  if (format == "json") {
    std::cout << WhyToJson(question, domain, decision).Text();
  } else {
    WriteAnswer(question, domain, decision, std::cout);
  }
  return decision.IsAllowed() ? kWell : kFailed;
}

void RequireQuestion(const Arguments& asked) {
  if (asked.isLastRefusal && asked.words.empty()) return;
  if (asked.isLastRefusal) throw QuestionError("with --last-refusal no WHAT is asked");
  if (asked.domain.empty()) throw QuestionError("DOMAIN is required");
  if (asked.words.empty()) throw QuestionError("WHAT is required");
}

Action Define(Syntax& syntax) {
  const auto asked = std::make_shared<Arguments>();
  syntax.AddOption("DOMAIN", asked->domain,
                   "The domain that is asked about, by its name or its number");
  syntax.AddList("WHAT", asked->words, "What it does, see below");
  syntax.AddFlag("--last-refusal", asked->isLastRefusal,
                 "Explain what the module has refused last, in the domain or in any");
  const auto format = AddAnswerFormat(syntax);
  return [=] {
    RequireQuestion(*asked);
    return Ask("why", [=] {
      return asked->isLastRefusal ? ExplainLastRefusal(asked->domain, *format)
                                  : Answer(*asked, *format);
    });
  };
}

}  // namespace

const Verb kWhy = {
    "why", "Say whether a domain may do something, and which rule says so",
    "Answers from the installed rules: first yes or no, then the rules that decide, each with its\n"
    "policy file and line, or the rule that is missing. WHAT is one of\n"
    "\n"
    "  read PATH, write PATH, exec PATH         a file, by -r rules and by -a rules of its label\n"
    "  list PATH, remove PATH, truncate PATH    the same\n"
    "  make PATH KIND                           a new file: regular, directory, symlink, ...\n"
    "  make-socket PATH KIND                    a new unix socket: stream, dgram, seqpacket\n"
    "  call SYSCALL                             a system call\n"
    "  use CAPABILITY                           a capability\n"
    "  access OBJECT KIND                       an object: read, write, execute, list, ...\n"
    "  enter DOMAIN                             going over into another domain\n"
    "  create OBJECT NEWOBJECT KIND             a file: regular, directory, symlink, ...\n"
    "  create-socket OBJECT KIND                a unix socket: stream, dgram, seqpacket\n"
    "  pass CHECK NUMBER                        a parameter check\n"
    "\n"
    "With --last-refusal, WHAT is what the module has refused last, as secpolicy-log has noted "
    "it;\n"
    "only root may read that.\n"
    "\n"
    "Exit status: 0 yes, 1 no, 2 a word is not known.\n"
    "\n"
    "Examples:\n"
    "  secpolicy why sshDom read /etc/ssh/host_key\n"
    "  secpolicy why appDom call mount\n"
    "  secpolicy why appDom pass bind_port 80\n"
    "  secpolicy why globalVMDom create vmDisk vmDisk symlink\n"
    "  secpolicy why --last-refusal",
    Define};

}  // namespace SecPolicyCli
