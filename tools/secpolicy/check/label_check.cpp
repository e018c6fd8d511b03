#include <sys/stat.h>

#include <filesystem>
#include <tuple>

#include "check_run.h"
#include "rule_form.h"
#include "secpolicy/labels/file_label_policy.h"

namespace SecPolicyCli {
namespace {

using SecPolicy::FileLabelPolicy;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;

constexpr std::uint32_t kNoSuchLabel = 1;

struct LabelLine {
  const SourceFile* file;
  unsigned int line;
  FileLabelPolicy::FileLabel label;
};

std::string Describe(const LabelLine& line) {
  return "line " + std::to_string(line.line) + " of " + line.file->Path();
}

void ReadLabels(CheckRun& run, const SourceFile& file, std::vector<LabelLine>& labels) {
  FileLabelPolicy policy;
  const std::vector<unsigned int> lines = ParseEveryLine(
      file, run.scratch.ScratchFile(),
      [&](const std::string& path) { policy.ParsePolicy(path, run.access); },
      [&] { return policy.fileLabels.size(); },
      [&](unsigned int line, const std::string& message) {
        const SourceFile::Words& words = file.Lines().at(line);
        const Code& code = CodeOfRefusal(message);
        const std::size_t word = FindBlamedWord(code, message, words);
        const bool wholeLine = word == words.size();
        std::string hint = "write: PATH LABEL";
        if (&code == &Codes::kTreeMarker) hint = "there are no patterns but /* at the end";
        if (!wholeLine && &code == &Codes::kUnknownWord) hint = HintForLabel(run, words[word]);
        run.diagnostics.Add(file.AtWords(code, line, wholeLine ? 0 : word,
                                         wholeLine ? words.size() - 1 : word, message, hint));
      });
  for (std::size_t i = 0; i < lines.size(); ++i) {
    labels.push_back({&file, lines[i], policy.fileLabels[i]});
  }
}

// A line is read when its label is any label; it can be applied only when it is an object's.
void CheckLabel(CheckRun& run, const LabelLine& line) {
  const auto& [path, label, recursive, policyFile, lineNumber] = line.label;
  run.usedLabels.insert(label);
  if (run.access.LookupLabel(label, TESKACCESS_LABEL_OBJECT) != kNoSuchLabel) return;
  run.diagnostics.Add(line.file->AtWord(Codes::kUnknownWord, line.line, 1,
                                        "Invalid label (" + label + ") for file " + path,
                                        HintForLabel(run, label)));
}

void CheckPath(CheckRun& run, const LabelLine& line) {
  const auto add = [&](const Code& code, const std::string& message) {
    run.diagnostics.Add(line.file->AtWord(code, line.line, 0, message));
  };
  const std::string& path = line.label.path;
  std::error_code ignored;
  if (line.label.recursive && path.empty()) {
    add(Codes::kStarInPath, "there is no directory before the /*");
  } else if (path.find('*') != std::string::npos) {
    add(Codes::kStarInPath, "there are no patterns: this is a file whose name has a star");
  } else if (IsMissing(path)) {
    add(Codes::kMissingPath, "there is nothing at " + path + " under this root");
  } else if (line.label.recursive && !std::filesystem::is_directory(path, ignored)) {
    add(Codes::kStarInPath, "/* stands behind something that is no directory");
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

}  // namespace

void CheckFileLabels(CheckRun& run, const std::string& dir) {
  std::vector<LabelLine> labels;
  for (const NamedFile& named : OpenPolicyFiles(run, dir)) ReadLabels(run, *named.file, labels);
  for (const LabelLine& line : labels) {
    CheckLabel(run, line);
    CheckPath(run, line);
  }
  LabelMap(run, labels).Check();
}

}  // namespace SecPolicyCli
