#include "braxo/misc/strcat.h"
#include "secpolicy/carry_on.h"
#include "secpolicy/labels/object_policy.h"
#include "secpolicy/observed/loading.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {
namespace {

constexpr char kObjectFailure[] = "Failure in object policy";

bool ParseFiles(const std::string& dir, ObjectPolicy& policy, PolicyObserver& observer) {
  std::map<std::string, std::string> files;
  TellFailure(dir, observer, [&] { GetFileList(dir, files); });

  const bool parsed = ForEachCarryOn(
      files, observer, [&](const auto& file) { policy.ParsePolicy(file.first, observer); });
  if (parsed) {
    SecpolicyInfo("Parsed all objects");
  } else {
    ReportError("Error in parsing some object files", observer);
  }
  return parsed;
}

}  // namespace

void LoadPolicyObjects(const std::string& dir, TeskAccessInterfaceImpl& access) {
  LoadPolicyObjects(dir, access, Nobody());
}

void LoadPolicyObjects(const std::string& dir, TeskAccessInterfaceImpl& access,
                       PolicyObserver& observer) {
  const PhaseOfLoad phase(LoadPhase::kObjects, observer);
  ObjectPolicy policy;
  const bool parsed = ParseFiles(dir, policy, observer);
  // The kernel follows what was read, also where that is only a part: objects that only the broken
  // part of a file defines are removed.
  try {
    TellFailure(dir, observer, [&] { policy.SetObjects(access); });
  } catch (const Braxo::Lib::BraxoException&) {
    ReportError("Error in defining some objects", observer);
    RaiseError(kObjectFailure);
  }
  SecpolicyInfo("Objects defined and obsolete objects removed");
  if (!parsed) RaiseError(kObjectFailure);
}

void DisplayPolicyObjects(TeskAccessInterfaceImpl& access) {
  DisplayHeader("Objects Defined: Name (Kernel Id)", "");
  const auto objects = access.GetKeywordsMap(TeskCtl::Security::TESKACCESS_KEYWORD_LABEL);
  for (const auto& [name, id] : objects) PrintLine(Braxo::Misc::StrCat(name, " (", id, ")"));
}

}  // namespace SecPolicy
