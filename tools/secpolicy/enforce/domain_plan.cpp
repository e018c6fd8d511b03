#include "domain_plan.h"

#include <string_view>
#include <utility>

#include "host/linux/operation/label_index.h"
#include "root.h"

namespace SecPolicyCli {
namespace {

using Enforce::LabelIndex;
using Enforce::RuleFate;

// A number that no label has any more is as good as none known.
std::string_view NameOf(std::uint32_t label, const LabelNames& names) {
  if (label == Enforce::kUnlabelled) return "";
  const auto name = names.find(label);
  return name == names.end() ? Enforce::kUnknownLabel : std::string_view(name->second);
}

LabelNames ReadLabelNames(SecPolicy::TeskAccessInterfaceImpl& access) {
  LabelNames names;
  for (const auto& [name, id] :
       access.GetKeywordsMap(TeskCtl::Security::TESKACCESS_KEYWORD_LABEL)) {
    names.emplace(static_cast<std::uint32_t>(id), name);
  }
  return names;
}

LabelIndex ReadNewestIndex() {
  LinuxHost::RefreshLabelIndex();
  return LinuxHost::ReadLabelIndex();
}

void NameOutside(Policy::Rule& rule) {
  std::string& file = rule.origin.file;
  if (!file.empty()) file = OutsidePath(file);
}

}  // namespace

PlanSources::PlanSources(SecPolicy::TeskAccessInterfaceImpl& access,
                         const Enforce::Features& kernelFeatures)
    : features(kernelFeatures), index(ReadNewestIndex()), names(ReadLabelNames(access)) {
  places.reserve(index.Size());
  for (const Enforce::LabelledPlace& place : index) {
    places.push_back({place.path, NameOf(place.label, names)});
  }
}

Enforce::Surroundings PlanSources::All() {
  return {.features = features,
          .places = places,
          .files = files,
          .isBelowRoot = !PlacesOfRoot().empty()};
}

Enforce::CompiledPlan PlanSources::Compile(const Policy::InstalledDomain& domain) {
  return Enforce::Compile(domain, All());
}

std::string PlanSources::Explain(const Policy::InstalledDomain& domain) {
  return Enforce::Explain(domain, All());
}

Enforce::CompiledPlan PlanOf(const Policy::InstalledDomain& domain,
                             SecPolicy::TeskAccessInterfaceImpl& access) {
  return PlanSources(access, Enforce::ProbeFeatures()).Compile(domain);
}

std::string ExplanationOf(Policy::InstalledDomain domain,
                          SecPolicy::TeskAccessInterfaceImpl& access) {
  for (Policy::Rule& rule : domain.rules) NameOutside(rule);
  return PlanSources(access, Enforce::ProbeFeatures()).Explain(domain);
}

RuleFate NamedOutside(RuleFate fate) {
  NameOutside(fate.rule);
  return fate;
}

std::vector<std::string> LinesOf(Enforce::CompiledPlan compiled) {
  for (RuleFate& fate : compiled.fates) NameOutside(fate.rule);
  return CoverageOf(compiled);
}

Json FatesToJson(const std::vector<RuleFate>& fates) {
  Json list = Json::Array();
  for (const RuleFate& fate : fates) {
    Json json = {{"rule", fate.rule.Text()}};
    if (!fate.rule.origin.file.empty()) {
      json["file"] = fate.rule.origin.file;
      json["line"] = fate.rule.origin.line;
    }
    json["fate"] = TextOf(fate.fate);
    if (!fate.how.empty()) json["how"] = fate.how;
    list.Append(json);
  }
  return list;
}

}  // namespace SecPolicyCli
