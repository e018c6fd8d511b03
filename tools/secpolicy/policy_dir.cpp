#include "policy_dir.h"

#include "kitlibs/file.h"
#include "library_call.h"

namespace SecPolicyCli {

std::shared_ptr<const std::string> AddPolicyDir(Syntax& syntax, const std::string& preset) {
  const auto dir = std::make_shared<std::string>(preset);
  syntax.AddOption("DIR", *dir, "The policy directory, as seen from the root").ShowDefault();
  return dir;
}

Option AddKeep(Syntax& syntax, bool& keep) {
  return syntax.AddFlag("--keep", keep,
                        "Keep what earlier loads installed and no file has any more");
}

Option AddTiming(Syntax& syntax, bool& timing) {
  return syntax.AddFlag("--timing", timing,
                        "Print the time that each phase took to standard output");
}

std::optional<ExitCode> RefuseMissingDir(const std::string& verb, const std::string& dir) {
  if (File_IsDirectory(dir.c_str())) return std::nullopt;
  return Refuse(verb, "there is no directory " + dir +
                          " below this root, so nothing was changed. Name the directory of the "
                          "policy, or the root that it is in (--root DIR).");
}

}  // namespace SecPolicyCli
