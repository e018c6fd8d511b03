#include <cerrno>
#include <cstring>
#include <map>

#include "braxo/misc/strcat.h"
#include "enforce/published.h"
#include "host/linux/operation/file_label.h"
#include "host/linux/operation/label_index.h"
#include "label_actions.h"
#include "label_plan.h"
#include "text/format.h"

namespace SecPolicyCli {
namespace {

using Braxo::Misc::StrCat;

struct Count {
  std::size_t files = 0;
  std::size_t changed = 0;
};

class Relabelling {
 public:
  Relabelling(LabelRun& labelRun, bool onlyTry) : run(labelRun), dryRun(onlyTry) {}

  void Visit(const LinuxHost::WalkedFile& file, const LabelLine& line) {
    Count& count = counts[line.label.label];
    ++count.files;
    // Reading is much cheaper than writing, and most files have their label already.
    const auto before = LinuxHost::ReadLabel(file.name);
    if (before && before->id == line.id) return;
    if (!before) return run.Error(file.path + ": " + WhyNoLabel(errno));
    if (dryRun && run.isJson) {
      run.findings.Append({{"path", file.path},
                           {"before", run.NameOf(before->id)},
                           {"inherited", before->isInherited},
                           {"after", line.label.label},
                           {"file", line.label.policyFile},
                           {"line", line.label.lineNumber}});
    } else if (dryRun) {
      run.Print(StrCat(file.path, ": ", run.NameOf(before->id),
                       before->isInherited ? " (inherited)" : "", " -> ", line.label.label, " (",
                       line.Place(), ")"));
    } else if (LinuxHost::ReplaceLabel(file.name, line.id) != 0) {
      return run.Error(StrCat(file.path, ": cannot be given the label ", line.label.label, ": ",
                              std::strerror(errno)));
    }
    ++count.changed;
  }

  std::string Summarize() {
    const std::string verb = dryRun ? "would be relabelled" : "relabelled";
    Count all;
    Json labels = Json::Array();
    for (const auto& [label, count] : counts) {
      const std::string line =
          StrCat(label, ": ", count.changed, " of ", CountOf(count.files, "file"), " ", verb);
      if (!run.isJson) run.Print(line);
      labels.Append({{"label", label}, {"files", count.files}, {"changed", count.changed}});
      all.files += count.files;
      all.changed += count.changed;
    }
    run.PrintDocument(
        {{"schema", "secpolicy.label-relabel/1"}, {"dryRun", dryRun}, {"labels", labels}},
        "changes");
    return StrCat("done (", all.changed, " of ", CountOf(all.files, "file"), " ", verb, ")");
  }

 private:
  LabelRun& run;
  const bool dryRun;
  std::map<std::string, Count> counts;
};

}  // namespace

std::string Relabel(LabelRun& run, const std::string& dir, const std::vector<std::string>& paths,
                    bool dryRun) {
  Relabelling relabelling(run, dryRun);
  LabelPlan(run, dir).ForEachFile(paths, dryRun ? "comparing" : "relabelling",
                                  [&](const LinuxHost::WalkedFile& file, const LabelLine& line) {
                                    relabelling.Visit(file, line);
                                  });
  if (!dryRun) {
    LinuxHost::RefreshLabelIndex();
    PublishPlansOrTell("label relabel");
  }
  return relabelling.Summarize();
}

}  // namespace SecPolicyCli
