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
constexpr unsigned int kHighestBuiltInId = 3;

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

  // Adds those of `added` that are missing, all or none. An identifier is never used again for
  // another name: in the host's own state not after a boot either, where a name has the one that it
  // has ever had. Throws for a name that cannot be a label, and when a new identifier cannot be
  // kept for the next boot.
  void Add(const std::vector<std::string>& added);

  // Removes labels, and the rules that name them; unknown and predefined ones are left out.
  void Remove(const std::vector<std::string>& removed);

  // The highest identifier that this state has ever given.
  std::int64_t HighestNumber();

 private:
  void Load();
  std::vector<std::string> Missing(const std::vector<std::string>& wanted);
  std::vector<std::uint32_t> NumbersFor(const std::vector<std::string>& added);

  StateBase& base;
  std::optional<std::int64_t> loadedVersion;
  TextMap<unsigned int> identifiers;
  std::unordered_map<unsigned int, std::string> names;
};

}  // namespace LinuxHost
