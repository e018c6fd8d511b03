#pragma once

#include <optional>
#include <string>
#include <unordered_map>

#include "host/enforce/plan/path_plan.h"

namespace Enforce {

// The files below the root directory of this process, each as it was when it was first asked for:
// domains mostly name the same. Its functions throw Braxo::Lib::BraxoException where this process
// cannot look, as under a filter of system calls.
class RealFileTree : public FileTree {
 public:
  FileKind KindOf(const std::string& path) override;
  std::optional<std::vector<std::string>> List(const std::string& directory,
                                               std::size_t most) override;
  bool CanMask() override;

 private:
  std::optional<bool> canMask;
  std::unordered_map<std::string, FileKind> known;
};

}  // namespace Enforce
