#pragma once

#include <map>
#include <string>
#include <vector>

#include "secpolicy/secpolicy.h"

// What a host state holds, as values: for the verbs that compare, explain, draw and write it.
namespace SecPolicyCli {

// Where a rule or a label was written.
struct Origin {
  std::string file;  // empty: no policy file brought it
  unsigned int line = 0;
};

// One rule, written like the policy line that makes it: "-a sshKey read grant".
struct InstalledRule {
  std::string text;
  Origin origin;
  bool hasNoLine = false;  // a load installed it, and the latest one has not found it in any file
};

struct InstalledDomain {
  std::string name;
  unsigned int id = 0;
  std::string level;
  unsigned int state = 0;
  unsigned int references = 0;
  unsigned int worldReferences = 0;
  SecPolicy::TeskAccessKsi_DefaultDom defaultRules{};
  bool hasNoFile = false;            // the same of the domain
  std::vector<InstalledRule> rules;  // in the order in which `display` shows them
};

struct InstalledTardisk {
  std::string path;
  std::string label;  // empty when it cannot be read
};

struct InstalledPolicy {
  std::vector<InstalledDomain> domains;  // in ascending order of their identifiers
  std::map<std::string, unsigned int> objects;
  std::vector<InstalledTardisk> tardisks;  // in order of path
};

// Reads the state that this process works with, by way of the library's own rule sets. Throws what
// the host throws.
InstalledPolicy ReadInstalledPolicy(SecPolicy::TeskAccessInterfaceImpl& access);

}  // namespace SecPolicyCli
