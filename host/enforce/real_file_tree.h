#pragma once

#include <optional>

#include "host/enforce/plan/path_plan.h"

namespace Enforce {

// The files below the root directory of this process.
class RealFileTree : public FileTree {
 public:
  FileKind KindOf(const std::string& path) override;
  std::optional<std::vector<std::string>> List(const std::string& directory,
                                               std::size_t most) override;
  bool CanMask() override;

 private:
  std::optional<bool> canMask;
};

}  // namespace Enforce
