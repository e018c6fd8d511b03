#include "braxo/misc/strcat.h"
#include "secpolicy/carry_on.h"
#include "secpolicy/labels/object_policy.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {
namespace {

constexpr char kFailure[] = "Failure in object policy";

bool ParseFiles(const std::string& dir, ObjectPolicy& policy) {
  std::map<std::string, std::string> files;
  GetFileList(dir, files);

  const bool parsed =
      ForEachCarryOn(files, [&](const auto& file) { policy.ParsePolicy(file.first); });
  if (parsed) {
    SecpolicyInfo("Parsed all objects");
  } else {
    SecpolicyError("Error in parsing some object files");
  }
  return parsed;
}

}  // namespace

void LoadPolicyObjects(const std::string& dir, TeskAccessInterfaceImpl& access) {
  ObjectPolicy policy;
  const bool parsed = ParseFiles(dir, policy);
  // The kernel follows what was read, also where that is only a part: objects that only the broken
  // part of a file defines are removed.
  try {
    policy.SetObjects(access);
  } catch (const Braxo::Lib::BraxoException&) {
    SecpolicyError("Error in defining some objects");
    RaiseError(kFailure);
  }
  SecpolicyInfo("Objects defined and obsolete objects removed");
  if (!parsed) RaiseError(kFailure);
}

void DisplayPolicyObjects(TeskAccessInterfaceImpl& access) {
  DisplayHeader("Objects Defined: Name (Kernel Id)", "");
  const auto objects = access.GetKeywordsMap(TeskCtl::Security::TESKACCESS_KEYWORD_LABEL);
  for (const auto& [name, id] : objects) PrintLine(Braxo::Misc::StrCat(name, " (", id, ")"));
}

}  // namespace SecPolicy
