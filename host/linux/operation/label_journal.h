#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "host/linux/common/descriptor.h"
#include "host/linux/operation/noted_labels.h"

namespace LinuxHost {

// What was done to put labels back.
struct LabelsPutBack {
  std::size_t count = 0;  // of files that had another label, or one of their own
  std::vector<LabelFailure> failures;
};

// What files carry before they are given labels, written down beside the state. As volatile as the
// state: it survives its process, not the power of the machine.
class LabelJournal {
 public:
  // Takes the journal beside the state at `statePath`, and first puts back what a process that died
  // has left in it. Throws HostError when another process has it (EWOULDBLOCK), and when the file
  // cannot be made or is not only this user's.
  explicit LabelJournal(const std::string& statePath);
  LabelJournal(LabelJournal&& other) noexcept;
  LabelJournal(const LabelJournal&) = delete;
  LabelJournal& operator=(const LabelJournal&) = delete;
  // Removes it: what was done stays done.
  ~LabelJournal();

  // Writes down what the files carry that `labels` is to be given to, which is to be done before
  // they are. Throws HostError when it cannot be written. Changes the working directory while it
  // runs, as PutBack() does.
  void Keep(const NotedLabels& labels);

  // Gives the files what they carried, as far as that was written down. In what was replaced by a
  // link, and in directories that were replaced, nothing is changed; such files are failures.
  LabelsPutBack PutBack() const;

  // Puts back what a process that died has left beside the state at `statePath`, and removes it.
  // Nothing when there is none, or its process lives. Throws as the constructor.
  static std::optional<LabelsPutBack> PutBackLeftOver(const std::string& statePath);

  // Whether one lies beside the state at `statePath`, of a process that lives or has died.
  static bool IsThere(const std::string& statePath);

  // Removes what a process that died has left, and puts nothing back: the state that its labels are
  // of has gone, and all files are about to be labelled anew.
  static void DiscardLeftOver(const std::string& statePath);

 private:
  LabelJournal(std::string journalPath, Descriptor opened)
      : path(std::move(journalPath)), file(std::move(opened)) {}

  static std::optional<LabelJournal> TakeIfThere(const std::string& path);
  bool IsStillThere() const;
  void Write(const std::string& text) const;

  std::string path;
  Descriptor file;
};

}  // namespace LinuxHost
