#include "policy_dir.h"

#include <filesystem>

#include "ending.h"
#include "kitlibs/file.h"
#include "root.h"
#include "secpolicy/policy_root.h"

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

std::string AdviseOnMissing(const std::string& path) {
  const std::string below = PathBelowRoot(path);
  if (!below.empty()) return " Did you mean " + below + "? Paths begin at the root.";
  if (path == SecPolicy::kPolicyRoot) return " " + Call("init") + " writes a first policy.";
  return "";
}

std::optional<ExitCode> RefuseMissingDir(const std::string& verb, const std::string& dir) {
  if (File_IsDirectory(dir.c_str())) return std::nullopt;
  return Refuse(verb, "there is no directory " + dir +
                          " below this root, so nothing was changed. Name the directory of the "
                          "policy, or the root that it is in (--root DIR)." +
                          AdviseOnMissing(dir));
}

std::string DomainFile(std::string_view domain, const std::string& policyDir) {
  constexpr std::string_view kPrefix = SecPolicy::kPartnerPrefix;
  if (domain.starts_with(kPrefix)) {
    domain.remove_prefix(kPrefix.size());
    return SecPolicy::kPartnerDomainsDir + ("/" + std::string(domain));
  }
  return policyDir + "/" + SecPolicy::kDomainsDir + "/" + std::string(domain);
}

std::string DomainOfFile(const std::string& file) {
  const std::filesystem::path path = file;
  const std::string name = path.filename();
  if (path.parent_path() == SecPolicy::kPartnerDomainsDir) return SecPolicy::kPartnerPrefix + name;
  return path.parent_path().filename() == SecPolicy::kDomainsDir ? name : "";
}

}  // namespace SecPolicyCli
