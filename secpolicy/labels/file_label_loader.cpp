#include "secpolicy/carry_on.h"
#include "secpolicy/labels/file_label_policy.h"
#include "secpolicy/observed/loading.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {
namespace {

constexpr char kFileLabelFailure[] = "Failure in file labels policy";

bool ParseFiles(const std::string& dir, FileLabelPolicy& policy, TeskAccessInterfaceImpl& access,
                PolicyObserver& observer) {
  std::map<std::string, std::string> files;
  TellFailure(dir, observer, [&] { GetFileList(dir, files); });

  bool failed = false;
  for (const auto& [path, name] : files) {
    try {
      policy.ParsePolicy(path, access, observer);
    } catch (const Braxo::Lib::BraxoException& failure) {
      ReportError("Error parsing file " + path, observer);
      ReportError(failure.what(), observer);
      failed = true;
    }
  }
  if (failed) {
    ReportError("Error in parsing some file label mappings.", observer);
  } else {
    SecpolicyInfo("Parsed all file label mappings");
  }
  return !failed;
}

}  // namespace

void LoadPolicyFileLabels(const std::string& dir, TeskAccessInterfaceImpl& access) {
  LoadPolicyFileLabels(dir, access, Nobody());
}

void LoadPolicyFileLabels(const std::string& dir, TeskAccessInterfaceImpl& access,
                          PolicyObserver& observer) {
  const PhaseOfLoad phase(LoadPhase::kFileLabels, observer);
  FileLabelPolicy policy;
  const bool parsed = ParseFiles(dir, policy, access, observer);
  // What was read before a bad line is applied too.
  if (!CarryOn(observer, [&] { policy.SetFileLabels(access, observer); })) {
    ReportError("Error in setting some file labels.", observer);
    RaiseError(kFileLabelFailure);
  }
  SecpolicyInfo("Set all file labels");
  if (!parsed) RaiseError(kFileLabelFailure);
}

}  // namespace SecPolicy
