#pragma once

#include <sys/types.h>

#include <cstdint>
#include <deque>
#include <functional>
#include <string>
#include <unordered_set>
#include <utility>
#include <vector>

#include "label_run.h"
#include "labelled_files.h"
#include "secpolicy/observed/policy_observer.h"

namespace SecPolicyCli {

// A line of the file label policy, as the library read it.
struct LabelLine {
  SecPolicy::FileLabel label;
  std::uint32_t id = 0;

  // "FILE:LINE".
  std::string Place() const;
};

// The label that each file has after a load: where several lines name one file, by whatever path,
// the last one decides. What a load reports as an error is reported to `labelRun`.
class LabelPlan {
 public:
  // Reads the policy files in the directory `dir`. Throws BraxoException when it cannot be read.
  LabelPlan(LabelRun& labelRun, const std::string& dir);

  // Hands every file that the policy names to `visit`, once, with the line that decides, and shows
  // the progress of `job`: all files or, unless `paths` is empty, those at or below one of them.
  using OnPlannedFile =
      std::function<void(const LinuxHost::WalkedFile& file, const LabelLine& line)>;
  void ForEachFile(const std::vector<std::string>& paths, const std::string& job,
                   const OnPlannedFile& visit);

 private:
  // A file has one label, whatever its names.
  using FileId = std::pair<dev_t, ino_t>;
  struct HashFileId {
    std::size_t operator()(const FileId& file) const { return file.first * 31 + file.second; }
  };
  using FileIds = std::unordered_set<FileId, HashFileId>;
  using OnIdentified = std::function<void(const LinuxHost::WalkedFile& file, const FileId& id)>;

  void ReadFile(const std::string& path);
  void ForEachBelow(const std::string& path, bool wholeTree, const std::string& place,
                    const OnIdentified& visit);
  FileIds FilesBelow(const std::vector<std::string>& paths);
  std::size_t CountVisits();

  LabelRun& run;
  std::deque<LabelLine> lines;
};

}  // namespace SecPolicyCli
