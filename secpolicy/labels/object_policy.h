#pragma once

#include <string>
#include <vector>

#include "secpolicy/report.h"
#include "secpolicy/secpolicy.h"

namespace SecPolicy {

// The object names of one load, in the order in which they were read, duplicates included.
class ObjectPolicy {
 public:
  // Appends the names in the object file at `path`. Throws BraxoException when it cannot be opened
  // and at the first line that is not one name; the names before it are kept.
  void ParsePolicy(const std::string& path, PolicyObserver& observer = Nobody());

  // Appends the name in the line `line` of the file at `path`. Throws LineFailure for a bad one.
  void ParseLine(const std::string& path, unsigned int line, std::queue<std::string>& tokens);

  // Makes the kernel's object labels equal to the names. Throws what the kernel throws.
  void SetObjects(TeskAccessInterfaceImpl& access);

  std::vector<std::string> names;
};

}  // namespace SecPolicy
