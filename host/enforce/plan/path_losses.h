#pragma once

#include <compare>
#include <map>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "host/enforce/coverage.h"
#include "host/enforce/plan/file_rights.h"

namespace Enforce {

// What decides over a file: the rule about its path, and its label.
struct Region {
  const Policy::Rule* rule = nullptr;
  std::string_view label;

  auto operator<=>(const Region&) const = default;
};

// What a plan does not give of the rights that the rules about files grant, and why.
class PathLosses {
 public:
  // The rights are lost where both the rule and the label of the region are. Of each fate the first
  // reason is enough for the same rights.
  void Lose(const Region& region, Rights lost, const std::string& how, Fate fate = Fate::kNarrowed);

  // What becomes of a rule about files (-a, -d, -f, -r, -u), which is that of a region.
  RuleFate FateOf(const Policy::Rule& rule) const;

 private:
  struct Loss {
    Rights rights = 0;
    Fate fate = Fate::kNarrowed;
    std::string how;
  };

  static void Note(std::vector<Loss>& losses, Loss loss);
  std::span<const Loss> LossesOf(const Policy::Rule& rule) const;

  std::map<const Policy::Rule*, std::vector<Loss>> ofPaths;
  std::map<std::string_view, std::vector<Loss>> ofLabels;
};

}  // namespace Enforce
