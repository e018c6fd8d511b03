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

LabelTally CompareLabels(LabelRun& run, const std::string& dir,
                         const std::vector<std::string>& paths) {
  LabelTally tally;
  LabelPlan(run, dir).ForEachFile(
      paths, "verifying", [&](const LinuxHost::WalkedFile& file, const LabelLine& line) {
        ++tally.files;
        const auto label = LinuxHost::ReadLabel(file.name);
        if (label && label->id == line.id) return;
        if (!label && errno != ENODATA) return run.Error(file.path + ": " + WhyNoLabel(errno));
        ++tally.different;
        if (!label) ++tally.withoutLabel;
        if (run.isJson) return run.findings.Append(DifferenceToJson(run, file, label, line));
        run.Print(StrCat(file.path, ": has ", label ? run.NameOf(label->id) : "no label",
                         label && label->isInherited ? " (inherited)" : "", ", the policy says ",
                         line.label.label, " (", line.Place(), ")"));
      });
  return tally;
}

std::string VerifyLabels(LabelRun& run, const std::string& dir,
                         const std::vector<std::string>& paths) {
  const LabelTally tally = CompareLabels(run, dir, paths);
  run.PrintDocument({{"schema", "secpolicy.label-verify/1"}, {"files", tally.files}},
                    "differences");
  if (tally.different > 0) {
    throw Braxo::Lib::BraxoException(
        StrCat(tally.different, " of ", CountOf(tally.files, "file"),
               tally.different == 1 ? " differs" : " differ", " from the policy. ",
               tally.different == tally.withoutLabel
                   ? Call("boot") + " gives every file of the root's file system its first label"
                   : Call("label relabel") + " gives the policy's labels again"));
  }
  if (tally.files == 0) return "done (the policy names no file there)";
  return StrCat("done (", CountOf(tally.files, "file"), ", all as the policy says)");
}

}  // namespace SecPolicyCli
