#pragma once

#include <deque>
#include <queue>
#include <string>

#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {

// The file labels of one load, in the order in which they were read.
class FileLabelPolicy {
 public:
  // The label that a line of a policy gives to files.
  struct FileLabel {
    std::string path = {};
    std::string label = {};
    bool recursive = false;  // everything below the path, too
    std::string policyFile = {};
    unsigned int lineNumber = 0;
  };

  // Appends the labels of the policy file `file`. Throws BraxoException at the first bad line;
  // the labels before it are kept.
  void ParsePolicy(const std::string& file, TeskAccessInterfaceImpl& access,
                   PolicyObserver& observer = Nobody());

  // Appends the label of the line `line` of the file `file`. Throws LineFailure for a bad one.
  void ParseLine(const std::string& file, unsigned int line, const std::queue<std::string>& tokens,
                 TeskAccessInterfaceImpl& access);

  // Applies and drops all labels, in order. One that fails is reported; throws BraxoException at
  // the end when one did.
  void SetFileLabels(TeskAccessInterfaceImpl& access, PolicyObserver& observer = Nobody());

  std::deque<FileLabel> fileLabels;
};

}  // namespace SecPolicy
