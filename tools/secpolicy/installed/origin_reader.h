#pragma once

#include <list>
#include <string>
#include <vector>

#include "host/linux/operation/rule_origins.h"
#include "secpolicy/secpolicy.h"
#include "teskctl/security.h"

namespace SecPolicyCli {

// Finds out where the rules about paths, the rules of tardisks and the file labels are written, by
// reading policy files as a load does. A line that a load refuses ends its file here too; nothing
// is reported. `access` is only borrowed.
class OriginReader {
 public:
  explicit OriginReader(SecPolicy::TeskAccessInterfaceImpl& connection) : access(connection) {}

  // Reads every file of a directory. What comes later stands for what comes last in the kernel.
  void ReadPaths(const std::string& dir, const std::string& prefix, LinuxHost::LoadKind kind);
  void ReadTardisks(const std::string& dir);
  void ReadFileLabels(const std::string& dir);

  // The lines about paths of one domain.
  struct Paths {
    LinuxHost::LoadKind kind;
    std::string domain;
    std::vector<LinuxHost::PathLine> lines;
  };
  const std::vector<Paths>& AllPaths() const { return paths; }

  const std::vector<LinuxHost::RuleOrigin>& Rules() const { return rules; }
  const std::vector<LinuxHost::LabelOrigin>& Labels() const { return labels; }

 private:
  void ReadTardisk(const std::string& path);
  void ReadLabels(const std::string& path);
  void AddTransitions(const std::string& label, const std::string& domain, const std::string& file,
                      unsigned int line);

  SecPolicy::TeskAccessInterfaceImpl& access;
  std::vector<Paths> paths;
  std::vector<LinuxHost::RuleOrigin> rules;
  std::vector<LinuxHost::LabelOrigin> labels;
};

}  // namespace SecPolicyCli
