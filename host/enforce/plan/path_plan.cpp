#include "host/enforce/plan/path_plan.h"

#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <map>
#include <memory>
#include <span>
#include <utility>

#include "host/enforce/plan/value_set.h"

namespace Enforce {
namespace {

using Policy::InstalledDomain;
using Policy::Permission;
using Policy::Permissions;
using Policy::Rule;
using Policy::RuleKind;
using Rights = std::uint64_t;

// These change which entries a directory has, so they also concern what is there already.
constexpr Rights kEntryRights = Landlock::kRemoveFile | Landlock::kRemoveDir | Landlock::kRefer;

// ---- What the rules say

enum class Verdict { kNone, kGrants, kRefuses };

Verdict Join(Verdict one, Verdict other) {
  if (one == Verdict::kRefuses || other == Verdict::kRefuses) return Verdict::kRefuses;
  return one == Verdict::kNone ? other : one;
}

struct AccessRow {
  const char* word;  // of rules about labels
  Permission permission;
  Rights rights;
};

constexpr std::array<AccessRow, 6> kAccesses = {{
    {"read", Permission::kRead, Landlock::kReadFile},
    {"write", Permission::kWrite, Landlock::kWriteFile | Landlock::kIoctlDev},
    {"execute", Permission::kExecute, Landlock::kExecute},
    {"list", Permission::kRead, Landlock::kReadDir},
    {"remove", Permission::kWrite, kEntryRights},
    {"truncate", Permission::kWrite, Landlock::kTruncate},
}};

struct CreationRow {
  RuleKind kind;
  const char* word;
  Rights rights;
  bool byPath;  // writing to a directory makes them
};

constexpr std::array<CreationRow, 9> kCreations = {{
    {RuleKind::kFileCreation, "regular", Landlock::kMakeReg, true},
    {RuleKind::kFileCreation, "directory", Landlock::kMakeDir, true},
    {RuleKind::kFileCreation, "symlink", Landlock::kMakeSym, true},
    {RuleKind::kFileCreation, "fifo", Landlock::kMakeFifo, true},
    {RuleKind::kFileCreation, "char_device", Landlock::kMakeChar, false},
    {RuleKind::kFileCreation, "block_device", Landlock::kMakeBlock, false},
    {RuleKind::kUnixSocketCreation, "stream", Landlock::kMakeSock, true},
    {RuleKind::kUnixSocketCreation, "dgram", Landlock::kMakeSock, true},
    {RuleKind::kUnixSocketCreation, "seqpacket", Landlock::kMakeSock, true},
}};
constexpr std::size_t kFirstSocketKind = 6;

// What rules say of everything that has one label.
struct LabelRules {
  std::array<Verdict, kAccesses.size()> accesses = {};
  std::array<Verdict, kCreations.size()> creations = {};
  bool isTransition = false;  // executing it enters another domain
};

using RulesByLabel = std::map<std::string, LabelRules, std::less<>>;

void NoteCreation(const Rule& rule, LabelRules& label) {
  const std::string& word = rule.words[rule.kind == RuleKind::kFileCreation ? 2 : 1];
  for (std::size_t index = 0; index < kCreations.size(); ++index) {
    if (kCreations[index].kind != rule.kind || kCreations[index].word != word) continue;
    // Each is about another new label: one that grants is enough.
    Verdict& verdict = label.creations[index];
    if (rule.Grants() || verdict == Verdict::kNone) {
      verdict = rule.Grants() ? Verdict::kGrants : Verdict::kRefuses;
    }
  }
}

void NoteAccess(const Rule& rule, LabelRules& label) {
  for (std::size_t index = 0; index < kAccesses.size(); ++index) {
    if (kAccesses[index].word != rule.words[1]) continue;
    label.accesses[index] =
        Join(label.accesses[index], rule.Grants() ? Verdict::kGrants : Verdict::kRefuses);
  }
}

// What is refused to any label.
LabelRules WorstOf(const RulesByLabel& labels) {
  LabelRules worst;
  for (const auto& [name, label] : labels) {
    worst.isTransition = worst.isTransition || label.isTransition;
    for (std::size_t index = 0; index < kAccesses.size(); ++index) {
      if (label.accesses[index] == Verdict::kRefuses) worst.accesses[index] = Verdict::kRefuses;
    }
    for (std::size_t index = 0; index < kCreations.size(); ++index) {
      if (label.creations[index] == Verdict::kRefuses) worst.creations[index] = Verdict::kRefuses;
    }
  }
  return worst;
}

RulesByLabel ReadLabelRules(const InstalledDomain& domain) {
  RulesByLabel labels;
  for (const Rule& rule : domain.rules) {
    const std::string& label = rule.words[0];
    if (rule.kind == RuleKind::kObjectAccess) NoteAccess(rule, labels[label]);
    if (rule.kind == RuleKind::kFileCreation || rule.kind == RuleKind::kUnixSocketCreation) {
      NoteCreation(rule, labels[label]);
    }
    const bool isWayIn = rule.kind == RuleKind::kDomainTransition && rule.Grants() &&
                         rule.words[2] == "exec" && rule.words[1] != domain.name;
    if (isWayIn) labels[label].isTransition = true;
  }
  labels[std::string(kUnknownLabel)] = WorstOf(labels);
  return labels;
}

// ---- The tree of places where rights may change

// A path that a rule or a label begins at, or one on the way there.
struct Node {
  std::map<std::string, std::unique_ptr<Node>, std::less<>> children;
  const Rule* rule = nullptr;             // about this very path
  std::optional<std::string_view> label;  // where it is not that of the directory above
};

Node& NodeAt(Node& root, std::string_view path) {
  Node* node = &root;
  while (!path.empty()) {
    const std::size_t end = std::min(path.find('/'), path.size());
    const std::string_view name = path.substr(0, end);
    path.remove_prefix(std::min(end + 1, path.size()));
    if (name.empty()) continue;
    auto& child = node->children[std::string(name)];
    if (child == nullptr) child = std::make_unique<Node>();
    node = child.get();
  }
  return *node;
}

Node TreeOf(const InstalledDomain& domain, const std::vector<LabelledPath>& places) {
  Node root;
  for (const Rule& rule : domain.rules) {
    if (rule.kind == RuleKind::kFilePath) NodeAt(root, rule.words[0]).rule = &rule;
  }
  for (const LabelledPath& place : places) NodeAt(root, place.path).label = place.label;
  return root;
}

// What decides over a file: the rule about its path, and its label.
struct Region {
  const Rule* rule = nullptr;
  std::string_view label;

