#include "secpolicy/carry_on.h"
#include "secpolicy/labels/file_label_policy.h"
#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {
namespace {

constexpr char kFailure[] = "Failure in file labels policy";

bool ParseFiles(const std::string& dir, FileLabelPolicy& policy, TeskAccessInterfaceImpl& access) {
  std::map<std::string, std::string> files;
  GetFileList(dir, files);

  bool failed = false;
  for (const auto& [path, name] : files) {
    try {
      policy.ParsePolicy(path, access);
    } catch (const Braxo::Lib::BraxoException& failure) {
      SecpolicyError("Error parsing file " + path);
      SecpolicyError(failure.what());
      failed = true;
    }
  }
  if (failed) {
    SecpolicyError("Error in parsing some file label mappings.");
  } else {
    SecpolicyInfo("Parsed all file label mappings");
  }
  return !failed;
}

}  // namespace

void LoadPolicyFileLabels(const std::string& dir, TeskAccessInterfaceImpl& access) {
  FileLabelPolicy policy;
  const bool parsed = ParseFiles(dir, policy, access);
  // What was read before a bad line is applied too.
  if (!CarryOn([&] { policy.SetFileLabels(access); })) {
    SecpolicyError("Error in setting some file labels.");
    RaiseError(kFailure);
  }
  SecpolicyInfo("Set all file labels");
  if (!parsed) RaiseError(kFailure);
}

}  // namespace SecPolicy
