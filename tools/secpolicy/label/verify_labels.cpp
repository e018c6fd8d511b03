#include <cerrno>

#include "braxo/misc/strcat.h"
#include "host/linux/operation/file_label.h"
#include "label_actions.h"
#include "label_plan.h"
#include "root.h"
#include "text/format.h"

namespace SecPolicyCli {

using Braxo::Misc::StrCat;

namespace {

Json DifferenceToJson(LabelRun& run, const LinuxHost::WalkedFile& file,
                      const std::optional<LinuxHost::FileLabel>& label, const LabelLine& line) {
  return {{"path", file.path},
          {"label", label ? Json(run.NameOf(label->id)) : Json()},
          {"inherited", label && label->isInherited},
          {"policy", line.label.label},
          {"file", line.label.policyFile},
          {"line", line.label.lineNumber}};
}

}  // namespace

std::string VerifyLabels(LabelRun& run, const std::string& dir,
                         const std::vector<std::string>& paths) {
  std::size_t files = 0;
  std::size_t different = 0;
  std::size_t withoutLabel = 0;
  LabelPlan(run, dir).ForEachFile(
      paths, "verifying", [&](const LinuxHost::WalkedFile& file, const LabelLine& line) {
        ++files;
        const auto label = LinuxHost::ReadLabel(file.name);
        if (label && label->id == line.id) return;
        if (!label && errno != ENODATA) return run.Error(file.path + ": " + WhyNoLabel(errno));
        ++different;
        if (!label) ++withoutLabel;
        if (run.isJson) return run.findings.Append(DifferenceToJson(run, file, label, line));
        run.Print(StrCat(file.path, ": has ", label ? run.NameOf(label->id) : "no label",
                         label && label->isInherited ? " (inherited)" : "", ", the policy says ",
                         line.label.label, " (", line.Place(), ")"));
      });
  run.PrintDocument({{"schema", "secpolicy.label-verify/1"}, {"files", files}}, "differences");
  if (different > 0) {
    throw Braxo::Lib::BraxoException(StrCat(
        different, " of ", CountOf(files, "file"), different == 1 ? " differs" : " differ",
        " from the policy. ",
        different == withoutLabel ? Call("boot") + " gives every file its first label"
                                  : Call("label relabel") + " gives the policy's labels again"));
  }
  if (files == 0) return "done (the policy names no file there)";
  return StrCat("done (", CountOf(files, "file"), ", all as the policy says)");
}

}  // namespace SecPolicyCli