  auto operator<=>(const Region&) const = default;
};

Region RegionOf(const Node& node, Region above) {
  if (node.rule != nullptr) above.rule = node.rule;
  if (node.label) above.label = *node.label;
  return above;
}

std::string Join(const std::string& directory, const std::string& name) {
  return (directory == "/" ? "" : directory) + "/" + name;
}

// ---- The plan

class Planner {
 public:
  Planner(const InstalledDomain& planned, const std::vector<LabelledPath>& places, FileTree& tree)
      : domain(planned),
        files(tree),
        labels(ReadLabelRules(planned)),
        root(TreeOf(planned, places)),
        socketKinds(SocketKinds(planned)) {}

  PathPlan Run() {
    Examine(root, "/", {});
    Place(root, "/", {}, 0);
    return {std::move(rights), Fates()};
  }

 private:
  // What is known of a node before rights are given.
  struct Finding {
    FileKind kind = FileKind::kNothing;
    Rights own = 0;   // what the file itself may be used for, and what is to come beneath it
    Rights here = 0;  // of these, what all beneath it has too
  };

  // The kinds of unix sockets that the domain can make at all, as their numbers are for the kernel.
  static std::array<bool, 3> SocketKinds(const InstalledDomain& domain) {
    constexpr std::array<std::uint32_t, 3> kTypes = {SOCK_STREAM, SOCK_DGRAM, SOCK_SEQPACKET};
    const ValueSet passing = PassingValues(RulesOfCheck(domain.rules, "socket_type"));
    std::array<bool, 3> kinds = {};
    for (std::size_t index = 0; index < kTypes.size(); ++index) {
      kinds[index] = passing.Has(kTypes[index]);
    }
    return kinds;
  }

