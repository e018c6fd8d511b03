#include "host/enforce/plan/file_rules.h"

#include <sys/socket.h>

#include "host/enforce/plan/value_set.h"

namespace Enforce {

using Policy::InstalledDomain;
using Policy::Permission;
using Policy::Rule;
using Policy::RuleKind;

FileRules::FileRules(const InstalledDomain& domain, PathLosses& told) : losses(told) {
  ReadLabels(domain);
  ReadSocketKinds(domain);
}

Rights FileRules::RightsOf(const Region& region) { return SettledOf(region).rights; }

Rights FileRules::WithheldOf(const Region& region) { return SettledOf(region).withheld; }

// ---- What the rules say

FileRules::Verdict FileRules::Join(Verdict one, Verdict other) {
  if (one == Verdict::kRefuses || other == Verdict::kRefuses) return Verdict::kRefuses;
  return one == Verdict::kNone ? other : one;
}

void FileRules::NoteAccess(const Rule& rule, LabelRules& label) {
  for (std::size_t index = 0; index < kAccesses.size(); ++index) {
    if (kAccesses[index].word != rule.words[1]) continue;
    label.accesses[index] =
        Join(label.accesses[index], rule.Grants() ? Verdict::kGrants : Verdict::kRefuses);
  }
}

void FileRules::NoteCreation(const Rule& rule, LabelRules& label) {
  for (std::size_t index = 0; index < kCreations.size(); ++index) {
    if (!IsAbout(kCreations[index], rule)) continue;
    // Each is about another new label: one that grants is enough.
    Verdict& verdict = label.creations[index];
    if (rule.Grants() || verdict == Verdict::kNone) {
      verdict = rule.Grants() ? Verdict::kGrants : Verdict::kRefuses;
    }
  }
}

void FileRules::ReadLabels(const InstalledDomain& domain) {
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
  labels[std::string(kUnknownLabel)] = WorstOfLabels();
}

// What is refused to any label.
FileRules::LabelRules FileRules::WorstOfLabels() const {
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

void FileRules::ReadSocketKinds(const InstalledDomain& domain) {
  constexpr std::array<std::uint32_t, 3> kTypes = {SOCK_STREAM, SOCK_DGRAM, SOCK_SEQPACKET};
  const ValueSet passing = PassingValues(RulesOfCheck(domain.rules, "socket_type"));
  for (std::size_t index = 0; index < kTypes.size(); ++index) {
    socketKinds[index] = passing.Has(kTypes[index]);
  }
}

// ---- What it means for a region

FileRules::Verdict FileRules::PathVerdict(const Region& region, Permission permission) {
  if (region.rule == nullptr) return Verdict::kNone;
  return region.rule->Permits().Has(permission) ? Verdict::kGrants : Verdict::kRefuses;
}

const FileRules::LabelRules& FileRules::RulesOf(std::string_view label) const {
  static const LabelRules none;
  const auto found = labels.find(label);
  return found == labels.end() ? none : found->second;
}

bool FileRules::MayMake(const Region& region, std::size_t index) const {
  Verdict verdict = PathVerdict(region, Permission::kWrite);
  if (!kCreations[index].byPath && verdict == Verdict::kGrants) verdict = Verdict::kNone;
  return Join(verdict, RulesOf(region.label).creations[index]) == Verdict::kGrants;
}

// A kind of socket cannot be told from others, but by what the domain can make.
bool FileRules::MayMakeSockets(const Region& region) const {
  bool any = false;
  for (std::size_t kind = 0; kind < socketKinds.size(); ++kind) {
    if (!socketKinds[kind]) continue;
    if (!MayMake(region, kFirstSocketKind + kind)) return false;
    any = true;
  }
  return any;
}

void FileRules::TellOfSocketKinds(const Region& region) {
  for (std::size_t kind = 0; kind < socketKinds.size(); ++kind) {
    if (!socketKinds[kind] || !MayMake(region, kFirstSocketKind + kind)) continue;
    losses.Lose(region, Landlock::kMakeSock,
                "kinds of unix sockets are not told apart: it takes socket_type rules that grant "
                "no other kind");
  }
}

Rights FileRules::GrantedTo(const Region& region) {
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
    TellOfSocketKinds(region);
  }
  if ((granted & (Landlock::kMakeReg | Landlock::kMakeDir)) != 0) granted |= Landlock::kRefer;
  return granted;
}

// What the kernel cannot tell apart is not granted.
FileRules::Settled FileRules::Settle(const Region& region) {
  constexpr Rights kStarting = Landlock::kReadFile | Landlock::kExecute;
  Settled settled{.rights = GrantedTo(region)};
  if (RulesOf(region.label).isTransition) {
    settled.withheld = settled.rights & kStarting;
    settled.rights &= ~kStarting;
    losses.Lose(region, settled.withheld,
                "files labelled " + std::string(region.label) +
                    " enter another domain by \"secpolicy exec\", so they are neither executed nor "
                    "read here");
  }
  if ((settled.rights & kStarting) == Landlock::kExecute) {
    losses.Lose(region, Landlock::kExecute,
                "the kernel reads a program to execute it, and this one may not be read",
                Fate::kNotExpressible);
    settled.rights &= ~Landlock::kExecute;
  }
  return settled;
}

const FileRules::Settled& FileRules::SettledOf(const Region& region) {
  const auto [place, isNew] = regions.try_emplace(region);
  if (isNew) place->second = Settle(region);
  return place->second;
}

}  // namespace Enforce
