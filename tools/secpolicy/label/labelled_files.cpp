#include "labelled_files.h"

#include <dirent.h>

#include <cstring>

#include "secpolicy/observed/policy_lines.h"

namespace SecPolicyCli {

void WalkLabelledFiles(const std::string& path, bool wholeTree, const OnLabelledFile& visit,
                       const OnUnreachable& fail) {
  LinuxHost::WalkFiles(
      path, path,
      [&](const LinuxHost::WalkedFile& file) {
        const bool isStart = file.depth == 0;
        if (!isStart && !SecPolicy::IsLabelled(file.type)) return false;
        visit(file);
        return isStart ? wholeTree : file.type == DT_DIR;
      },
      [&](const std::string& failed, int error) {
        fail(failed, error == LinuxHost::kMoved ? "It was moved meanwhile, so the walk ended here"
                                                : std::strerror(error));
      });
}

}  // namespace SecPolicyCli
