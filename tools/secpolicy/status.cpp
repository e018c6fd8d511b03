#include <algorithm>
#include <iostream>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "command_line.h"
#include "ending.h"
#include "host/linux/operation/load_record.h"
#include "host/linux/operation/state_use.h"
#include "host/linux/operation/world_entry.h"
#include "installed/installed_json.h"
#include "installed/installed_policy.h"
#include "root.h"
#include "scratch/scratch_state.h"
#include "terminal/color.h"
#include "terminal/size.h"
#include "text/format.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

// Of the errors of a load, as many as fit the screen.
constexpr std::size_t kShownErrors = 10;

constexpr std::size_t kTitleWidth = 13;

struct Status {
  Policy::InstalledPolicy policy;
  std::vector<InstalledTardisk> tardisks;
  std::optional<LinuxHost::LoadRecord> load;
  std::map<Policy::Level, std::vector<std::string>> domainsByLevel;
  std::map<Policy::RuleKind, std::size_t> rulesByKind;
  std::size_t ruleCount = 0;
  std::vector<std::string>
      domainsWithoutFile;  // what loads have installed and no file has any more
  std::size_t rulesWithoutLine = 0;
  std::vector<LinuxHost::PlacedWorld> worlds;

  // Beside the one that is built in, there are domains only when something was loaded.
  bool IsLoaded() const { return policy.domains.size() > 1; }
  bool HasProblems() const { return load && load->ending != "done"; }
};

Status ReadStatus() {
  SecPolicy::TeskAccessInterfaceImpl access;
  Status status;
  status.policy = ReadInstalledPolicy(access);
  status.tardisks = ReadTardisks(access);
  status.load = LinuxHost::LatestLoad(LinuxHost::CurrentState());
  status.worlds = LinuxHost::ListWorlds(LinuxHost::CurrentState());
  for (const Policy::InstalledDomain& domain : status.policy.domains) {
    status.domainsByLevel[domain.level].push_back(domain.name);
    status.ruleCount += domain.rules.size();
    if (domain.isGone) status.domainsWithoutFile.push_back(domain.name);
    for (const Policy::Rule& rule : domain.rules) {
      if (rule.origin.isGone) ++status.rulesWithoutLine;
      ++status.rulesByKind[rule.kind];
    }
  }
  return status;
}

Color ColorOf(Policy::Level level) {
  switch (level) {
    case Policy::Level::kEnforcing:
      return Color::kGood;
    case Policy::Level::kPermissive:
      return Color::kDoubtful;
    case Policy::Level::kDisabled:
      break;
  }
  return Color::kBad;
}

void WriteWord(const std::string& word) {
  for (const Policy::Level level : Policy::kLevels) {
    if (word != TextOf(level)) continue;
    std::cout << Painted{ColorOf(level), word};
    return;
  }
  std::cout << word;
}

// A line of the screen: what it is about, and what there is to say.
void WriteLine(const std::string& title, const std::string& text) {
  std::string padded = title;
  padded.resize(std::max(title.size(), kTitleWidth), ' ');
  const std::string line = FitTerminal(padded + Visible(text)) + "\n";
  for (std::size_t begin = 0; begin < line.size();) {
    const std::size_t end = std::min(line.find_first_of(" ,\n", begin), line.size());
    WriteWord(line.substr(begin, end - begin));
    if (end < line.size()) std::cout << line[end];
    begin = end + 1;
  }
}

std::string DescribeLoad(const LinuxHost::LoadRecord& load) {
  return load.verb + " from " + load.directory + " at " + UtcTime(load.time) + ": " + load.ending +
         (load.errorCount > 0 ? ", " + CountOf(load.errorCount, "error") : "");
}

// The domains that are not enforcing are named: nothing is refused to them.
std::string DescribeDomains(const Status& status) {
  std::string text = std::to_string(status.policy.domains.size());
  const char* separator = ": ";
  for (const Policy::Level level : Policy::kLevels) {
    const auto found = status.domainsByLevel.find(level);
    if (found == status.domainsByLevel.end()) continue;
    const std::vector<std::string>& names = found->second;
    text += separator + std::to_string(names.size()) + " " + TextOf(level);
    separator = ", ";
    if (level == Policy::Level::kEnforcing) continue;
    for (std::size_t index = 0; index < names.size(); ++index) {
      text += (index == 0 ? " (" : " ") + names[index];
    }
    text += ")";
  }
  return text;
}

const Policy::InstalledDomain* DomainOf(const LinuxHost::PlacedWorld& world, const Status& status) {
  const auto found =
      std::ranges::find(status.policy.domains, world.domainId, &Policy::InstalledDomain::id);
  return found == status.policy.domains.end() ? nullptr : &*found;
}

// Who is confined keeps the level of the entry.
std::string DescribeWorld(const LinuxHost::PlacedWorld& world, const Status& status) {
  const Policy::InstalledDomain* const domain = DomainOf(world, status);
  std::string text = std::to_string(world.id) + " ";
  if (domain == nullptr) return text + "(no domain)";
  text += domain->name;
  if (!world.level) return text;
  text += std::string(" ") + TextOf(*world.level);
  if (*world.level != domain->level) text += std::string(", now ") + TextOf(domain->level);
  return text;
}

