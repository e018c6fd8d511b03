#pragma once

#include <deque>
#include <string>

#include "secpolicy/observed/policy_observer.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {

// The file labels of one load, in the order in which they were read.
class FileLabelPolicy {
 public:
  using FileLabel = SecPolicy::FileLabel;

  // Appends the labels of the policy file `file`. Throws BraxoException at the first bad line;
  // the labels before it are kept.
  void ParsePolicy(const std::string& file, TeskAccessInterfaceImpl& access);
  void ParsePolicy(const std::string& file, TeskAccessInterfaceImpl& access,
                   PolicyObserver& observer);

  // Appends the label of the line `problem.line` of the file `problem.file`. Before it throws,
  // `problem` says what is wrong with the line.
  void ParseLine(std::queue<std::string>& tokens, TeskAccessInterfaceImpl& access,
                 Problem& problem);

  // Applies and drops all labels, in order. One that fails is reported; throws BraxoException at
  // the end when one did.
  void SetFileLabels(TeskAccessInterfaceImpl& access);
  void SetFileLabels(TeskAccessInterfaceImpl& access, PolicyObserver& observer);

  std::deque<FileLabel> fileLabels;
};

}  // namespace SecPolicy
