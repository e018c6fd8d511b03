#include <cerrno>
#include <cstring>
#include <filesystem>

#include "file_walk.h"
#include "host/linux/security_attribute.h"
#include "label_actions.h"

namespace SecPolicyCli {
namespace {

void ShowLabel(LabelRun& run, const WalkedFile& file) {
  try {
    run.Print(file.path + ": " + SecPolicy::GetFileLabel(file.name, run.access));
  } catch (const Braxo::Lib::BraxoException&) {
    // The path that the user knows, and not the name that the walk uses.
    const auto id = LinuxHost::ReadLabel(file.name);
    run.Error(file.path + ": " + (id ? "has " + run.NameOf(*id) : WhyNoLabel(errno)));
  }
}

}  // namespace

std::string ShowLabels(LabelRun& run, const std::vector<std::string>& paths, bool wholeTrees) {
  for (const std::string& path : paths) {
    std::error_code ignored;
    WalkFiles(
        path, wholeTrees && std::filesystem::is_directory(path, ignored),
        [&](const WalkedFile& file) { ShowLabel(run, file); },
        [&](const std::string& failed, const std::string& why) { run.Error(failed + ": " + why); });
  }
  return "done";
}

}  // namespace SecPolicyCli
