#include "domain_plan.h"

#include <map>
#include <vector>

#include "host/enforce/label_index.h"
#include "host/enforce/real_file_tree.h"
#include "host/linux/operation/label_index.h"
#include "installed/installed_policy.h"
#include "query/question.h"

namespace SecPolicyCli {
namespace {

using Enforce::LabelIndex;
using Enforce::LabelledPath;
using Enforce::RuleFate;

using NamesById = std::map<std::uint32_t, std::string>;

NamesById LabelNames(SecPolicy::TeskAccessInterfaceImpl& access) {
  NamesById names;
  for (const auto& [name, id] :
       access.GetKeywordsMap(TeskCtl::Security::TESKACCESS_KEYWORD_LABEL)) {
    names.emplace(static_cast<std::uint32_t>(id), name);
  }
  return names;
}

// A number that no label has any more is as good as none known.
std::string_view NameOf(std::uint32_t label, const NamesById& names) {
  if (label == Enforce::kUnlabelled) return "";
  const auto name = names.find(label);
  return name == names.end() ? Enforce::kUnknownLabel : std::string_view(name->second);
}

std::vector<LabelledPath> PlacesOf(const LabelIndex& index, const NamesById& names) {
  std::vector<LabelledPath> places;
  places.reserve(index.Size());
  for (const Enforce::LabelledPlace& place : index) {
    places.push_back({place.path, NameOf(place.label, names)});
  }
  return places;
}

// What a plan is made from, of an installed domain.
struct Sources {
  Policy::InstalledDomain domain;
  LabelIndex index;
  NamesById names;
};

Sources ReadSources(const std::string& name, SecPolicy::TeskAccessInterfaceImpl& access) {
  auto domain = ReadInstalledDomain(name, access);
  if (!domain) RefuseDomain(name, access);
  LinuxHost::RefreshLabelIndex();
  return {.domain = std::move(*domain),
          .index = LinuxHost::ReadLabelIndex(),
          .names = LabelNames(access)};
}

// Calls `use` with the domain and all else that its plan depends on.
template <class Use>
auto WithSources(const std::string& name, SecPolicy::TeskAccessInterfaceImpl& access, Use use) {
  const Sources sources = ReadSources(name, access);
  const std::vector<LabelledPath> places = PlacesOf(sources.index, sources.names);
  const Enforce::Features features = Enforce::ProbeFeatures();
  Enforce::RealFileTree files;
  const Enforce::Surroundings surroundings{.features = features, .places = places, .files = files};
  return use(sources.domain, surroundings);
}

}  // namespace

Enforce::CompiledPlan PlanOf(const std::string& domain,
                             SecPolicy::TeskAccessInterfaceImpl& access) {
  return WithSources(domain, access, Enforce::Compile);
}

std::string ExplanationOf(const std::string& domain, SecPolicy::TeskAccessInterfaceImpl& access) {
  return WithSources(domain, access, Enforce::Explain);
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
