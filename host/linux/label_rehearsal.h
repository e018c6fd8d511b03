#pragma once

#include <sys/types.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

// What giving labels would do, without doing it.
namespace LinuxHost {

// A file that would be labelled.
struct LabelChange {
  std::string path;          // the one by which the file was reached first
  std::uint32_t before = 0;  // 0: what the file carries is no identifier
  std::uint32_t after = 0;

  // False when the file would have its old label again in the end, whatever it had on the way.
  bool IsLasting() const { return before != after; }
};

// From now on this process only notes the labels that it gives to files, and reads them back as if
// they had been given; the files stay as they are. A label that a file could not be given fails as
// it would. What is no identifier is no label (EINVAL).
// The directory `passedOver`, and the files right in it, are of the rehearsal: they can be given
// any label, and none is noted.
void StartLabelRehearsal(const std::string& passedOver = "");

// The files that would have been labelled by now, in ascending order of their paths.
std::vector<LabelChange> RehearsedLabels();

// For the attribute itself: whether labels are only noted, and what then stands in for setxattr(2)
// and getxattr(2) with the attribute `name`.
bool IsRehearsing();
int RehearseSetting(const char* path, const char* name, const void* value, std::size_t size,
                    int flags);
ssize_t ReadRehearsed(const char* path, const char* name, void* value, std::size_t size);

}  // namespace LinuxHost
