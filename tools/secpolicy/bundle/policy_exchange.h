#pragma once

#include <string>
#include <vector>

#include "bundle/archive.h"
#include "host/linux/common/descriptor.h"

namespace SecPolicyCli {

// What the host's policy was before the latest bundle.
inline constexpr char kPreviousPolicy[] = "/etc/zorvan/secpolicy.previous";

// Makes the directory `dir` with these files in it, which everybody may read and only this user may
// write. They are on the disk when it returns. Throws BraxoException, and leaves what it has made.
void WritePolicyTree(const std::string& dir, const std::vector<ArchiveEntry>& files);

// Puts files in place of the host's policy directory, in one step, and can take that back. What
// was there is kept as kPreviousPolicy; what was kept there before goes when it is done.
//
// Whenever the process is killed, the policy directory is a whole one, the new or the old. The next
// exchange clears up beside it.
class PolicyExchange {
 public:
  // Removes what a killed one has left, and puts back what it has moved. Throws Refusal while
  // another process exchanges, and BraxoException.
  PolicyExchange();
  PolicyExchange(const PolicyExchange&) = delete;
  PolicyExchange& operator=(const PolicyExchange&) = delete;
  ~PolicyExchange() = default;

  // Throws BraxoException.
  void PutInPlace(const std::vector<ArchiveEntry>& files);

  // All is as before. Throws BraxoException.
  void PutBack();

  // Whether the files are the host's policy now.
  bool IsInPlace() const { return stage == Stage::kInPlace; }

  // There is no way back any more.
  void Finish();

 private:
  enum class Stage { kNothing, kPrepared, kInPlace };

  LinuxHost::Descriptor lock;
  Stage stage = Stage::kNothing;
  bool hadPolicy = false;
  bool hadPrevious = false;
};

}  // namespace SecPolicyCli