void WriteErrors(const LinuxHost::LoadRecord& load) {
  const std::size_t shown = std::min(load.errors.size(), kShownErrors);
  for (std::size_t index = 0; index < shown; ++index) WriteLine("", load.errors[index]);
  if (load.errorCount > shown) {
    WriteLine("", "and " + std::to_string(load.errorCount - shown) + " more");
  }
}

void WriteText(const Status& status) {
  WriteLine("policy", status.IsLoaded() ? "loaded" : "not loaded");
  WriteLine("latest load", status.load ? DescribeLoad(*status.load) : "none by this command");
  if (status.load) WriteErrors(*status.load);
  WriteLine("domains", DescribeDomains(status));
  WriteLine("objects", std::to_string(status.policy.objects.size()));
  WriteLine("rules", std::to_string(status.ruleCount));
  const std::size_t width = std::to_string(status.ruleCount).size();
  for (const Policy::RuleForm& form : Policy::kRuleForms) {
    const auto found = status.rulesByKind.find(form.kind);
    const std::size_t count = found == status.rulesByKind.end() ? 0 : found->second;
    const std::string number = std::to_string(count);
    WriteLine(std::string("  ") + form.keyword,
              std::string(width - number.size(), ' ') + number + " " + form.name);
  }
  if (status.rulesWithoutLine > 0) {
    WriteLine("in no file", CountOf(status.rulesWithoutLine, "rule"));
  }
  for (const std::string& domain : status.domainsWithoutFile) {
    WriteLine("in no file", "domain " + domain);
  }
  WriteLine("worlds", std::to_string(status.worlds.size()));
  for (const auto& world : status.worlds) WriteLine("", DescribeWorld(world, status));
  WriteLine("tardisks", std::to_string(status.tardisks.size()));
  for (const InstalledTardisk& tardisk : status.tardisks) {
    WriteLine("", tardisk.path + " " + (tardisk.label.empty() ? "(no label)" : tardisk.label));
  }
}

Json ToJson(const LinuxHost::LoadRecord& load) {
  return {{"verb", load.verb},
          {"directory", load.directory},
          {"time", IsoTime(load.time)},
          {"ending", load.ending},
          {"errorCount", load.errorCount},
          {"errors", load.errors},
          {"removed", {{"domains", load.removedDomains}, {"rules", load.removedRules}}}};
}

Json WorldsToJson(const Status& status) {
  Json worlds = Json::Array();
  for (const LinuxHost::PlacedWorld& world : status.worlds) {
    Json json = {{"id", world.id}};
    if (const auto* const domain = DomainOf(world, status)) json["domain"] = domain->name;
    if (world.level) json["level"] = TextOf(*world.level);
    worlds.Append(json);
  }
  return worlds;
}

void WriteJson(const Status& status) {
  Json levels = Json::Object();
  for (const Policy::Level level : Policy::kLevels) levels[TextOf(level)] = Json::Array();
  for (const auto& [level, names] : status.domainsByLevel) levels[TextOf(level)] = names;
  Json rules = Json::Object();
  for (const Policy::RuleForm& form : Policy::kRuleForms) rules[form.keyword] = 0;
  for (const auto& [kind, count] : status.rulesByKind) rules[FormOf(kind).keyword] = count;
  Json load;
  if (status.load) load = ToJson(*status.load);
  const Json screen = {
      {"schema", "secpolicy.status/1"},
      {"loaded", status.IsLoaded()},
      {"latestLoad", load},
      {"domains", status.policy.domains.size()},
      {"domainsByLevel", levels},
      {"objects", status.policy.objects.size()},
      {"rules", status.ruleCount},
      {"rulesByKeyword", rules},
      {"inNoFile", {{"domains", status.domainsWithoutFile}, {"rules", status.rulesWithoutLine}}},
      {"worlds", WorldsToJson(status)},
      {"tardisks", ToJson(status.tardisks)}};
  std::cout << screen.Text();
}

ExitCode EndWith(const Status& status, bool isBooted) {
  const bool problems = status.HasProblems();
  std::string text = "the policy is loaded";
  if (!status.IsLoaded()) {
    text = "no policy is loaded. " + Call(isBooted ? "load" : "boot") + " loads one";
  }
  if (problems) {
    text =
        "the latest load did not end well. " + Call("check") + " shows every problem of the files";
  }
  Summarize("status", text);
  return problems || !status.IsLoaded() ? kFailed : kWell;
}

Action Define(Syntax& syntax) {
  const auto format = std::make_shared<std::string>();
  syntax.AddFormat(*format, "it", {"text", "json"});
  return [format] {
    const bool isBooted = !LinuxHost::IsStateMissing();
    // The host would make a state of its own.
    std::optional<ScratchState> scratch;
    if (!isBooted) scratch.emplace(true);
    const Status status = ReadStatus();
    (*format == "json" ? WriteJson : WriteText)(status);
    return EndWith(status, isBooted);
  };
}

}  // namespace

const Verb kStatus = {
    "status", "Show on one screen whether the policy is loaded, and how that went",
    "Prints the latest load with its errors, the domains by enforcement level, and how many\n"
    "objects, rules of each kind and tardisks there are. Exit status: 0 the policy is loaded,\n"
    "1 it is not, or the latest load did not end well.\n"
    "\n"
    "Examples:\n"
    "  secpolicy status\n"
    "  secpolicy status --format json | jq .latestLoad",
    Define};

}  // namespace SecPolicyCli