  Verdict PathVerdict(const Region& region, Permission permission) const {
    if (region.rule == nullptr) return Verdict::kNone;
    return region.rule->Permits().Has(permission) ? Verdict::kGrants : Verdict::kRefuses;
  }

  const LabelRules& RulesOf(std::string_view label) const {
    static const LabelRules none;
    const auto found = labels.find(label);
    return found == labels.end() ? none : found->second;
  }

  bool MayMake(const Region& region, std::size_t index) const {
    Verdict verdict = PathVerdict(region, Permission::kWrite);
    if (!kCreations[index].byPath && verdict == Verdict::kGrants) verdict = Verdict::kNone;
    return Join(verdict, RulesOf(region.label).creations[index]) == Verdict::kGrants;
  }

  // A kind of socket cannot be told from others, but by what the domain can make.
  bool MayMakeSockets(const Region& region) const {
    bool any = false;
    for (std::size_t kind = 0; kind < socketKinds.size(); ++kind) {
      if (!socketKinds[kind]) continue;
      if (!MayMake(region, kFirstSocketKind + kind)) return false;
      any = true;
    }
    return any;
  }

  Rights ComputeRights(const Region& region) {
    const LabelRules& label = RulesOf(region.label);
    Rights granted = 0;
    for (std::size_t index = 0; index < kAccesses.size(); ++index) {
      const Verdict byPath = PathVerdict(region, kAccesses[index].permission);
      if (Join(byPath, label.accesses[index]) == Verdict::kGrants) {
        granted |= kAccesses[index].rights;
      }
    }
    for (std::size_t index = 0; index < kFirstSocketKind; ++index) {
      if (MayMake(region, index)) granted |= kCreations[index].rights;
    }
    if (MayMakeSockets(region)) {
      granted |= Landlock::kMakeSock;
    } else {
      NoteSocketKinds(region);
    }
    if ((granted & (Landlock::kMakeReg | Landlock::kMakeDir)) != 0) granted |= Landlock::kRefer;
    return Restrict(region, granted);
  }

  // What the kernel cannot tell apart is not granted.
  Rights Restrict(const Region& region, Rights granted) {
    if (RulesOf(region.label).isTransition) {
      Lose(region, granted & (Landlock::kReadFile | Landlock::kExecute),
           "files labelled " + std::string(region.label) +
               " enter another domain by \"secpolicy exec\", so they are neither executed nor "
               "read here");
      granted &= ~(Landlock::kReadFile | Landlock::kExecute);
    }
    const bool isUnreadable =
        (granted & Landlock::kExecute) != 0 && (granted & Landlock::kReadFile) == 0;
    if (isUnreadable) {
      Lose(region, Landlock::kExecute,
           "the kernel reads a program to execute it, and this one may not be read",
           Fate::kNotExpressible);
      granted &= ~Landlock::kExecute;
    }
    return granted;
  }

  void NoteSocketKinds(const Region& region) {
    for (std::size_t kind = 0; kind < socketKinds.size(); ++kind) {
      if (!socketKinds[kind] || !MayMake(region, kFirstSocketKind + kind)) continue;
      Lose(region, Landlock::kMakeSock,
           "kinds of unix sockets are not told apart: it takes socket_type rules that grant no "
           "other kind");
    }
  }

  Rights RightsOf(const Region& region) {
    const auto known = regions.find(region);
    if (known != regions.end()) return known->second;
    return regions.emplace(region, ComputeRights(region)).first->second;
  }

  // Beneath a file is nothing that rights to directories are about.
  static Rights Beneath(const Finding& finding) {
    return finding.kind == FileKind::kDirectory || finding.kind == FileKind::kNothing
               ? finding.here
               : finding.here | ~Landlock::kOfFiles;
  }

