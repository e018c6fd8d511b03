#include <cerrno>
#include <cstring>
#include <filesystem>

#include "host/linux/operation/file_label.h"
#include "label_actions.h"
#include "labelled_files.h"

namespace SecPolicyCli {
namespace {

void ShowLabel(LabelRun& run, const LinuxHost::WalkedFile& file) {
  const auto label = LinuxHost::ReadLabel(file.name);
  if (!label) return run.Error(file.path + ": " + WhyNoLabel(errno));
  const std::string inherited = label->isInherited ? " (inherited)" : "";
  try {
    const std::string name =
        run.access.GetLabel(label->id, TeskCtl::Security::TESKACCESS_LABEL_OBJECT);
    if (!run.isJson) return run.Print(file.path + ": " + name + inherited);
    run.findings.Append({{"path", file.path}, {"label", name}, {"inherited", label->isInherited}});
  } catch (const Braxo::Lib::BraxoException&) {
    run.Error(file.path + ": has " + run.NameOf(label->id) + inherited);
  }
}

}  // namespace

std::string ShowLabels(LabelRun& run, const std::vector<std::string>& paths, bool wholeTrees) {
  for (const std::string& path : paths) {
    std::error_code ignored;
    WalkLabelledFiles(
        path, wholeTrees && std::filesystem::is_directory(path, ignored),
        [&](const LinuxHost::WalkedFile& file) { ShowLabel(run, file); },
        [&](const std::string& failed, const std::string& why) { run.Error(failed + ": " + why); });
  }
  run.PrintDocument({{"schema", "secpolicy.labels/1"}}, "files");
  return "done";
}

}  // namespace SecPolicyCli
