#include "policy_dir.h"

#include <CLI/App.hpp>

#include "kitlibs/file.h"
#include "library_call.h"
#include "load_summary.h"
#include "load_timing.h"
#include "root.h"

namespace SecPolicyCli {

std::shared_ptr<const std::string> AddPolicyDir(CLI::App& app, const std::string& preset) {
  const auto dir = std::make_shared<std::string>(preset);
  app.add_option("DIR", *dir, "The policy directory, as seen from the root")->capture_default_str();
  return dir;
}

std::shared_ptr<const bool> AddTiming(CLI::App& app) {
  const auto timing = std::make_shared<bool>(false);
  app.add_flag("--timing", *timing, "Print the time that each phase took to standard output");
  return timing;
}

std::optional<ExitCode> RefuseMissingDir(const std::string& verb, const std::string& dir) {
  if (File_IsDirectory(dir.c_str())) return std::nullopt;
  return Refuse(verb, "there is no directory " + dir +
                          " below this root, so nothing was changed. Name the directory of the "
                          "policy, or the root that it is in (--root DIR).");
}

ExitCode LoadFrom(const std::string& verb, const std::string& dir,
                  void (*load)(const std::string& dir), bool timing) {
  if (const auto refusal = RefuseMissingDir(verb, dir)) return *refusal;
  return CallLibrary(
      verb, dir,
      [&] {
        LoadTiming phases(timing);
        load(dir);
      },
      AdviseOnPrivilege, DescribeInstalled);
}

}  // namespace SecPolicyCli
