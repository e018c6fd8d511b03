#include "path_proposal.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <optional>
#include <set>
#include <string_view>
#include <utility>
#include <variant>

#include "asked_rules.h"
#include "host/linux/operation/state_use.h"
#include "secpolicy/policy_root.h"
#include "text/format.h"

namespace SecPolicyCli {
namespace {

using Observed = Observations::Observed;
using Policy::CreationQuestion;
using Policy::FileAccess;
using Policy::FileQuestion;
using Policy::InstalledDomain;
using Policy::Permission;
using Policy::Permissions;
using Policy::Rule;
using Policy::RuleKind;

// So many files of a directory stand for all of them.
constexpr std::size_t kManyFiles = 3;

// A rule that lies in the way gives way to a wider one, which may be in the way of the next.
constexpr int kMostRounds = 8;

struct Need {
  Permissions permissions;
  std::string program;             // that needed it first
  std::vector<std::string> files;  // that it stands for, where it is their directory
};

using Needs = std::map<std::string, Need>;

Permissions Both(Permissions one, Permissions other) {
  return Permissions(one.Bits() | other.Bits());
}

bool IsWithin(const std::string& directory, const std::string& path) {
  return directory == "/" || path.starts_with(directory + "/");
}

// Files that have another name each time: those of processes and of terminals.
std::optional<std::string> PassingPlace(const std::string& path) {
  for (const std::string directory : {"/proc", "/dev/pts"}) {
    const std::size_t number = directory.size() + 1;
    const bool isNumbered = IsWithin(directory, path) && path.size() > number &&
                            std::isdigit(static_cast<unsigned char>(path[number])) != 0;
    if (isNumbered) return directory;
  }
  return std::nullopt;
}

// A word of a policy line ends at a space, and "#" begins a remark.
bool CanStandInLine(const std::string& path) {
  return std::ranges::all_of(path, [](unsigned char character) {
    return character > ' ' && character != '#' && character != '*' && character != '"' &&
           character != 0x7f;
  });
}

// What was made while it was observed, and so is not there when a domain is entered.
std::set<std::string> MadePaths(const Observations& observations) {
  std::set<std::string> made;
  for (const Observed& each : observations.All()) {
    const auto* const creation = std::get_if<CreationQuestion>(&each.question);
    if (creation != nullptr) made.insert(creation->path);
  }
  return made;
}

// The place whose rule is to speak of the path.
std::string PlaceFor(std::string path, const std::set<std::string>& made) {
  if (const auto place = PassingPlace(path)) return *place;
  while (path.size() > 1 && (made.contains(path) || !CanStandInLine(path))) {
    path = DirectoryOf(path);
  }
  return path;
}

struct Wanted {
  std::string place;
  Permission permission;
};

Permission PermissionFor(FileAccess access) {
  if (access == FileAccess::kRead || access == FileAccess::kList) return Permission::kRead;
  return access == FileAccess::kExecute ? Permission::kExecute : Permission::kWrite;
}

std::optional<Wanted> WantedBy(const Policy::Question& question,
                               const std::set<std::string>& made) {
  if (const auto* const file = std::get_if<FileQuestion>(&question)) {
    const bool isEntry = file->access == FileAccess::kRemove;
    return Wanted{.place = PlaceFor(isEntry ? DirectoryOf(file->path) : file->path, made),
                  .permission = PermissionFor(file->access)};
  }
  if (const auto* const creation = std::get_if<CreationQuestion>(&question)) {
    return Wanted{.place = PlaceFor(DirectoryOf(creation->path), made),
                  .permission = Permission::kWrite};
  }
  return std::nullopt;
}

bool IsDevice(const CreationQuestion& creation) {
  return creation.what == "char_device" || creation.what == "block_device";
}

// Labels have rules of their own, and no path permits to make a device.
bool IsForPath(const Policy::Question& question) {
  if (const auto* const file = std::get_if<FileQuestion>(&question)) {
    return !IsMeaningful(file->label, file->labelIsBuiltIn);
  }
  const auto* const creation = std::get_if<CreationQuestion>(&question);
  return creation != nullptr && !IsDevice(*creation) &&
         !IsMeaningful(creation->directoryLabel, creation->labelIsBuiltIn);
}

// A rule for the root would be one for everything, so it is never proposed.
void Add(Needs& needs, const Wanted& wanted, const std::string& program) {
  if (wanted.place == "/") return;
  Need& need = needs[wanted.place];
  need.permissions = need.permissions.With(wanted.permission);
  if (need.program.empty()) need.program = program;
}

// What lies right below the root has nothing to do with what lies beside it: /etc holds the secrets
// of all services.
bool IsForMany(const std::string& directory) { return directory.rfind('/') == 0; }

// Many files of one directory that need the same become their directory.
Needs Generalised(const Needs& needs) {
  std::map<std::pair<std::string, unsigned int>, std::vector<std::string>> alike;
  for (const auto& [path, need] : needs) {
    alike[{DirectoryOf(path), need.permissions.Bits()}].push_back(path);
  }
  Needs result = needs;
  for (const auto& [key, files] : alike) {
    const auto& [directory, bits] = key;
    if (IsForMany(directory) || files.size() < kManyFiles) continue;
    const std::string& program = needs.at(files.front()).program;
    for (const std::string& file : files) result.erase(file);
    Need& need = result[directory];
    need.permissions = Both(need.permissions, Permissions(bits));
    need.program = program;
    need.files.insert(need.files.end(), files.begin(), files.end());
  }
  return result;
}

// What the rules of the domain permit at the path; the longest one decides alone, so a new rule has
// to repeat it.
Permissions PermittedBy(const InstalledDomain& domain, const std::string& path) {
  constexpr std::array kAccesses = {FileAccess::kRead, FileAccess::kWrite, FileAccess::kExecute};
  Permissions permitted;
  for (const FileAccess access : kAccesses) {
    const FileQuestion asked = {
        .access = access, .path = path, .label = {}, .labelIsBuiltIn = false};
    if (Decide(asked, domain).granted) permitted = permitted.With(PermissionFor(access));
  }
  return permitted;
}

// Gives the domain the rule, in place of one about the same.
void Put(InstalledDomain& domain, const Rule& rule) {
  std::erase_if(domain.rules, [&](const Rule& each) {
    return each.kind == rule.kind && each.words == rule.words;
  });
  domain.rules.push_back(rule);
}

// True for a rule by which the domain may change what it is held to: the policy, or the state that
// is made of it.
bool ReachesThePolicy(const Rule& rule) {
  if (!rule.Permits().Has(Permission::kWrite)) return false;
  const std::string& path = rule.words[0];
  const std::string places[] = {SecPolicy::kPolicyRoot, DirectoryOf(LinuxHost::StatePath()),
                                DirectoryOf(LinuxHost::SettingsPath())};
  return std::ranges::any_of(places, [&](const std::string& place) {
    return place == path || IsWithin(path, place) || IsWithin(place, path);
  });
}

std::string ReasonOf(const Need& need, const Rule& rule) {
  std::string reason = need.files.empty()
                           ? "first by " + need.program
                           : CountOf(need.files.size(), "file") + ", first " + need.files.front();
  if (ReachesThePolicy(rule)) reason += "; the policy can be changed with it";
  return reason;
}

// A narrower rule repeats what the wider one permits: one that took something away would be kept to
// by naming all beside it, and what is made later has no name yet. It goes where it says no more.
std::vector<ProposedRule> RulesFor(const Needs& needs, const InstalledDomain& domain) {
  std::vector<ProposedRule> rules;
  InstalledDomain candidate = domain;
  for (const auto& [path, need] : needs) {
    const Permissions permitted = PermittedBy(candidate, path);
    const Permissions wanted = Both(need.permissions, permitted);
    if (wanted == permitted) continue;
    const Rule rule = {.kind = RuleKind::kFilePath, .words = {path}, .verdict = wanted};
    rules.push_back({.rule = rule, .reason = ReasonOf(need, rule)});
    Put(candidate, rule);
  }
  return rules;
}

InstalledDomain With(InstalledDomain domain, const std::vector<ProposedRule>& rules) {
  for (const ProposedRule& each : rules) Put(domain, each.rule);
  return domain;
}

// Adds what a path rule of the candidate refuses although others grant it; false when that is
// nothing.
bool AddRefused(Needs& needs, const Observations& observations, const InstalledDomain& candidate,
                const std::set<std::string>& made) {
  bool isRefused = false;
  for (const Observed& each : observations.All()) {
    const auto wanted = WantedBy(each.question, made);
    if (!wanted) continue;
    const Policy::Decision decision = Decide(each.question, candidate);
    const bool isInTheWay = std::ranges::any_of(decision.votes, [](const Policy::Vote& vote) {
      return !vote.Grants() && vote.rule.kind == RuleKind::kFilePath;
    });
    if (decision.granted || !isInTheWay) continue;
    Add(needs, *wanted, each.program);
    isRefused = true;
  }
  return isRefused;
}

}  // namespace

bool IsMeaningful(const std::string& label, bool isBuiltIn) { return !label.empty() && !isBuiltIn; }

std::vector<ProposedRule> ProposePaths(const Observations& observations,
                                       const InstalledDomain& domain,
                                       const std::vector<ProposedRule>& others) {
  const std::set<std::string> made = MadePaths(observations);
  Needs needs;
  for (const Observed& each : observations.All()) {
    if (!IsForPath(each.question) || Decide(each.question, domain).granted) continue;
    Add(needs, *WantedBy(each.question, made), each.program);
  }
  const InstalledDomain base = With(domain, others);
  std::vector<ProposedRule> rules = RulesFor(Generalised(needs), domain);
  for (int round = 0; round < kMostRounds; ++round) {
    if (!AddRefused(needs, observations, With(base, rules), made)) break;
    rules = RulesFor(Generalised(needs), domain);
  }
  return rules;
}

}  // namespace SecPolicyCli
