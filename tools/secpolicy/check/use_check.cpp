#include "check_run.h"
#include "root.h"
#include "secpolicy/policy_root.h"

namespace SecPolicyCli {
namespace {

constexpr char kStartDomain[] = "hostDom";

void CheckNeededDomain(CheckRun& run, const std::string& dir, const std::string& name) {
  if (run.domains.contains(name)) return;
  unsigned int id = 0;
  const bool isInstalled = run.access.FindDomain(name, &id);
  Diagnostic diagnostic;
  diagnostic.code = isInstalled ? &Codes::kInstalledOnly : &Codes::kMissingDomain;
  diagnostic.file = dir;
  diagnostic.message = isInstalled ? "no file defines the domain '" + name +
                                         "', which every host needs; it is installed since an "
                                         "earlier load, and the next boot will lack it"
                                   : "there is no domain '" + name +
                                         "', which every host needs: a load stops without it, "
                                         "before tardisks and file labels";
  diagnostic.hint = "an empty file " + OutsidePath(dir + "/" + name) + " defines it";
  run.diagnostics.Add(std::move(diagnostic));
}

void Reach(const CheckRun& run, const std::string& domain, std::set<std::string>& reached) {
  std::vector<std::string> waiting = {domain};
  while (!waiting.empty()) {
    const std::string from = std::move(waiting.back());
    waiting.pop_back();
    if (!reached.insert(from).second) continue;
    const auto targets = run.transitions.find(from);
    if (targets == run.transitions.end()) continue;
    waiting.insert(waiting.end(), targets->second.begin(), targets->second.end());
  }
}

void CheckReach(CheckRun& run) {
  std::set<std::string> reached;
  Reach(run, kStartDomain, reached);
  for (const char* domain : SecPolicy::kNeededDomains) Reach(run, domain, reached);
  for (const std::string& domain : run.enteredDomains) Reach(run, domain, reached);
  for (const auto& [name, file] : run.domains) {
    if (reached.contains(name)) continue;
    run.diagnostics.Add(file->About(
        Codes::kUnreachableDomain,
        "nothing enters the domain '" + name + "': no -d rule of a domain in use leads to it"));
  }
}

void CheckObjectUse(CheckRun& run) {
  for (const auto& [name, place] : run.objects) {
    if (run.usedLabels.contains(name)) continue;
    run.diagnostics.Add(place.file->AtWord(Codes::kUnusedObject, place.line, 0,
                                           "no rule and no file label uses '" + name + "'"));
  }
}

}  // namespace

void CheckUse(CheckRun& run, const std::string& dir) {
  for (const char* name : SecPolicy::kNeededDomains) CheckNeededDomain(run, dir, name);
  CheckReach(run);
  CheckObjectUse(run);
}

}  // namespace SecPolicyCli