  Rights Examine(const Node& node, const std::string& path, const Region& above) {
    const Region region = RegionOf(node, above);
    Finding finding{.kind = files.KindOf(path)};
    finding.own = RightsOf(region);
    finding.here = finding.own;
    for (const auto& [name, child] : node.children) {
      const Rights beneath = Examine(*child, Join(path, name), region);
      if (finding.kind == FileKind::kFile) continue;
      // An entry is removed by its own rights, whatever lies beneath it.
      const Rights entry = findings[child.get()].own | ~kEntryRights;
      finding.here &= beneath & entry;
    }
    findings[&node] = finding;
    if (finding.kind == FileKind::kLink) return ~Rights{0};
    return Beneath(finding);
  }

  void Place(const Node& node, const std::string& path, const Region& above, Rights have) {
    const Region region = RegionOf(node, above);
    const Finding& finding = findings[&node];
    const Rights fitting = finding.kind == FileKind::kDirectory ? ~Rights{0} : Landlock::kOfFiles;
    if (&node != &root) LoseEntry(region, finding.own & kEntryRights & ~have, path);
    if (finding.kind == FileKind::kLink) return;
    if (finding.kind == FileKind::kNothing) {
      if (node.rule != nullptr) LoseMissing(region, finding.own & ~have);
    } else {
      Give(path, region, finding.here & fitting & ~have);
      have |= finding.here;
    }
    const Rights apart = finding.own & fitting & ~have;
    if (apart != 0 && finding.kind == FileKind::kDirectory) TakeApart(node, path, region, apart);
    for (const auto& [name, child] : node.children) {
      Place(*child, Join(path, name), region, have);
    }
  }

  // The kernel asks the directory above whether its entries may go.
  void LoseEntry(const Region& region, Rights lost, const std::string& path) {
    if (lost == 0) return;
    Lose(region, lost,
         "removing " + path + " takes the right to remove from the directory above it");
  }

  void LoseMissing(const Region& region, Rights lost) {
    Lose(region, lost, "there is nothing at " + region.rule->words[0] + ", or only a link");
  }

  void Give(const std::string& path, const Region& region, Rights given,
            bool mayBeMissing = false) {
    if (given == 0) return;
    if (rights.size() == kMostPathRights) {
      Lose(region, given,
           "it takes more than " + std::to_string(kMostPathRights) + " rights to paths");
      return;
    }
    rights.push_back({path, given, mayBeMissing});
  }

  // What is beneath the directory does not all have the rights: each entry gets them that does.
  void TakeApart(const Node& node, const std::string& path, const Region& region, Rights apart) {
    const auto entries = files.List(path, kMostSiblings);
    if (!entries) {
      Lose(region, apart,
           path + " has more than " + std::to_string(kMostSiblings) +
               " entries, and some have other rights");
      return;
    }
    Lose(region, apart,
         "entries of " + path +
             " have different rights: those that are there at "
             "the start have theirs, new ones and the directory itself do not");
    for (const std::string& name : *entries) {
      if (node.children.contains(name)) continue;
      const std::string entry = Join(path, name);
      const FileKind kind = files.KindOf(entry);
      // No rule names it, so it may come and go.
      if (kind == FileKind::kDirectory) Give(entry, region, apart, true);
      if (kind == FileKind::kFile) Give(entry, region, apart & Landlock::kOfFiles, true);
    }
  }

  // ---- What is not as the rules say

  struct Loss {
    Rights rights = 0;
    Fate fate = Fate::kNarrowed;
    std::string how;
  };

  void Lose(const Region& region, Rights lost, const std::string& how,
            Fate fate = Fate::kNarrowed) {
    if (lost == 0) return;
    Note(pathLosses[region.rule], {lost, fate, how});
    Note(labelLosses[region.label], {lost, fate, how});
  }

  // Of each fate the first reason is enough for the same rights.
  static void Note(std::vector<Loss>& losses, Loss loss) {
    for (const Loss& known : losses) {
      if (known.fate == loss.fate) loss.rights &= ~known.rights;
    }
    if (loss.rights != 0) losses.push_back(std::move(loss));
  }

