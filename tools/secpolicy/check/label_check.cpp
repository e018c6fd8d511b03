#include <sys/stat.h>

#include <filesystem>
#include <optional>
#include <tuple>
#include <utility>

#include "check_run.h"
#include "host/linux/operation/noted_labels.h"
#include "root.h"
#include "rule_form.h"
#include "secpolicy/observed/policy_observer.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;
using SecPolicy::FileLabel;

struct LabelLine {
  const SourceFile* file;
  unsigned int line;
  FileLabel label;
};

std::string Describe(const LabelLine& line) {
  return "line " + std::to_string(line.line) + " of " + line.file->Path();
}

Hint HintFor(CheckRun& run, const SecPolicy::Problem& problem, const SourceFile::Words& words) {
  if (problem.fault == SecPolicy::Fault::kTreeMarker) {
    return "there are no patterns but /* at the end";
  }
  if (problem.fault == SecPolicy::Fault::kUnknownWord) return HintForLabel(run, words.at(1));
  return "write: PATH LABEL";
}

void ReadLabels(CheckRun& run, const SourceFile& file, std::vector<LabelLine>& labels) {
  for (const auto& [line, words] : file.Lines()) {
    SecPolicy::FileLabelPolicy policy;
    try {
      policy.ParseLine(file.Path(), line, file.TokensOf(line), run.access);
      labels.push_back({&file, line, std::move(policy.fileLabels.front())});
    } catch (const SecPolicy::LineFailure& failure) {
      AddRefusal(run, file, failure.problem, HintFor(run, failure.problem, words));
    }
  }
}

// A line is read when its label is any label; it can be applied only when it is an object's.
bool CheckLabel(CheckRun& run, const LabelLine& line) {
  const auto& [path, label, recursive, policyFile, lineNumber] = line.label;
  run.usedLabels.insert(label);
  if (IsObjectLabel(run, label)) return true;
  run.diagnostics.Add(line.file->AtWord(Codes::kUnknownWord, line.line, 1,
                                        "Invalid label (" + label + ") for file " + path,
                                        HintForLabel(run, label)));
  return false;
}

// What is odd about the path of a line.
struct PathProblem {
  const Code* code = nullptr;  // null: nothing
  std::string message;
};

PathProblem FindPathProblem(const FileLabel& label) {
  const std::string& path = label.path;
  std::error_code ignored;
  if (label.recursive && path.empty()) {
    return {&Codes::kStarInPath, "there is no directory before the /*"};
  }
  if (path.find('*') != std::string::npos) {
    return {&Codes::kStarInPath, "there are no patterns: this is a file whose name has a star"};
  }
  if (IsMissing(path)) {
    return {&Codes::kMissingPath, "there is nothing at " + path + " under this root"};
  }
  if (label.recursive && !std::filesystem::is_directory(path, ignored)) {
    return {&Codes::kStarInPath, "/* stands behind something that is no directory"};
  }
  return {};
}

// Why a load cannot give the label; empty when it can.
std::string DryRun(CheckRun& run, const FileLabel& label) {
  try {
    if (label.recursive) {
      SecPolicy::SetDirLabelRecursive(label.path, label.label, run.access);
    } else {
      SecPolicy::SetFileLabel(label.path, label.label, run.access);
    }
    return "";
  } catch (const BraxoException& failure) {
    return failure.what();
  }
}

void CheckPath(CheckRun& run, const LabelLine& line, bool isDryRun) {
  CheckIsAbsolute(run, *line.file, line.line, 0);
  const PathProblem problem = FindPathProblem(line.label);
  const std::string failure = isDryRun ? DryRun(run, line.label) : "";
  if (!failure.empty()) {
    run.diagnostics.Add(
        line.file->AtWord(Codes::kCannotLabel, line.line, 0, failure, problem.message));
  } else if (problem.code != nullptr) {
    run.diagnostics.Add(line.file->AtWord(*problem.code, line.line, 0, problem.message));
  }
}

// Finds lines that give one file two labels: by path, by another name of the file, and by a tree
// that comes later.
class LabelMap {
 public:
  LabelMap(CheckRun& checkRun, const std::vector<LabelLine>& labelLines)
      : run(checkRun), labels(labelLines) {}

  void Check() {
    for (const LabelLine& line : labels) CheckOne(line);
    for (const LabelLine& line : labels) CheckTrees(line);
  }

 private:
  using Inode = std::tuple<dev_t, ino_t, bool>;

  void CheckOne(const LabelLine& line) {
    const bool recursive = line.label.recursive;
    if (recursive) trees[line.label.path] = &line;
    const LabelLine*& samePath = paths[{line.label.path, recursive}];
    const LabelLine* earlier = samePath;
    samePath = &line;
    struct stat attributes {};
    if (stat(line.label.path.c_str(), &attributes) == 0) {
      const LabelLine*& sameFile = inodes[{attributes.st_dev, attributes.st_ino, recursive}];
      if (earlier == nullptr) earlier = sameFile;
      sameFile = &line;
    }
    if (earlier == nullptr || earlier->label.label == line.label.label) return;
    const bool otherName = earlier->label.path != line.label.path;
    run.diagnostics.Add(line.file->AtWord(
        Codes::kTwoLabels, line.line, 1,
        "this label replaces '" + earlier->label.label + "' of " + Describe(*earlier) +
            (otherName ? ": " + earlier->label.path + " is the same file" : "")));
  }

  void CheckTrees(const LabelLine& line) {
    std::string above = line.label.path;
    while (true) {
      const auto tree = trees.find(above);
      // Lines lie in order in one vector.
      if (tree != trees.end() && tree->second > &line && !IsSamePattern(*tree->second, line) &&
          tree->second->label.label != line.label.label) {
        run.diagnostics.Add(
            line.file->AtWord(Codes::kTwoLabels, line.line, 1,
                              "this label does not stay: " + Describe(*tree->second) +
                                  " gives the whole tree '" + tree->second->label.label + "'",
                              "put the line with the /* first"));
        return;
      }
      const std::size_t slash = above.rfind('/');
      if (slash == std::string::npos || above.empty()) return;
      above.resize(slash);
    }
  }

  static bool IsSamePattern(const LabelLine& one, const LabelLine& other) {
    return one.label.recursive == other.label.recursive && one.label.path == other.label.path;
  }

  CheckRun& run;
  const std::vector<LabelLine>& labels;
  std::map<std::string, const LabelLine*> trees;
  std::map<std::pair<std::string, bool>, const LabelLine*> paths;
  std::map<Inode, const LabelLine*> inodes;
};

// What a boot will unpack and label is not there yet, and who may not load may not see everything.
bool CanDryRun(const CheckRun& run) { return run.scratch.IsCopy() && AdviseOnPrivilege().empty(); }

}  // namespace

void CheckFileLabels(CheckRun& run, const std::string& dir) {
  std::vector<LabelLine> labels;
  for (const NamedFile& named : OpenPolicyFiles(run, dir)) ReadLabels(run, *named.file, labels);
  std::optional<LinuxHost::NotedLabels> notes;
  if (CanDryRun(run)) {
    notes.emplace(LinuxHost::LabelNotes::kDryRun, run.scratch.DirectoryPath());
  }
  for (const LabelLine& line : labels) {
    const bool isLabel = CheckLabel(run, line);
    CheckPath(run, line, notes && isLabel);
  }
  LabelMap(run, labels).Check();
}

}  // namespace SecPolicyCli
