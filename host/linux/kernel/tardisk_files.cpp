#include "host/linux/kernel/tardisk_files.h"

#include <cstdint>
#include <cstring>
#include <map>
#include <optional>
#include <set>
#include <string>

#include "host/linux/files/security_attribute.h"
#include "host/linux/state/keyword_tables.h"
#include "host/linux/state/label_table.h"

namespace LinuxHost {
namespace {

// The labels whose tardisks lead anywhere.
std::set<std::uint32_t> LeadingLabels(const Policy::InstalledPolicy& policy) {
  std::set<std::uint32_t> labels;
  for (const Policy::InstalledDomain& domain : policy.domains) {
    for (const Policy::Rule& rule : domain.rules) {
      if (rule.kind != Policy::RuleKind::kDomainTransition || !rule.Grants()) continue;
      if (rule.words[2] != kTardiskExec) continue;
      const auto label = policy.objects.find(rule.words[0]);
      if (label != policy.objects.end()) labels.insert(label->second);
    }
  }
  return labels;
}

// That of the image; kNoLabel where it has none or has gone.
std::uint32_t LabelOfTardisk(const std::string& name, const std::string& attribute) {
  const std::string path = "/tardisks/" + name;
  const std::optional<std::string> carried = ReadCarried(path.c_str(), attribute);
  std::uint32_t label = kNoLabel;
  if (carried && carried->size() == sizeof label)
    std::memcpy(&label, carried->data(), sizeof label);
  return label;
}

}  // namespace

Enforce::TardiskFiles ReadTardiskFiles(HostState& state, const Policy::InstalledPolicy& policy) {
  Enforce::TardiskFiles files;
  const std::set<std::uint32_t> leading = LeadingLabels(policy);
  const std::string attribute = state.LabelAttribute();
  if (leading.empty() || attribute.empty()) return files;
  std::map<std::string, std::uint32_t> labels;
  state.ForEachUnpackedFile([&](const UnpackedFile& file) {
    auto known = labels.find(file.tardisk);
    if (known == labels.end())
      known = labels.emplace(file.tardisk, LabelOfTardisk(file.tardisk, attribute)).first;
    if (!leading.contains(known->second)) return;
    files.push_back({.device = file.device,
                     .inode = file.inode,
                     .generation = file.generation,
                     .label = known->second});
  });
  return files;
}

}  // namespace LinuxHost
