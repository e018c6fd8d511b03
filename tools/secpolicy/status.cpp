#include <algorithm>
#include <iostream>
#include <optional>
#include <string>
#include <vector>

#include "bundle/bundle_decision.h"
#include "command_line.h"
#include "ending.h"
#include "host/linux/operation/state_use.h"
#include "installed/installed_json.h"
#include "root.h"
#include "scratch/scratch_state.h"
#include "status/host_status.h"
#include "status/status_metrics.h"
#include "terminal/color.h"
#include "terminal/size.h"
#include "text/format.h"
#include "text/replace_file.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

// Of the errors of a load, as many as fit the screen.
constexpr std::size_t kShownErrors = 10;

constexpr std::size_t kTitleWidth = 13;

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

std::string DescribeBundle(const BundleStatus& status) {
  if (!status.bundle) return status.problem;
  const Manifest& manifest = status.bundle->manifest;
  std::string text = NameBundle(manifest) + ", signed by " + manifest.key;
  if (!status.edits.empty()) text += ", edited since: " + FirstOf(status.edits);
  return text + (status.isLoaded ? "" : "; not what is installed");
}

// The domains that are not enforcing are named: nothing is refused to them.
std::string DescribeDomains(const HostStatus& status) {
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

const Policy::InstalledDomain* DomainOf(const LinuxHost::PlacedWorld& world,
                                        const HostStatus& status) {
  const auto found =
      std::ranges::find(status.policy.domains, world.domainId, &Policy::InstalledDomain::id);
  return found == status.policy.domains.end() ? nullptr : &*found;
}

// Who is confined keeps the level of the entry.
std::string DescribeWorld(const LinuxHost::PlacedWorld& world, const HostStatus& status) {
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

std::string DescribeModule(const ModuleStatus& module) {
  if (!module.problem.empty()) return module.problem;
  if (!module.isRunning) return module.isWanted ? "does not run any more" : "does not run";
  return std::string(module.isRefusing ? "refuses" : "does not refuse") +
         ", told what is installed" + (module.isPublished ? "" : " before the latest change") +
         ": " + Describe(SumOf(module.domains));
}

void WriteText(const HostStatus& status) {
  WriteLine("policy", status.IsLoaded() ? "loaded" : "not loaded");
  WriteLine("latest load", status.load ? DescribeLoad(*status.load) : "none by this command");
  if (status.load) WriteErrors(*status.load);
  if (status.bundle) WriteLine("bundle", DescribeBundle(*status.bundle));
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
    WriteLine("left over", CountOf(status.rulesWithoutLine, "rule"));
  }
  for (const std::string& domain : status.domainsWithoutFile) {
    WriteLine("left over", "domain " + domain);
  }
  if (status.module) {
    WriteLine("kernel", Describe(status.module->kernel));
    WriteLine("module", DescribeModule(*status.module));
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

Json ToJson(const BundleStatus& status) {
  if (!status.bundle) return {{"problem", status.problem}};
  const auto& [manifest, digest, time] = *status.bundle;
  return {{"name", manifest.name},       {"serial", manifest.serial},
          {"key", manifest.key},         {"digest", digest},
          {"time", IsoTime(time)},       {"edited", status.edits},
          {"installed", status.isLoaded}};
}

Json WorldsToJson(const HostStatus& status) {
  Json worlds = Json::Array();
  for (const LinuxHost::PlacedWorld& world : status.worlds) {
    Json json = {{"id", world.id}};
    if (const auto* const domain = DomainOf(world, status)) json["domain"] = domain->name;
    if (world.level) json["level"] = TextOf(*world.level);
    worlds.Append(json);
  }
  return worlds;
}

void WriteJson(const HostStatus& status) {
  Json levels = Json::Object();
  for (const Policy::Level level : Policy::kLevels) levels[TextOf(level)] = Json::Array();
  for (const auto& [level, names] : status.domainsByLevel) levels[TextOf(level)] = names;
  Json rules = Json::Object();
  for (const Policy::RuleForm& form : Policy::kRuleForms) rules[form.keyword] = 0;
  for (const auto& [kind, count] : status.rulesByKind) rules[FormOf(kind).keyword] = count;
  Json load;
  if (status.load) load = ToJson(*status.load);
  Json bundle;
  if (status.bundle) bundle = ToJson(*status.bundle);
  Json screen = {
      {"schema", "secpolicy.status/1"},
      {"loaded", status.IsLoaded()},
      {"latestLoad", load},
      {"bundle", bundle},
      {"domains", status.policy.domains.size()},
      {"domainsByLevel", levels},
      {"objects", status.policy.objects.size()},
      {"rules", status.ruleCount},
      {"rulesByKeyword", rules},
      {"inNoFile", {{"domains", status.domainsWithoutFile}, {"rules", status.rulesWithoutLine}}},
      {"worlds", WorldsToJson(status)},
      {"tardisks", ToJson(status.tardisks)}};
  if (status.module) {
    Json module = Json::Object();
    for (const auto& [name, value] : MembersOf(*status.module)) module[name] = value;
    screen["module"] = module;
  }
  std::cout << screen.Text();
}

ExitCode EndWith(const HostStatus& status, bool isBooted) {
  const bool problems = status.HasProblems();
  std::string text = "the policy is loaded";
  if (!status.IsLoaded()) {
    text = "no policy is loaded. " + Call(isBooted ? "load" : "boot") + " loads one";
  }
  if (status.IsModuleBroken()) {
    text = "the kernel does not keep what is installed. " + Call("module status") + " says why";
  }
  if (status.isLabelling) {
    text = "a load still gives labels to files, or was killed meanwhile. " + Call("load") +
           " puts them back first";
  }
  if (problems) {
    text =
        "the latest load did not end well. " + Call("check") + " shows every problem of the files";
  }
  Summarize("status", text);
  const bool isWell =
      status.IsLoaded() && !status.IsModuleBroken() && !status.isLabelling && !problems;
  return isWell ? kWell : kFailed;
}

struct Options {
  std::string format;
  std::string output;
};

ExitCode Show(const Options& options) {
  const bool isBooted = !LinuxHost::IsStateMissing();
  // The host would make a state of its own.
  std::optional<ScratchState> scratch;
  if (!isBooted) scratch.emplace(true);
  const HostStatus status = ReadStatus();
  (options.format == "json" ? WriteJson : WriteText)(status);
  return EndWith(status, isBooted);
}

void WriteMetrics(const std::string& metrics, const std::string& file) {
  if (file.empty()) {
    std::cout << metrics;
  } else {
    ReplaceFile(file, metrics);
  }
}

// Metrics say themselves how it is, so it has gone well when they are written.
ExitCode Measure(const std::string& file) {
  if (LinuxHost::IsStateMissing()) {
    WriteMetrics(MetricsWithoutState(), file);
    Summarize("status", "nothing is installed below this root, and the metrics say so");
    return kWell;
  }
  std::string metrics;
  std::string summary = "done";
  try {
    metrics = MetricsOf(ReadStatus());
  } catch (const std::exception& failure) {
    metrics = MetricsWithoutStatus();
    summary = WithAdvice(failure.what());
  }
  WriteMetrics(metrics, file);
  Summarize("status", summary);
  return kWell;
}

ExitCode Answer(const Options& options) {
  if (options.format == "prometheus") return Measure(options.output);
  if (options.output.empty()) return Show(options);
  Summarize("status", "--output is for --format prometheus");
  return kUsage;
}

Action Define(Syntax& syntax) {
  const auto options = std::make_shared<Options>();
  const Option format = syntax.AddFormat(options->format, "it", {"text", "json", "prometheus"});
  syntax
      .AddOption("-o,--output", options->output,
                 "Put the metrics into FILE, which others see whole, old or new")
      .NameValue("FILE")
      .Need(format);
  return [options] { return Answer(*options); };
}

}  // namespace

const Verb kStatus = {
    "status", "Show on one screen whether the policy is loaded, and how that went",
    "Prints the latest load with its errors, the bundle that the policy came from and what was "
    "edited\n"
    "since, the domains by enforcement level, how many objects, rules of each kind and tardisks\n"
    "there are, and whether the kernel keeps it. Exit status: 0 the policy is loaded, 1 it is "
    "not,\n"
    "the latest load did not end well, or a kernel that is to keep it does not.\n"
    "With --format prometheus it writes metrics in the text format of that monitoring system; "
    "they\n"
    "say themselves whether the host was booted and how the load went, so the exit status is 0 "
    "when\n"
    "they are written.\n"
    "\n"
    "Examples:\n"
    "  secpolicy status\n"
    "  secpolicy status --format json | jq .latestLoad\n"
    "  secpolicy status --format prometheus -o /var/lib/prometheus/node-exporter/secpolicy.prom",
    Define};

}  // namespace SecPolicyCli
