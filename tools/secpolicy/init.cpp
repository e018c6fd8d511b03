#include <filesystem>
#include <iostream>
#include <memory>
#include <string>
#include <system_error>

#include "begin/new_file.h"
#include "begin/starter_policy.h"
#include "command_line.h"
#include "ending.h"
#include "host/linux/common/host_error.h"
#include "policy_dir.h"
#include "root.h"
#include "secpolicy/policy_root.h"
#include "text/format.h"
#include "text/shell_word.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

namespace fs = std::filesystem;

void MakeDirectories(const fs::path& dir) {
  std::error_code failure;
  fs::create_directories(dir, failure);
  if (!failure) return;
  throw LinuxHost::HostError(failure.value(),
                             "cannot make " + dir.string() + ": " + failure.message());
}

void WritePolicy(const fs::path& dir) {
  for (const StarterFile& file : StarterFiles()) {
    const fs::path path = dir / file.path;
    MakeDirectories(path.parent_path());
    WriteNewFile(path, file.text);
    std::cout << Visible(OutsidePath(path.string())) << '\n';
  }
}

ExitCode Init(const std::string& dir) {
  if (fs::exists(dir) && !fs::is_empty(dir)) {
    return Refuse("init", OutsidePath(dir) + " is not empty, so nothing was written. " +
                              Call("check " + ShellWord(dir)) + " reads what is there.");
  }
  const bool isHostsOwn = dir == SecPolicy::kPolicyRoot;
  return CallLibrary(
      "init",
      [&](ErrorList&) {
        WritePolicy(dir);
        // A boot looks for archives there, and is content with none.
        if (isHostsOwn) MakeDirectories(SecPolicy::kTardiskImagesDir);
      },
      AdviseOnPrivilege,
      [&] {
        return "done (" + CountOf(StarterFiles().size(), "file") + "). " +
               Call(isHostsOwn ? "boot" : "check --fresh " + ShellWord(dir)) +
               (isHostsOwn ? " installs them" : " reads them");
      });
}

Action Define(Syntax& syntax) {
  const auto dir = AddPolicyDir(syntax, SecPolicy::kPolicyRoot);
  return [dir] { return Init(*dir); };
}

}  // namespace

const Verb kInit = {
    "init", "Write a first policy to begin with",
    "Writes a small policy with comments: a label, who may use it, and the domains that every "
    "host\n"
    "needs. It can be booted as it is. Writes into an empty or new directory only.\n"
    "\n"
    "Examples:\n"
    "  secpolicy --root ./r init            below a root of your own\n"
    "  secpolicy --root ./r boot            install it\n"
    "  secpolicy init ./my-policy           only the files",
    Define};

}  // namespace SecPolicyCli
