#include <memory_resource>
#include <string_view>
#include <unordered_set>
#include <utility>

#include "secpolicy/secpolicy.h"

namespace SecPolicy {
namespace {

using TeskCtl::Security::TESKACCESS_LABEL_DOMAIN;

using Labels = std::vector<std::string>;
using Names = std::pmr::unordered_set<std::string_view>;

bool IsObsolete(const std::string& label, const Names& named, TeskAccessLabelType type,
                TeskAccessInterfaceImpl& access) {
  if (type == TESKACCESS_LABEL_DOMAIN && access.IsPrivilegedVm(label)) return false;
  if (named.contains(label)) return false;
  return !access.IsPredefinedLabel(label, type);
}

Labels FindObsolete(const Labels& policyLabels, const std::map<std::string, long>& kernelLabels,
                    TeskAccessLabelType type, TeskAccessInterfaceImpl& access) {
  // Side by side in one piece of memory, the names of a large policy are looked up twice as fast as
  // scattered over the heap.
  std::pmr::monotonic_buffer_resource memory;
  const Names named(policyLabels.begin(), policyLabels.end(), policyLabels.size(), &memory);
  Labels obsolete;
  for (const auto& [label, value] : kernelLabels) {
    if (IsObsolete(label, named, type, access)) obsolete.push_back(label);
  }
  return obsolete;
}

void Report(const char* heading, const Labels& labels) {
  if (labels.empty()) return;
  SecpolicyInfo(heading);
  for (const std::string& label : labels) SecpolicyInfo(label);
}

}  // namespace

void SyncLabelsFromPolicy(std::vector<std::string> policyLabels,
                          std::map<std::string, long> kernelLabels, TeskAccessLabelType type,
                          TeskAccessInterfaceImpl& access) {
  Labels invalid = access.GetInvalidLabels(type);
  access.RemoveLabels(invalid, type);
  access.AddLabels(invalid, type);
  PrintInvalidLabels(std::move(invalid), type);

  Labels obsolete = FindObsolete(policyLabels, kernelLabels, type, access);
  access.RemoveLabels(obsolete, type);
  PrintObsoleteLabels(std::move(obsolete), type);

  access.AddLabels(std::move(policyLabels), type);
}

std::vector<std::string> GetObsoleteLabels(std::vector<std::string> policyLabels,
                                           std::map<std::string, long> kernelLabels,
                                           TeskAccessLabelType type,
                                           TeskAccessInterfaceImpl& access) {
  return FindObsolete(policyLabels, kernelLabels, type, access);
}

void PrintInvalidLabels(std::vector<std::string> labels, TeskAccessLabelType type) {
  Report(type == TESKACCESS_LABEL_DOMAIN ? "The values of the following domains have been changed:"
                                         : "The values of the following objects have been changed:",
         labels);
}

void PrintObsoleteLabels(std::vector<std::string> labels, TeskAccessLabelType type) {
  Report(type == TESKACCESS_LABEL_DOMAIN ? "The following domains have been removed:"
                                         : "The following objects have been removed:",
         labels);
}

}  // namespace SecPolicy
