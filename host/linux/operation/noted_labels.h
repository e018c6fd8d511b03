#pragma once

#include <sys/types.h>

#include <cstddef>
#include <cstdint>
#include <deque>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

#include "host/linux/files/directory_entry.h"
#include "host/linux/files/security_attribute.h"

namespace LinuxHost {

// A file that would be labelled.
struct LabelChange {
  std::string path;  // the one by which the file was reached first, without a link at its end
  std::uint32_t before = 0;  // 0: what the file has is no identifier
  std::uint32_t after = 0;

  // False when the file would have its old label again in the end, whatever it had on the way.
  bool IsLasting() const { return before != after; }
};

// A file that could not be given its label, and why.
struct LabelFailure {
  std::string path;
  int error = 0;
};

enum class LabelNotes {
  kDryRun,    // to be looked at; not even the attempt to write shows on a file
  kForLater,  // to be given
};

// As long as this object lives, the labels that this process gives to files are only noted, and
// read back as if they had been given; the files stay as they are. A label that a file could not be
// given is refused as it would be. What is no identifier is no label, and labels are only replaced
// (EINVAL). One at a time.
class NotedLabels : public AttributeStandIn {
 public:
  // The directory `passedOver`, and the files right in it, are of who takes the notes: they can be
  // given any label, and none is noted.
  explicit NotedLabels(LabelNotes purpose, const std::string& passedOver = "");

  bool IsEmpty() const { return notes.empty(); }

  // The files that would have been labelled by now, in ascending order of their paths.
  std::vector<LabelChange> Changes() const;

  // Gives the files their labels, in the order in which that was asked for; of several for an entry
  // of a directory only the last one, and that only where the file does not carry it. Returns those
  // that could not be given theirs: one that has gone meanwhile, or was replaced by a link, is
  // among them, as are all in a directory that was replaced, but not what has gone of the host's
  // own files beside the state. Changes the working directory while it runs.
  std::vector<LabelFailure> Apply() const;

  // Hands these labels to `visit`, in that order, with the directory of the file as the working
  // directory. Returns the files that cannot be reached any more.
  using OnNote =
      std::function<void(const DirectoryPlace& directory, const char* name, std::uint32_t id)>;
  std::vector<LabelFailure> ForEach(const OnNote& visit) const;

  int Set(const char* path, const char* name, const void* value, std::size_t size,
          int flags) override;
  ssize_t Get(const char* path, const char* name, void* value, std::size_t size) override;

 private:
  // Its name stands in `names`, behind the one of the note before.
  struct Note {
    std::uint32_t directory;
    std::uint32_t id;
  };

  struct Directory {
    DirectoryPlace place;
    bool isPassedOver;
    bool holdsPassedOver;
    bool leavesNoTrace;
  };

  // A file has one label, whatever its names.
  using FileId = std::pair<dev_t, ino_t>;

  const std::uint32_t* FindDirectory(const std::string& path);
  bool IsPassedOver(const Directory& directory, const std::string& name) const;
  void IndexNotes();
  std::vector<bool> FindFinal() const;

  const LabelNotes purpose;
  DirectoryPlace passedOver;
  DirectoryPlace aboveIt;
  std::string passedOverName;

  std::deque<Directory> directories;
  std::unordered_map<std::string, std::uint32_t> directoryNumbers;
  std::deque<Note> notes;
  std::string names;

  // What was read back needs the labels by file; made when it is asked for.
  std::map<FileId, std::uint32_t> labels;
  std::size_t indexedNotes = 0;
  std::size_t indexedNames = 0;
};

}  // namespace LinuxHost
