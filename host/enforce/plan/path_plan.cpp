#include "host/enforce/plan/path_plan.h"

#include <algorithm>
#include <map>
#include <memory>
#include <optional>
#include <utility>

#include "host/enforce/plan/file_rules.h"

namespace Enforce {
namespace {

using Policy::InstalledDomain;
using Policy::Rule;
using Policy::RuleKind;

bool IsFile(FileKind kind) { return kind == FileKind::kFile || kind == FileKind::kSpecial; }

// ---- The tree of places where rights may change

// What is known of a place before rights are given.
struct Finding {
  FileKind kind = FileKind::kNothing;
  Region region;
  Rights own = 0;   // what the file itself may be used for, and what is to come beneath it
  Rights here = 0;  // of these, what all beneath it has too
  Rights any = 0;   // what anything has that is there: the file, or one beneath it
};

// A path that a rule or a label begins at, or one on the way there.
struct Node {
  std::map<std::string, std::unique_ptr<Node>, std::less<>> children;
  const Rule* rule = nullptr;             // about this very path
  std::optional<std::string_view> label;  // where it is not that of the directory above
  Finding finding;
};

Node& ChildOf(Node& node, std::string_view name) {
  auto place = node.children.lower_bound(name);
  if (place == node.children.end() || place->first != name) {
    place = node.children.emplace_hint(place, name, std::make_unique<Node>());
  }
  return *place->second;
}

Node& NodeAt(Node& root, std::string_view path) {
  Node* node = &root;
  while (!path.empty()) {
    const std::size_t end = std::min(path.find('/'), path.size());
    const std::string_view name = path.substr(0, end);
    path.remove_prefix(std::min(end + 1, path.size()));
    if (name.empty()) continue;
    node = &ChildOf(*node, name);
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

Region RegionOf(const Node& node, Region above) {
  if (node.rule != nullptr) above.rule = node.rule;
  if (node.label) above.label = *node.label;
  return above;
}

std::string Join(const std::string& directory, const std::string& name) {
  return (directory == "/" ? "" : directory) + "/" + name;
}

// On a walk down the tree: the path is longer by a name for as long as this lives.
class Step {
 public:
  Step(std::string& walked, const std::string& name) : path(walked), before(walked.size()) {
    if (path != "/") path += '/';
    path += name;
  }
  Step(const Step&) = delete;
  Step& operator=(const Step&) = delete;
  ~Step() { path.resize(before); }

 private:
  std::string& path;
  const std::size_t before;
};

// ---- The plan

class Planner {
 public:
  Planner(const InstalledDomain& planned, const std::vector<LabelledPath>& places, FileTree& tree,
          bool masksCount)
      : domain(planned),
        files(tree),
        rules(planned, losses),
        root(TreeOf(planned, places)),
        mayMask(masksCount) {}

  PathPlan Run() {
    std::string path = "/";
    Examine(root, path, {});
    Place(root, path, 0);
    return {std::move(rights), std::move(masks), Fates()};
  }

 private:
  // Of rights that a directory is to have with all that is beneath it, those that its kind has.
  static Rights Fitting(FileKind kind) {
    return kind == FileKind::kDirectory ? ~Rights{0} : Landlock::kOfFiles;
  }

  // Beneath a file is nothing that rights to directories are about.
  static Rights Beneath(const Finding& finding) {
    return finding.kind == FileKind::kDirectory || finding.kind == FileKind::kNothing
               ? finding.here
               : finding.here | ~Landlock::kOfFiles;
  }

  static Rights AnyOf(const Finding& finding) {
    const bool isThere = finding.kind == FileKind::kDirectory || IsFile(finding.kind);
    return isThere ? finding.own & Fitting(finding.kind) : 0;
  }

  Rights Examine(Node& node, std::string& path, const Region& above) {
    Finding& finding = node.finding;
    finding.kind = files.KindOf(path);
    finding.region = RegionOf(node, above);
    finding.own = rules.RightsOf(finding.region);
    finding.here = finding.own;
    finding.any = AnyOf(finding);
    for (const auto& [name, child] : node.children) {
      const Step step(path, name);
      const Rights beneath = Examine(*child, path, finding.region);
      if (IsFile(finding.kind)) continue;
      const Finding& found = child->finding;
      finding.any |= found.any;
      // An entry is removed by its own rights, whatever lies beneath it.
      finding.here &= beneath & (found.own | ~kEntryRights);
    }
    if (finding.kind == FileKind::kLink) return ~Rights{0};
    return Beneath(finding);
  }

  void Place(const Node& node, std::string& path, Rights have) {
    const Finding& finding = node.finding;
    if (finding.kind == FileKind::kLink) return;
    if (finding.kind == FileKind::kNothing) {
      if (node.rule != nullptr) LoseMissing(finding.region, finding.own & ~have);
    } else {
      Give(path, finding.region, finding.here & Fitting(finding.kind) & ~have);
      have |= finding.here;
    }
    if (finding.kind == FileKind::kDirectory) {
      const Rights apart = finding.own & ~have;
      if (apart != 0) have |= Divide(node, path, apart);
    }
    for (const auto& [name, child] : node.children) {
      const Step step(path, name);
      Place(*child, path, have);
    }
  }

  void LoseMissing(const Region& region, Rights lost) {
    losses.Lose(region, lost, "there is nothing at " + region.rule->words[0] + ", or only a link");
  }

  void Give(const std::string& path, const Region& region, Rights given,
            bool mayBeMissing = false) {
    if (given == 0) return;
    if (rights.size() == kMostPathRights) {
      losses.Lose(region, given,
                  "it takes more than " + std::to_string(kMostPathRights) + " rights to paths");
      return;
    }
    rights.push_back({path, given, mayBeMissing});
  }

  // What is beneath the directory does not all have the rights `apart`. Returns those of them that
  // it has been given with all that is beneath it.
  Rights Divide(const Node& node, const std::string& path, Rights apart) {
    const Region& region = node.finding.region;
    if (const auto entries = files.List(path, kMostSiblings)) {
      TakeApart(node, path, *entries, apart);
      return 0;
    }
    const Rights given = MaskBeneath(node, path, apart);
    Give(path, region, given);
    losses.Lose(region, apart & ~given,
                path + " has more than " + std::to_string(kMostSiblings) +
                    " entries, and some have other rights");
    return given;
  }

  // Each entry gets the rights that has them.
  void TakeApart(const Node& node, const std::string& path, const std::vector<std::string>& entries,
                 Rights apart) {
    const Region& region = node.finding.region;
    losses.Lose(region, apart,
                "entries of " + path +
                    " have different rights: those that are there at "
                    "the start have theirs, new ones and the directory itself do not");
    for (const std::string& name : entries) {
      if (node.children.contains(name)) continue;
      const std::string entry = Join(path, name);
      const FileKind kind = files.KindOf(entry);
      // No rule names it, so it may come and go.
      if (kind == FileKind::kDirectory) Give(entry, region, apart, true);
      if (IsFile(kind)) Give(entry, region, apart & Landlock::kOfFiles, true);
    }
  }

  // ---- Masks

  struct LaidMask {
    Mask mask;
    const Finding* over;
  };

  // What a mask takes away from its place, and from all that is beneath it.
  struct Cover {
    MaskKind kind;
    Rights taken;
    Rights takenBeneath;
  };

  // Lays masks over what is beneath the directory and lacks some of the rights `apart`. Returns
  // those that it can be given then.
  Rights MaskBeneath(const Node& node, const std::string& path, Rights apart) {
    if (!mayMask || !files.CanMask()) return 0;
    Rights given = apart;
    std::vector<LaidMask> laid;
    for (Rights left = apart; left != 0; given &= ~left) {
      laid.clear();
      left = given & LayMasks(node, path, given, true, laid);
    }
    if (masks.size() + laid.size() > kMostMasks) return 0;
    for (const LaidMask& each : laid) {
      TellOfMask(each);
      masks.push_back(each.mask);
    }
    return given;
  }

  // Adds the masks for all that is beneath the node and lacks some of the rights `wanted`. Returns
  // those that no mask takes away where they are lacking.
  Rights LayMasks(const Node& node, const std::string& path, Rights wanted, bool areEntries,
                  std::vector<LaidMask>& laid) {
    Rights left = 0;
    if (wanted == 0) return left;
    for (const auto& [name, child] : node.children) {
      const Finding& finding = child->finding;
      const std::string place = Join(path, name);
      const Rights lacking = LackingOf(finding, wanted);
      const std::optional<Cover> cover = CoverFor(*child, lacking);
      Rights beneath = wanted;
      if (cover) {
        laid.push_back({{place, cover->kind}, &finding});
        beneath &= ~cover->takenBeneath;
        // A mask stays where it is, but the directories on the way could be moved, and the path be
        // made anew.
        if (child->rule != nullptr && !areEntries) left |= Landlock::kRemoveDir;
      }
      left |= lacking & ~(cover ? cover->taken : 0);
      left |= LayMasks(*child, place, beneath, false, laid);
    }
    return left;
  }

  static Rights LackingOf(const Finding& finding, Rights wanted) {
    if (IsFile(finding.kind)) wanted &= Landlock::kOfFiles | kEntryRights;
    if (finding.kind == FileKind::kLink) wanted &= kEntryRights;
    return wanted & ~finding.own;
  }

  std::optional<Cover> CoverFor(const Node& node, Rights lacking) {
    const Finding& finding = node.finding;
    const bool isFile = IsFile(finding.kind);
    if (lacking == 0 || (!isFile && finding.kind != FileKind::kDirectory)) return std::nullopt;
    // Whoever changes a file replaces it, as a rule, and the new one would have no mask. By its
    // label it has the directory's then, but its path is still the one that a rule is about.
    if (isFile && node.rule != nullptr) return std::nullopt;
    constexpr Rights kAll = ~Rights{0};
    const Rights starting = StartingTakenBy(finding);
    const bool isHidden = finding.any == 0 && (lacking & ~starting) != 0;
    if (isHidden && (!isFile || HasNullDevice())) return Cover{MaskKind::kHidden, kAll, kAll};
    if (starting == 0) return std::nullopt;
    return Cover{MaskKind::kNoExec, starting, Landlock::kExecute};
  }

  // Where nothing can be executed, who reads a program cannot start it past its label.
  Rights StartingTakenBy(const Finding& finding) {
    if ((finding.any & Landlock::kExecute) != 0) return 0;
    return Landlock::kExecute | (rules.WithheldOf(finding.region) & Landlock::kReadFile);
  }

  // It is what lies over files that are hidden.
  bool HasNullDevice() { return files.KindOf("/dev/null") == FileKind::kSpecial; }

  void TellOfMask(const LaidMask& laid) {
    const Region& region = laid.over->region;
    if (laid.mask.kind == MaskKind::kNoExec) {
      losses.Lose(
          region, laid.over->own & Landlock::kReadFile,
          laid.mask.path + " is mounted so that nothing there is executed, libraries neither");
    }
    losses.Lose(region, laid.over->own & kEntryRights,
                laid.mask.path + " has a mount over it, so it is neither moved nor removed");
  }

  // ---- What becomes of the rules

  std::vector<RuleFate> Fates() const {
    std::vector<RuleFate> fates;
    fates.reserve(domain.rules.size());
    for (const Rule& rule : domain.rules) {
      switch (rule.kind) {
        case RuleKind::kObjectAccess:
        case RuleKind::kDomainTransition:
        case RuleKind::kFileCreation:
        case RuleKind::kFilePath:
        case RuleKind::kUnixSocketCreation:
          fates.push_back(losses.FateOf(rule));
          fates.back().place = PlaceOf(rule, domain.rules);
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
  PathLosses losses;
  FileRules rules;
  Node root;
  const bool mayMask;
  std::vector<PathRight> rights;
  std::vector<Mask> masks;
};

}  // namespace

PathPlan PlanPaths(const InstalledDomain& domain, const std::vector<LabelledPath>& places,
                   FileTree& files, bool mayMask) {
  return Planner(domain, places, files, mayMask).Run();
}

}  // namespace Enforce
