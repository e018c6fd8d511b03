#pragma once

#include <array>
#include <map>
#include <string>
#include <string_view>

#include "host/enforce/plan/path_losses.h"
#include "policy/installed_policy.h"

namespace Enforce {

// Stands for a label that nobody knows: what rules refuse to any label is refused to it.
inline constexpr std::string_view kUnknownLabel{"\0", 1};

// What the rules of a domain say of files.
class FileRules {
 public:
  // What is lost of their rights goes to `told`. Both it and the domain have to outlive this.
  FileRules(const Policy::InstalledDomain& domain, PathLosses& told);

  // What the domain may do with a file of the region, and what is to come beneath it, as far as the
  // kernel tells it apart.
  Rights RightsOf(const Region& region);

  // What besides is granted, and is only withheld since who executes the file enters another
  // domain: harmless where nothing can be executed.
  Rights WithheldOf(const Region& region);

 private:
  enum class Verdict { kNone, kGrants, kRefuses };

  // What rules say of everything that has one label.
  struct LabelRules {
    std::array<Verdict, kAccesses.size()> accesses = {};
    std::array<Verdict, kCreations.size()> creations = {};
    bool isTransition = false;  // executing it enters another domain
  };

  struct Settled {
    Rights rights = 0;
    Rights withheld = 0;
  };

  static Verdict Join(Verdict one, Verdict other);
  static void NoteAccess(const Policy::Rule& rule, LabelRules& label);
  static void NoteCreation(const Policy::Rule& rule, LabelRules& label);
  void ReadLabels(const Policy::InstalledDomain& domain);
  LabelRules WorstOfLabels() const;
  void ReadSocketKinds(const Policy::InstalledDomain& domain);

  static Verdict PathVerdict(const Region& region, Policy::Permission permission);
  const LabelRules& RulesOf(std::string_view label) const;
  bool MayMake(const Region& region, std::size_t index) const;
  bool MayMakeSockets(const Region& region) const;
  void TellOfSocketKinds(const Region& region);
  Rights GrantedTo(const Region& region);
  Settled Settle(const Region& region);
  const Settled& SettledOf(const Region& region);

  PathLosses& losses;
  std::map<std::string, LabelRules, std::less<>> labels;
  std::array<bool, 3> socketKinds = {};  // that the domain can make at all
  std::map<Region, Settled> regions;
};

}  // namespace Enforce
