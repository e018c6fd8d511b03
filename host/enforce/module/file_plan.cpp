#include "host/enforce/module/file_plan.h"

#include <algorithm>
#include <array>
#include <span>
#include <string_view>

#include "braxo/misc/strcat.h"
#include "policy/decision.h"

using Braxo::Misc::StrCat;
using Policy::InstalledDomain;
using Policy::Rule;
using Policy::RuleKind;

namespace Enforce {
namespace {

struct Right {
  std::string_view word;
  __u32 bit;
};

constexpr std::array<Right, 6> kAccesses = {{{"read", kUseRead},
                                             {"write", kUseWrite},
                                             {"execute", kUseExecute},
                                             {"list", kUseList},
                                             {"remove", kUseRemove},
                                             {"truncate", kUseTruncate}}};

// In the order of their bits.
constexpr std::array<Right, 6> kFileKinds = {{{"regular", kMayMakeRegular},
                                              {"directory", kMayMakeDirectory},
                                              {"symlink", kMayMakeLink},
                                              {"fifo", kMayMakeFifo},
                                              {"char_device", kMayMakeCharacterDevice},
                                              {"block_device", kMayMakeBlockDevice}}};

constexpr std::array<Right, 3> kSocketKinds = {
    {{"stream", kMayMakeStream}, {"dgram", kMayMakeDatagram}, {"seqpacket", kMayMakeSequence}}};

__u32 BitOf(std::span<const Right> rights, std::string_view word) {
  const auto found = std::ranges::find(rights, word, &Right::word);
  return found == rights.end() ? 0 : found->bit;
}

// What is made, of a rule about making.
__u32 KindOf(const Rule& rule) {
  return rule.kind == RuleKind::kFileCreation ? BitOf(kFileKinds, rule.words[2])
                                              : BitOf(kSocketKinds, rule.words[1]);
}

class Planner {
 public:
  explicit Planner(const LabelNumbers& labels) : numbers(labels) {}

  void Take(const Rule& rule) {
    switch (rule.kind) {
      case RuleKind::kObjectAccess:
        return Note(rule, BitOf(kAccesses, rule.words[1]));
      case RuleKind::kDomainTransition:
        if (rule.Grants() && rule.words[2] == "exec") Note(rule, kUseExecute);
        return;
      case RuleKind::kFileCreation:
        return TakeCreation(rule);
      case RuleKind::kUnixSocketCreation:
        return Note(rule, KindOf(rule));
      case RuleKind::kFilePath:
        return TakePath(rule);
      default:
        return;
    }
  }

  ModuleFileRules Finish() {
    __u32 refused = 0;
    for (auto& [label, of] : rules.labels) {
      // Of several rules about what may be made, one that grants is enough.
      of.refused &= ~(of.granted >> kMakeShift << kMakeShift);
      refused |= of.refused;
    }
    // What is refused to any label is refused to one that nobody can tell.
    if (refused != 0) rules.labels[kLabelUnknown].refused = refused;
    return std::move(rules);
  }

 private:
  ModuleLabelRules* Of(const std::string& label) {
    const auto number = numbers.find(label);
    return number == numbers.end() ? nullptr : &rules.labels[number->second];
  }

  void Note(const Rule& rule, __u32 bit) {
    ModuleLabelRules* const of = Of(rule.words[0]);
    if (of == nullptr) return;
    (rule.Grants() ? of->granted : of->refused) |= bit;
  }

  void TakeCreation(const Rule& rule) {
    const __u32 bit = KindOf(rule);
    ModuleLabelRules* const of = Of(rule.words[0]);
    if (of == nullptr || bit == 0) return;
    const bool isFirst = (of->granted & bit) == 0;
    Note(rule, bit);
    const auto label = numbers.find(rule.words[1]);
    if (!rule.Grants() || !isFirst || label == numbers.end()) return;
    const auto kind = std::ranges::find(kFileKinds, bit, &Right::bit) - kFileKinds.begin();
    if (rule.words[0] != rule.words[1]) of->newLabels[kind] = label->second;
  }

  void TakePath(const Rule& rule) {
    __u32& of = rules.paths[rule.words[0]];
    of |= kPathHasRule;
    const Policy::Permissions& permits = rule.Permits();
    if (permits.Has(Policy::Permission::kRead)) of |= kPathRead;
    if (permits.Has(Policy::Permission::kWrite)) of |= kPathWrite;
    if (permits.Has(Policy::Permission::kExecute)) of |= kPathExecute;
    for (std::string above = rule.words[0]; above != "/";) {
      above.resize(std::max<std::size_t>(above.rfind('/'), 1));
      rules.paths[above] |= kPathIsAboveRule;
    }
  }

  const LabelNumbers& numbers;
  ModuleFileRules rules;
};

bool IsAboutFiles(const Rule& rule) {
  return rule.kind == RuleKind::kObjectAccess || rule.kind == RuleKind::kFileCreation ||
         rule.kind == RuleKind::kFilePath || rule.kind == RuleKind::kUnixSocketCreation;
}

bool IsLabelling(const Rule& rule) {
  return rule.kind == RuleKind::kFileCreation && rule.Grants() && rule.words[0] != rule.words[1];
}

std::string NamesOf(__u32 rights) {
  std::string names;
  for (const std::span<const Right> some :
       {std::span<const Right>(kAccesses), std::span<const Right>(kFileKinds),
        std::span<const Right>(kSocketKinds)}) {
    for (const auto& [word, bit] : some) {
      if ((rights & bit) != 0) names += StrCat(" ", word);
    }
  }
  return names.empty() ? " nothing" : names;
}

std::string TextOf(const ModuleLabelRules& rules) {
  std::string text = NamesOf(rules.granted);
  if (rules.refused != 0) text += StrCat(", not", NamesOf(rules.refused));
  for (std::size_t kind = 0; kind < kFileKinds.size(); ++kind) {
    if (rules.newLabels[kind] != 0)
      text += StrCat(", ", kFileKinds[kind].word, " as ", rules.newLabels[kind]);
  }
  if (rules.next != 0) text += StrCat(", to ", rules.next - 1);
  if (rules.nextOfTardisk != 0) text += StrCat(", ", "tardisks: ", rules.nextOfTardisk - 1);
  return text;
}

}  // namespace

ModuleFileRules PlanFiles(const InstalledDomain& domain, const LabelNumbers& labels) {
  Planner planner(labels);
  for (const Rule& rule : domain.rules) planner.Take(rule);
  return planner.Finish();
}

std::vector<RuleFate> FileFates(const InstalledDomain& domain) {
  std::vector<RuleFate> fates;
  for (const Rule& rule : domain.rules) {
    if (!IsAboutFiles(rule)) continue;
    RuleFate fate{.rule = rule, .place = PlaceOf(rule, domain.rules)};
    if (IsLabelling(rule))
      Narrow(fate, "the label is on the disk only once the module was told to write it");
    fates.push_back(fate);
  }
  return fates;
}

std::string Dump(const ModuleFileRules& rules) {
  std::string text;
  for (const auto& [label, of] : rules.labels)
    text += StrCat("  label ", label, ":", TextOf(of), "\n");
  for (const auto& [path, of] : rules.paths) {
    if ((of & kPathHasRule) == 0) continue;
    text += StrCat("  ", path, ": ", (of & kPathRead) != 0 ? "r" : "",
                   (of & kPathWrite) != 0 ? "w" : "", (of & kPathExecute) != 0 ? "x" : "", "\n");
  }
  return text;
}

}  // namespace Enforce
