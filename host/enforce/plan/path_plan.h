#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "host/enforce/coverage.h"
#include "host/enforce/plan/file_rules.h"
#include "host/enforce/plan/landlock.h"
#include "host/enforce/plan/mask.h"
#include "policy/installed_policy.h"

// Rules about files, as Landlock takes them: rights to a path and everything beneath it, which add
// up. So a right is given where all that is beneath has it, and no higher.
namespace Enforce {

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
  kFile,
  kSpecial,  // a device, fifo or socket, in which nothing is kept
};

// What a plan has to know of files. Throws what its owner throws.
class FileTree {
 public:
  virtual ~FileTree() = default;

  virtual FileKind KindOf(const std::string& path) = 0;

  // The names in a directory; nothing when there are more than `most`, or when they cannot be read.
  virtual std::optional<std::vector<std::string>> List(const std::string& directory,
                                                       std::size_t most) = 0;

  // True where masks can be laid over files, for who enters the domain alone. Only asked when one
  // would be.
  virtual bool CanMask() = 0;
};

// A directory with more entries is not taken apart.
constexpr std::size_t kMostSiblings = 64;

// More rights than this are not worth their time at each entry.
constexpr std::size_t kMostPathRights = 4096;

// No more masks than this: each takes some time at each entry.
constexpr std::size_t kMostMasks = 64;

struct PathPlan {
  std::vector<PathRight> rights;  // in the order of a walk from the root
  std::vector<Mask> masks;        // likewise
  std::vector<RuleFate> fates;    // of the rules about files (-a, -d, -f, -r, -u), in order
};

// The plan for a domain's rules about files. `places` are in any order; a file that is not among
// them has the label of the nearest one above it. Masks are used where `mayMask` and the files
// allow it: a domain that could take them away, or look into an empty place that it may not list,
// is not to have any.
PathPlan PlanPaths(const Policy::InstalledDomain& domain, const std::vector<LabelledPath>& places,
                   FileTree& files, bool mayMask);

}  // namespace Enforce
