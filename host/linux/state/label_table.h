#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "host/linux/common/text_map.h"
#include "host/linux/state/state_base.h"

namespace LinuxHost {

// The identifier that no label ever has; what a lookup of an unknown label answers.
constexpr unsigned int kNoLabel = 1;

// The labels that are built into the kernel.
constexpr char kUnlabeled[] = "unlabeled";
constexpr unsigned int kUnlabeledId = 2;
constexpr char kDefaultTardiskLabel[] = "tardiskDefault";

// The object labels, as of the last StateBase::Refresh(). Failures are HostErrors.
class LabelTable {
 public:
  explicit LabelTable(StateBase& stateBase) : base(stateBase) {}

  // The identifier of the label `name`, kNoLabel when there is none.
  unsigned int Lookup(std::string_view name);

  // The name of the label `id`. Throws when there is none.
  const std::string& Name(unsigned int id);

  // True for the labels that are built in.
  static bool IsPredefined(std::string_view name);

  // All labels with their identifiers.
  std::map<std::string, long> All();

  // Adds those of `added` that are missing, all or none. Identifiers are never used again within
  // one state. Throws for a name that cannot be a label.
  void Add(const std::vector<std::string>& added);

  // Removes labels, and the rules that name them; unknown and predefined ones are left out.
  void Remove(const std::vector<std::string>& removed);

 private:
  void Load();

  StateBase& base;
  std::optional<std::int64_t> loadedVersion;
  TextMap<unsigned int> identifiers;
  std::unordered_map<unsigned int, std::string> names;
};

}  // namespace LinuxHost
