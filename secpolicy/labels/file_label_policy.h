#pragma once

#include <deque>
#include <string>

#include "secpolicy/secpolicy.h"

namespace SecPolicy {

// The file labels of one load, in the order in which they were read.
class FileLabelPolicy {
 public:
  struct FileLabel {
    std::string path;
    std::string label;
    bool recursive = false;
    std::string policyFile;
    unsigned int lineNumber = 0;
  };

  // Appends the labels of the policy file `file`. Throws BraxoException at the first bad line;
  // the labels before it are kept.
  void ParsePolicy(const std::string& file, TeskAccessInterfaceImpl& access);

  // Applies and drops all labels, in order. One that fails is reported; throws BraxoException at
  // the end when one did.
  void SetFileLabels(TeskAccessInterfaceImpl& access);

  std::deque<FileLabel> fileLabels;
};

}  // namespace SecPolicy
