#include "secpolicy/labels/object_policy.h"

#include "braxo/misc/strcat.h"
#include "secpolicy/carry_on.h"
#include "secpolicy/report.h"

namespace SecPolicy {

void ObjectPolicy::ParsePolicy(const std::string& path) {
  PolicyObserver nobody;
  ParsePolicy(path, nobody);
}

void ObjectPolicy::ParsePolicy(const std::string& path, PolicyObserver& observer) {
  ReadLines(path, observer, [&](auto& tokens, Problem& problem) { ParseLine(tokens, problem); });
}

void ObjectPolicy::ParseLine(std::queue<std::string>& tokens, Problem& problem) {
  if (tokens.size() != 1) {
    problem.fault = Fault::kArgumentCount;
    problem.word = Problem::kWholeLine;
    problem.reason = "cannot define more than one object per line";
    RaiseError(Braxo::Misc::StrCat(problem.file, ":", problem.line, " : ", problem.reason));
  }
  names.push_back(std::move(tokens.front()));
}

void ObjectPolicy::SetObjects(TeskAccessInterfaceImpl& access) {
  const auto kernelObjects = access.GetKeywordsMap(TeskCtl::Security::TESKACCESS_KEYWORD_LABEL);
  SyncLabelsFromPolicy(names, kernelObjects, TeskCtl::Security::TESKACCESS_LABEL_OBJECT, access);
}

}  // namespace SecPolicy
