#include <algorithm>
#include <iomanip>
#include <iostream>
#include <set>
#include <string>
#include <vector>

#include "command_line.h"
#include "ending.h"
#include "error_list.h"
#include "host/linux/operation/stable_view.h"
#include "host/linux/operation/state_use.h"
#include "host/linux/operation/world_entry.h"
#include "installed/installed_json.h"
#include "installed/installed_policy.h"
#include "query/ask.h"
#include "query/named.h"
#include "query/question.h"
#include "root.h"
#include "runtime/change.h"
#include "secpolicy/observed/loading.h"
#include "text/format.h"
#include "text/shell_word.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

using Policy::InstalledDomain;
using SecPolicy::TeskAccessInterfaceImpl;

// ---- Creating and destroying

std::string WhyNotCreated(const std::string& name) {
  TeskAccessInterfaceImpl access;
  unsigned int id = 0;
  if (access.FindDomain(name, &id)) {
    return "There is a domain of this name, with the number " + std::to_string(id) + ": " +
           Call("domain show " + ShellWord(name)) + " shows it";
  }
  if (Policy::ListDomains(access).size() + 1 < access.GetMaxDomains()) return "";
  return "All domains are in use: " + Call("domain leaked") +
         " lists those that nothing refers to, and " + Call("domain destroy") + " destroys one";
}

ExitCode Create(const std::string& name, bool forAccessChecks) {
  const auto rules = forAccessChecks ? TeskCtl::Security::TESKACCESS_DEFAULT_DOM_CHECK_ACCESS
                                     : TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
  return Change(
      "domain create", [&] { std::cout << SecPolicy::CreateDomain(name, rules) << std::endl; },
      [&] { return WhyNotCreated(name); });
}

Action DefineCreate(Syntax& syntax) {
  const auto name = std::make_shared<std::string>();
  const auto forAccessChecks = std::make_shared<bool>(false);
  syntax.AddOption("NAME", *name, "The name of the new domain").Check(WhyNoDomainName).Require();
  syntax.AddFlag("--check-access", *forAccessChecks,
                 "Begin with the default rules of access checks, instead of none");
  return [=] { return Ask("domain create", [=] { return Create(*name, *forAccessChecks); }); };
}

std::vector<std::string> WorldsIn(const NamedDomain& domain) {
  std::set<int> worlds;
  for (const LinuxHost::PlacedWorld& world : LinuxHost::ListWorlds(LinuxHost::CurrentState())) {
    if (world.domainId == domain.id) worlds.insert(world.id);
  }
  for (const int world : LinuxHost::ListKeptWorlds(LinuxHost::CurrentState(), domain.id)) {
    worlds.insert(world);
  }
  std::vector<std::string> words;
  words.reserve(worlds.size());
  for (const int world : worlds) words.push_back(std::to_string(world));
  return words;
}

std::string WhyNotDestroyed(const NamedDomain& domain) {
  TeskAccessInterfaceImpl access;
  if (access.IsPredefinedLabel(domain.name, TeskCtl::Security::TESKACCESS_LABEL_DOMAIN)) {
    return domain.name + " is built in, and every process begins there";
  }
  const auto installed = Policy::ReadDomain(access, domain.id);
  if (!installed) return "Somebody else has destroyed it";
  const std::vector<std::string> worlds = WorldsIn(domain);
  if (!worlds.empty()) {
    return "In " + domain.name + " runs " + ListOf(worlds, "and") + ": end " +
           (worlds.size() == 1 ? "it" : "them") + " first";
  }
  if (!installed->HasRole()) return "";
  return domain.name + " is one of the domains that every host needs";
}

ExitCode Destroy(const std::string& word) {
  TeskAccessInterfaceImpl access;
  const NamedDomain domain = FindDomain(word, access);
  return Change(
      "domain destroy", [&] { SecPolicy::DestroyDomain(domain.id); },
      [&] { return WhyNotDestroyed(domain); });
}

Action DefineDestroy(Syntax& syntax) {
  const auto domain = AddDomain(syntax);
  return [=] { return Ask("domain destroy", [=] { return Destroy(*domain); }); };
}

// ---- Services

ExitCode AddService(const std::string& word, const std::string& service) {
  TeskAccessInterfaceImpl access;
  const NamedDomain domain = FindDomain(word, access);
  return Change("domain add-service", [&] { SecPolicy::AddGcomService(domain.id, service); });
}

Action DefineAddService(Syntax& syntax) {
  const auto domain = AddDomain(syntax);
  const auto service = std::make_shared<std::string>();
  syntax.AddOption("SERVICE", *service, "The name of the service, up to 255 bytes").Require();
  return [=] { return Ask("domain add-service", [=] { return AddService(*domain, *service); }); };
}

