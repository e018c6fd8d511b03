#include <iostream>
#include <list>

#include "command_line.h"
#include "ending.h"
#include "error_list.h"
#include "host/linux/operation/stable_view.h"
#include "host/linux/operation/state_use.h"
#include "installed/installed_json.h"
#include "installed/installed_policy.h"
#include "kitlibs/file.h"
#include "query/ask.h"
#include "query/named.h"
#include "query/question.h"
#include "root.h"
#include "secpolicy/observed/loading.h"
#include "secpolicy/policy_root.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

std::string Advise() {
  if (File_IsDirectory(SecPolicy::kTardiskImagesDir)) return AdviseOnPrivilege();
  return std::string("There is no directory ") + SecPolicy::kTardiskImagesDir +
         " below this root: name the root that was booted (--root DIR), or run " + Call("boot") +
         " first.";
}

// Throws the library's own failure where there is no directory of tardisks: nothing was booted.
void RequireTardisks(SecPolicy::PolicyObserver& observer) {
  std::list<std::string> tardisks;
  if (!File_IsDirectory(SecPolicy::kTardiskImagesDir))
    SecPolicy::GetAllTardisks(tardisks, observer);
}

void WriteJson(const std::string& domainId, SecPolicy::PolicyObserver& observer) {
  RequireTardisks(observer);
  SecPolicy::TeskAccessInterfaceImpl access;
  Policy::InstalledPolicy policy = ReadInstalledPolicy(access);
  if (!domainId.empty()) {
    std::erase_if(policy.domains, [&](const Policy::InstalledDomain& domain) {
      return domain.id != std::stoul(domainId);
    });
  }
  Json json = {{"schema", "secpolicy.display/1"}};
  json.Add(ToJson(policy));
  json["tardisks"] = ToJson(ReadTardisks(access));
  std::cout << json.Text();
}

ExitCode Display(const std::string& domainId, const std::string& format) {
  if (LinuxHost::IsStateMissing()) return RefuseWithoutState("display");
  return CallLibrary(
      "display",
      [&](ErrorList& errors) {
        // A load may end meanwhile.
        const LinuxHost::StableView view(LinuxHost::CurrentState());
        if (format == "json") return WriteJson(domainId, errors);
        SecPolicy::DisplayPolicy(domainId, errors);
      },
      Advise);
}

ExitCode DisplayDomain(const std::string& word, const std::string& format) {
  SecPolicy::TeskAccessInterfaceImpl access;
  return Display(std::to_string(FindDomain(word, access).id), format);
}

Action Define(Syntax& syntax) {
  const auto domain = std::make_shared<std::string>();
  const auto format = std::make_shared<std::string>();
  const Option given = syntax.AddOption(
      "DOMAIN", *domain, "One domain, by its name or its number; all domains without it");
  syntax.AddFormat(*format, "it", {"text", "json"});
  return [=] {
    if (!given.IsGiven()) return Display("", *format);
    return Ask("display", [=] { return DisplayDomain(*domain, *format); });
  };
}

}  // namespace

const Verb kDisplay = {
    "display",
    "Show the installed domains, objects and tardisk labels",
    "Prints what is installed now to standard output: every domain with its rules, written like\n"
    "the policy lines that made them, the objects with their identifiers, and each tardisk with\n"
    "its label.\n"
    "\n"
    "Examples:\n"
    "  secpolicy display                    everything\n"
    "  secpolicy display sshDom             only one domain, or by its number: display 8\n"
    "  secpolicy display | grep '^-c'       all capability rules\n"
    "  secpolicy display --format json | jq '.objects | length'",
    Define,
    nullptr,
    true};

}  // namespace SecPolicyCli