  // The rights that a rule grants, if it is about files.
  static Rights RightsOf(const Rule& rule) {
    if (!rule.Grants()) return 0;
    Rights granted = 0;
    if (rule.kind == RuleKind::kFilePath) {
      for (const AccessRow& row : kAccesses) {
        if (rule.Permits().Has(row.permission)) granted |= row.rights;
      }
      for (const CreationRow& row : kCreations) {
        if (row.byPath && rule.Permits().Has(Permission::kWrite)) granted |= row.rights;
      }
    }
    if (rule.kind == RuleKind::kObjectAccess) {
      for (const AccessRow& row : kAccesses) {
        if (row.word == rule.words[1]) granted |= row.rights;
      }
    }
    if (rule.kind == RuleKind::kDomainTransition) granted = Landlock::kExecute;
    for (const CreationRow& row : kCreations) {
      if (row.kind != rule.kind) continue;
      if (row.word == rule.words[rule.kind == RuleKind::kFileCreation ? 2 : 1]) {
        granted |= row.rights;
      }
    }
    return granted;
  }

  std::span<const Loss> LossesOf(const Rule& rule) const {
    if (rule.kind == RuleKind::kFilePath) {
      const auto found = pathLosses.find(&rule);
      return found == pathLosses.end() ? std::span<const Loss>() : found->second;
    }
    const auto found = labelLosses.find(std::string_view(rule.words[0]));
    return found == labelLosses.end() ? std::span<const Loss>() : found->second;
  }

  RuleFate FateOf(const Rule& rule) const {
    const bool isWayIn = rule.kind == RuleKind::kDomainTransition && rule.Grants();
    if (isWayIn && rule.words[2] != "exec") {
      return {rule, Fate::kNarrowed, "only services of this host enter a domain this way"};
    }
    if (isWayIn) return {rule, Fate::kNarrowed, "only by \"secpolicy exec\""};
    RuleFate fate{rule, Fate::kEnforced, ""};
    const Rights granted = RightsOf(rule);
    for (const Loss& loss : LossesOf(rule)) {
      if ((loss.rights & granted) != 0 && loss.fate > fate.fate) fate = {rule, loss.fate, loss.how};
    }
    if (GivesNewLabel(rule)) {
      fate.fate = std::max(fate.fate, Fate::kNarrowed);
      fate.how += fate.how.empty() ? "" : "; ";
      fate.how += "what is made has the label of its directory, as the kernel gives none";
    }
    return fate;
  }

  static bool GivesNewLabel(const Rule& rule) {
    return rule.kind == RuleKind::kFileCreation && rule.Grants() && rule.words[0] != rule.words[1];
  }

  std::vector<RuleFate> Fates() const {
    std::vector<RuleFate> fates;
    for (const Rule& rule : domain.rules) {
      switch (rule.kind) {
        case RuleKind::kObjectAccess:
        case RuleKind::kDomainTransition:
        case RuleKind::kFileCreation:
        case RuleKind::kFilePath:
        case RuleKind::kUnixSocketCreation:
          fates.push_back(FateOf(rule));
          break;
        case RuleKind::kCapability:
        case RuleKind::kParameterCheck:
        case RuleKind::kSyscall:
          break;
      }
    }
    return fates;
  }

  const InstalledDomain& domain;
  FileTree& files;
  const RulesByLabel labels;
  const Node root;
  const std::array<bool, 3> socketKinds;
  std::map<Region, Rights> regions;
  std::map<const Node*, Finding> findings;
  std::map<const Rule*, std::vector<Loss>> pathLosses;
  std::map<std::string_view, std::vector<Loss>> labelLosses;
  std::vector<PathRight> rights;
};

}  // namespace

PathPlan PlanPaths(const InstalledDomain& domain, const std::vector<LabelledPath>& places,
                   FileTree& files) {
  return Planner(domain, places, files).Run();
}

}  // namespace Enforce