// ---- Looking

// "created at run time, 2 worlds"; empty for a domain of a policy in which none runs.
std::string Remarks(const InstalledDomain& domain) {
  std::vector<std::string> remarks;
  if (domain.IsCreatedAtRunTime()) remarks.emplace_back("created at run time");
  if (domain.worldReferences > 0) remarks.push_back(CountOf(domain.worldReferences, "world"));
  std::string text;
  for (const std::string& remark : remarks) text += (text.empty() ? "  " : ", ") + remark;
  return text;
}

void WriteText(const std::vector<InstalledDomain>& domains) {
  std::size_t nameWidth = 0;
  std::size_t levelWidth = 0;
  for (const InstalledDomain& domain : domains) {
    nameWidth = std::max(nameWidth, Visible(domain.name).size());
    levelWidth = std::max(levelWidth, std::string(TextOf(domain.level)).size());
  }
  for (const InstalledDomain& domain : domains) {
    const std::string remarks = Remarks(domain);
    std::cout << std::right << std::setw(3) << domain.id << "  " << std::left
              << std::setw(static_cast<int>(nameWidth)) << Visible(domain.name) << "  "
              << std::setw(static_cast<int>(remarks.empty() ? 0 : levelWidth))
              << TextOf(domain.level) << remarks << '\n';
  }
}

void WriteJson(const std::vector<InstalledDomain>& domains) {
  Json list = Json::Array();
  for (const InstalledDomain& domain : domains) list.Append(FactsToJson(domain));
  std::cout << Json{{"schema", "secpolicy.domains/1"}, {"domains", list}}.Text();
}

ExitCode Write(const std::string& verb, const std::vector<InstalledDomain>& domains,
               const std::string& format) {
  (format == "json" ? WriteJson : WriteText)(domains);
  Summarize(verb, CountOf(domains.size(), "domain"));
  return kWell;
}

ExitCode List(const std::string& format) {
  TeskAccessInterfaceImpl access;
  return Write("domain list", Policy::ListDomains(access), format);
}

Action DefineList(Syntax& syntax) {
  const auto format = AddAnswerFormat(syntax);
  return [=] { return Ask("domain list", [=] { return List(*format); }); };
}

std::vector<unsigned int> RetrieveLeaked(TeskAccessInterfaceImpl& access) {
  // There cannot be more than there are slots.
  std::vector<unsigned int> ids(access.GetMaxDomains());
  unsigned int count = 0;
  SecPolicy::RetrieveLeakedDomains(ids.size(), &count, ids.data());
  ids.resize(std::min<std::size_t>(count, ids.size()));
  return ids;
}

ExitCode ListLeaked(const std::string& format) {
  const LinuxHost::StableView view(LinuxHost::CurrentState());
  TeskAccessInterfaceImpl access;
  const std::vector<unsigned int> leaked = RetrieveLeaked(access);
  std::vector<InstalledDomain> domains = Policy::ListDomains(access);
  std::erase_if(domains, [&](const InstalledDomain& domain) {
    return std::ranges::find(leaked, domain.id) == leaked.end();
  });
  return Write("domain leaked", domains, format);
}

Action DefineLeaked(Syntax& syntax) {
  const auto format = AddAnswerFormat(syntax);
  return [=] { return Ask("domain leaked", [=] { return ListLeaked(*format); }); };
}

void WriteDomainJson(const NamedDomain& domain, TeskAccessInterfaceImpl& access) {
  const InstalledDomain installed = RequireInstalledDomain(domain.name, access);
  Json json = {{"schema", "secpolicy.domain/1"}};
  json.Add(ToJson(installed));
  std::cout << json.Text();
}

ExitCode Show(const std::string& word, const std::string& format) {
  const LinuxHost::StableView view(LinuxHost::CurrentState());
  TeskAccessInterfaceImpl access;
  const NamedDomain domain = FindDomain(word, access);
  return CallLibrary(
      "domain show",
      [&](ErrorList& errors) {
        if (format == "json") return WriteDomainJson(domain, access);
        SecPolicy::DisplayDomainPolicy(access, domain.id, errors);
      },
      AdviseOnPrivilege);
}

Action DefineShow(Syntax& syntax) {
  const auto domain = AddDomain(syntax);
  const auto format = AddAnswerFormat(syntax);
  return [=] { return Ask("domain show", [=] { return Show(*domain, *format); }); };
}

// ---- Processes

// The domain of the nearest process above `process` that has one of its own.
std::string DomainFromAbove(int process, const std::string& ownDomain) {
  const auto above = LinuxHost::FindWorldAbove(LinuxHost::CurrentState(), process);
  return above ? SecPolicy::GetDomainNameForID(above->domainId) : ownDomain;
}

