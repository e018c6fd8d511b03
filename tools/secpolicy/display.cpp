#include <charconv>
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
#include "root.h"
#include "secpolicy/observed/loading.h"
#include "secpolicy/policy_root.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

// The library shows domain 0 for every text that is not a number, which is no answer to a misspelt
// question.
std::string CheckDomainId(const std::string& text) {
  unsigned int id = 0;
  const char* const end = text.data() + text.size();
  const auto read = std::from_chars(text.data(), end, id);
  if (read.ec == std::errc() && read.ptr == end) return "";
  return "'" + text + "' is not the number of a domain; 'secpolicy display' shows the numbers";
}

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

Action Define(Syntax& syntax) {
  const auto domain = std::make_shared<std::string>();
  const auto format = std::make_shared<std::string>();
  syntax.AddOption("DOMAIN_ID", *domain, "The number of one domain; all domains without it")
      .Check(CheckDomainId);
  syntax.AddFormat(*format, "it", {"text", "json"});
  return [domain, format] {
    void (*show)(const std::string&, SecPolicy::PolicyObserver&) = SecPolicy::DisplayPolicy;
    if (*format == "json") show = WriteJson;
    return CallLibrary(
        "display",
        [&](ErrorList& errors) {
          // A load may end meanwhile.
          const LinuxHost::StableView view(LinuxHost::CurrentState());
          show(*domain, errors);
        },
        Advise);
  };
}

}  // namespace

const Verb kDisplay = {
    "display", "Show the installed domains, objects and tardisk labels",
    "Prints what is installed now to standard output: every domain with its rules, written like\n"
    "the policy lines that made them, the objects with their identifiers, and each tardisk with\n"
    "its label.\n"
    "\n"
    "Examples:\n"
    "  secpolicy display                    everything\n"
    "  secpolicy display 3                  only the domain with the identifier 3\n"
    "  secpolicy display | grep '^-c'       all capability rules\n"
    "  secpolicy display --format json | jq '.objects | length'",
    Define};

}  // namespace SecPolicyCli
