#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "host/enforce/coverage.h"
#include "host/enforce/plan/landlock.h"
#include "policy/installed_policy.h"

// Rules about files, as Landlock takes them: rights to a path and everything beneath it, which add
// up. So a right is given where all that is beneath has it, and no higher.
namespace Enforce {

// Stands for a label that nobody knows: what rules refuse to any label is refused to it.
inline constexpr std::string_view kUnknownLabel{"\0", 1};

// A file or directory whose label is not that of the directory above it. Empty where it surely has
// none.
struct LabelledPath {
  std::string path;
  std::string_view label;
};

enum class FileKind {
  kNothing,  // or nothing that this path leads to without a link
  kDirectory,
  kLink,
  kFile,  // and all others
};

// What a plan has to know of files. Throws what its owner throws.
class FileTree {
 public:
  virtual ~FileTree() = default;

  virtual FileKind KindOf(const std::string& path) = 0;

  // The names in a directory; nothing when there are more than `most`, or when they cannot be read.
  virtual std::optional<std::vector<std::string>> List(const std::string& directory,
                                                       std::size_t most) = 0;
};

// A directory with more entries is not taken apart.
constexpr std::size_t kMostSiblings = 64;

// More rights than this are not worth their time at each entry.
constexpr std::size_t kMostPathRights = 4096;

struct PathPlan {
  std::vector<PathRight> rights;  // in the order of a walk from the root
  std::vector<RuleFate> fates;    // of the rules about files (-a, -d, -f, -r, -u), in order
};

// The plan for a domain's rules about files. `places` are in any order; a file that is not among
// them has the label of the nearest one above it.
PathPlan PlanPaths(const Policy::InstalledDomain& domain, const std::vector<LabelledPath>& places,
                   FileTree& files);

}  // namespace Enforce
