#include "label_plan.h"

#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <map>

#include "braxo/misc/strcat.h"

namespace SecPolicyCli {

using Braxo::Lib::BraxoException;
using Braxo::Misc::StrCat;

std::string LabelLine::Place() const { return StrCat(label.policyFile, ":", label.lineNumber); }

LabelPlan::LabelPlan(LabelRun& labelRun, const std::string& dir) : run(labelRun) {
  std::map<std::string, std::string> files;
  SecPolicy::GetFileList(dir, files);
  for (const auto& [path, name] : files) ReadFile(path);
}

// What was read before a bad line counts, as in a load.
void LabelPlan::ReadFile(const std::string& path) {
  SecPolicy::FileLabelPolicy policy;
  try {
    policy.ParsePolicy(path, run.access);
  } catch (const BraxoException& failure) {
    run.Error("Error parsing file " + path);
    run.Error(failure.what());
  }
  for (auto& label : policy.fileLabels) {
    LabelLine line{std::move(label), 0};
    line.id = run.FindLabel(line.label.label);
    if (line.id == kNoSuchLabel) {
      run.Error(StrCat(line.Place(), " : Invalid label (", line.label.label, ") for file ",
                       line.label.path));
      continue;
    }
    lines.push_back(std::move(line));
  }
}

// Takes the last line first: who comes to a file first decides.
void LabelPlan::ForEachFile(const std::vector<std::string>& paths, const std::string& job,
                            const OnPlannedFile& visit) {
  const FileIds chosen = FilesBelow(paths);
  FileIds decided;
  run.progress.Begin(job, run.progress.IsShown() ? CountVisits() : 0);
  for (auto next = lines.crbegin(); next != lines.crend(); ++next) {
    const LabelLine& line = *next;
    ForEachBelow(line.label.path, line.label.recursive, line.Place() + " : ",
                 [&](const LinuxHost::WalkedFile& file, const FileId& id) {
                   const bool isChosen = paths.empty() || chosen.contains(id);
                   if (isChosen && decided.insert(id).second) visit(file, line);
                   run.progress.Step();
                 });
  }
  run.progress.End();
}

// Errors are reported behind `place`.
void LabelPlan::ForEachBelow(const std::string& path, bool wholeTree, const std::string& place,
                             const OnIdentified& visit) {
  WalkLabelledFiles(
      path, wholeTree,
      [&](const LinuxHost::WalkedFile& file) {
        struct stat status {};
        if (lstat(file.name, &status) == 0) {
          visit(file, {status.st_dev, status.st_ino});
        } else if (errno != ENOENT) {  // what has gone meanwhile is nobody's concern
          run.Error(StrCat(place, file.path, ": ", std::strerror(errno)));
        }
      },
      [&](const std::string& failed, const std::string& why) {
        run.Error(StrCat(place, failed, ": ", why));
      });
}

LabelPlan::FileIds LabelPlan::FilesBelow(const std::vector<std::string>& paths) {
  FileIds files;
  for (const std::string& path : paths) {
    std::error_code ignored;
    ForEachBelow(path, std::filesystem::is_directory(path, ignored), "",
                 [&](const LinuxHost::WalkedFile&, const FileId& id) { files.insert(id); });
  }
  return files;
}

// A file that several lines name is visited as often.
std::size_t LabelPlan::CountVisits() {
  std::size_t count = 0;
  run.progress.Begin("counting", 0);
  for (const LabelLine& line : lines) {
    WalkLabelledFiles(
        line.label.path, line.label.recursive,
        [&](const LinuxHost::WalkedFile&) {
          ++count;
          run.progress.Step();
        },
        [](const std::string&, const std::string&) {});
  }
  return count;
}

}  // namespace SecPolicyCli
