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
#include "verb.h"

namespace SecPolicyCli {
namespace {

ExitCode Answer(const std::string& name, const std::vector<std::string>& words,
                const std::string& format) {
  SecPolicy::TeskAccessInterfaceImpl access;
  const Policy::InstalledDomain domain = RequireInstalledDomain(name, access);
  const Question question = ReadQuestion(words, access);
  const Policy::Decision decision = Policy::Decide(question.asked, domain);
  if (format == "json") {
    std::cout << WhyToJson(question, domain, decision).Text();
  } else {
    WriteAnswer(question, domain, decision, std::cout);
  }
  return decision.IsAllowed() ? kWell : kFailed;
}

Action Define(Syntax& syntax) {
  const auto domain = std::make_shared<std::string>();
  const auto words = std::make_shared<std::vector<std::string>>();
  syntax.AddOption("DOMAIN", *domain, "The domain that is asked about, by its name or its number")
      .Require();
  syntax.AddList("WHAT", *words, "What it does, see below").Require();
  const auto format = AddAnswerFormat(syntax);
  return [=] { return Ask("why", [=] { return Answer(*domain, *words, *format); }); };
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
    "Exit status: 0 yes, 1 no, 2 a word is not known.\n"
    "\n"
    "Examples:\n"
    "  secpolicy why sshDom read /etc/ssh/host_key\n"
    "  secpolicy why appDom call mount\n"
    "  secpolicy why appDom pass bind_port 80\n"
    "  secpolicy why globalVMDom create vmDisk vmDisk symlink",
    Define};

}  // namespace SecPolicyCli
