#include "secpolicy/labels/object_policy.h"

#include "braxo/misc/strcat.h"
#include "secpolicy/carry_on.h"
#include "secpolicy/observed/policy_observer.h"

namespace SecPolicy {

void ObjectPolicy::ParsePolicy(const std::string& path, PolicyObserver& observer) {
  ReadLines(path, observer, [&](unsigned int line, std::queue<std::string>& tokens) {
    ParseLine(path, line, tokens);
  });
}

void ObjectPolicy::ParseLine(const std::string& path, unsigned int line,
                             std::queue<std::string>& tokens) {
  if (tokens.size() != 1) {
    const std::string reason = "cannot define more than one object per line";
    throw LineFailure(Braxo::Misc::StrCat(path, ":", line, " : ", reason),
                      {.line = line, .fault = Fault::kArgumentCount, .reason = reason});
  }
  names.push_back(std::move(tokens.front()));
}

void ObjectPolicy::SetObjects(TeskAccessInterfaceImpl& access) {
  const auto kernelObjects = access.GetKeywordsMap(TeskCtl::Security::TESKACCESS_KEYWORD_LABEL);
  SyncLabelsFromPolicy(names, kernelObjects, TeskCtl::Security::TESKACCESS_LABEL_OBJECT, access);
}

}  // namespace SecPolicy
