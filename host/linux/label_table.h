#pragma once

#include <map>
#include <string>
#include <unordered_map>
#include <vector>

#include "store.h"

namespace LinuxHost {

class HostState;

// The identifier that no label ever has; what a lookup of an unknown label answers.
constexpr unsigned int kNoLabel = 1;

// The labels that are built into the kernel.
constexpr char kUnlabeled[] = "unlabeled";
constexpr char kDefaultTardiskLabel[] = "tardiskDefault";

// The object labels. Answered from memory as long as no other process has changed them.
class LabelTable {
 public:
  explicit LabelTable(HostState& owner);

  // The identifier of the label `name`, kNoLabel when there is none.
  unsigned int Lookup(const std::string& name);

  // The name of the label `id`. Throws HostError when there is none.
  const std::string& Name(unsigned int id);

  // True for the labels that are built in.
  static bool IsPredefined(const std::string& name);

  // All labels with their identifiers.
  std::map<std::string, long> All();

  // Adds those of `names` that are missing, all or none. Identifiers are never used again within
  // one state. Throws HostError for a name that cannot be a label.
  void Add(const std::vector<std::string>& names);

  // Removes labels, and the rules that name them; unknown and predefined ones stay out of it.
  void Remove(const std::vector<std::string>& names);

  // Called by HostState with the version that the state is at now.
  void Notice(std::int64_t currentVersion);

 private:
  void Load();

  HostState& state;
  std::int64_t version = 0;
  bool loaded = false;
  std::unordered_map<std::string, unsigned int> identifiers;
  std::unordered_map<unsigned int, std::string> names;
};

}  // namespace LinuxHost
