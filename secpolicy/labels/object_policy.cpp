#include "secpolicy/labels/object_policy.h"

#include "braxo/misc/strcat.h"
#include "secpolicy/report.h"

namespace SecPolicy {

void ObjectPolicy::ParsePolicy(const std::string& path) {
  std::map<unsigned int, std::queue<std::string>> parsed;
  ParseFile(path, parsed);
  for (auto& [line, tokens] : parsed) {
    if (tokens.size() != 1) {
      RaiseError(
          Braxo::Misc::StrCat(path, ":", line, " : cannot define more than one object per line"));
    }
    names.push_back(std::move(tokens.front()));
  }
}

void ObjectPolicy::SetObjects(TeskAccessInterfaceImpl& access) {
  const auto kernelObjects = access.GetKeywordsMap(TeskCtl::Security::TESKACCESS_KEYWORD_LABEL);
  SyncLabelsFromPolicy(names, kernelObjects, TeskCtl::Security::TESKACCESS_LABEL_OBJECT, access);
}

}  // namespace SecPolicy
