#include "labelled_files.h"

#include <dirent.h>

#include <cstring>

namespace SecPolicyCli {
namespace {

bool IsLabelled(unsigned char entryType) {
  switch (entryType) {
    case DT_FIFO:
    case DT_CHR:
    case DT_DIR:
    case DT_BLK:
    case DT_REG:
      return true;
    default:
      return false;
  }
}

}  // namespace

void WalkLabelledFiles(const std::string& path, bool wholeTree, const OnLabelledFile& visit,
                       const OnUnreachable& fail) {
  LinuxHost::WalkFiles(
      path, path,
      [&](const LinuxHost::WalkedFile& file) {
        const bool isStart = file.depth == 0;
        if (!isStart && !IsLabelled(file.type)) return false;
        visit(file);
        return isStart ? wholeTree : file.type == DT_DIR;
      },
      [&](const std::string& failed, int error) {
        fail(failed, error == LinuxHost::kMoved ? "It was moved meanwhile, so the walk ended here"
                                                : std::strerror(error));
      });
}

}  // namespace SecPolicyCli