void WriteDomainOf(int process) {
  const unsigned int id = SecPolicy::GetDomainIDForWorld(process);
  const std::string name = SecPolicy::GetDomainNameForID(id);
  TeskAccessInterfaceImpl access;
  // Every process that nobody placed elsewhere is told to be in the domain that is built in.
  const bool isPlaced = !access.IsPredefinedLabel(name, TeskCtl::Security::TESKACCESS_LABEL_DOMAIN);
  std::cout << Visible(isPlaced ? name : DomainFromAbove(process, name)) << '\n';
}

ExitCode ShowDomainOf(const std::string& word) {
  const int process = ReadProcess(word);
  return CallLibrary(
      "domain of", [&](ErrorList&) { WriteDomainOf(process); }, AdviseOnPrivilege);
}

Action DefineOf(Syntax& syntax) {
  const auto process = std::make_shared<std::string>();
  syntax.AddOption("PID", *process, "The number of the process").Require();
  return [=] { return Ask("domain of", [=] { return ShowDomainOf(*process); }); };
}

const Kind kCreate = {"create", "Create a domain, which no file defines and no load removes",
                      "Prints the number of the new domain, which may do nothing yet and is "
                      "enforcing. It lasts until\n"
                      "it is destroyed, or until the next boot: what is to come back after that "
                      "belongs into a policy\n"
                      "file ('secpolicy new domain').\n"
                      "\n"
                      "Examples:\n"
                      "  secpolicy domain create job7\n"
                      "  id=$(secpolicy domain create job8)",
                      DefineCreate};

const Kind kDestroy = {"destroy", "Destroy a domain with all its rules",
                       "Its rules go, its file policies and services, and the rules of other "
                       "domains that name it. It\n"
                       "is refused while a process runs in the domain. A domain that a policy file "
                       "defines comes back\n"
                       "with the next load, with a new number perhaps.\n"
                       "\n"
                       "Example:\n"
                       "  secpolicy domain destroy job7",
                       DefineDestroy};

const Kind kList = {"list", "List the installed domains",
                    "Prints number, name and enforcement level of each, whether it was created at "
                    "run time, and how\n"
                    "many worlds, which are processes, were placed in it.\n"
                    "\n"
                    "Examples:\n"
                    "  secpolicy domain list\n"
                    "  secpolicy domain list --format json | jq -r '.domains[].name'",
                    DefineList};

const Kind kShow = {"show", "Show a domain with its rules",
                    "Prints what 'display' prints of the domain: its rules, written like the "
                    "policy lines that make\n"
                    "them.\n"
                    "\n"
                    "Examples:\n"
                    "  secpolicy domain show sshDom\n"
                    "  secpolicy domain show 5 --format json | jq -r '.rules[].text'",
                    DefineShow};

const Kind kLeaked = {
    "leaked", "List the domains that were created at run time and that nothing refers to",
    "No process runs in such a domain, none can enter it by a transition, and it has no role:\n"
    "whoever created it has forgotten it, or has not used it yet.\n"
    "\n"
    "Example:\n"
    "  secpolicy domain leaked",
    DefineLeaked};

const Kind kAddService = {
    "add-service", "Attach a guest-communication service to a domain",
    "The service stays with the domain until that is destroyed; attaching it twice is no mistake.\n"
    "There is no way to see or to detach the services of a domain.\n"
    "\n"
    "Example:\n"
    "  secpolicy domain add-service job7 /vm/7/clipboard",
    DefineAddService};

const Kind kOf = {"of", "Print the domain that a process runs in",
                  "A process that nobody placed in a domain is in that of its parent, or in "
                  "hostDom. Below a root\n"
                  "without /proc the parents are not known.\n"
                  "\n"
                  "Example:\n"
                  "  secpolicy domain of $$",
                  DefineOf};

Action Define(Syntax& syntax) {
  return syntax.AddKinds(
      std::vector<Kind>{kCreate, kDestroy, kList, kShow, kLeaked, kAddService, kOf});
}

}  // namespace

const Verb kDomain = {
    "domain", "Create, destroy and look at domains while the system runs",
    "What services do by the library's runtime interface. A DOMAIN is its name or its number. "
    "What\n"
    "is changed counts at once, for all processes, and until the next boot.\n"
    "\n"
    "Examples:\n"
    "  secpolicy domain list                  which are there?\n"
    "  secpolicy domain create job7           a new one, which may do nothing yet\n"
    "  secpolicy domain show job7             what may it do?\n"
    "  secpolicy domain of $$                 where does this shell run?\n"
    "  secpolicy domain destroy job7",
    Define};

}  // namespace SecPolicyCli
