#include "transition.h"

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <string_view>

#include "host/linux/operation/world_entry.h"
#include "installed/installed_policy.h"
#include "policy/decision.h"
#include "query/question.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;
using Policy::Rule;
using Policy::RuleKind;

// As a shell finds it; the name itself where it does not.
std::string Find(const std::string& program) {
  if (program.find('/') != std::string::npos) return std::filesystem::absolute(program);
  const char* const variable = std::getenv("PATH");
  std::string_view path = variable == nullptr ? "/usr/bin:/bin" : variable;
  while (!path.empty()) {
    const std::string_view directory = path.substr(0, path.find(':'));
    path.remove_prefix(std::min(directory.size() + 1, path.size()));
    const std::filesystem::path candidate = std::filesystem::path(directory) / program;
    std::error_code error;
    if (std::filesystem::is_regular_file(candidate, error)) return candidate;
  }
  throw BraxoException("there is no program '" + program + "' in PATH");
}

Policy::InstalledDomain CallersDomain(SecPolicy::TeskAccessInterfaceImpl& access) {
  auto domain = Policy::ReadDomain(access, LinuxHost::DomainOfCaller());
  if (!domain) throw BraxoException("the domain of this process is gone");
  return std::move(*domain);
}

}  // namespace

std::string DomainByExec(const std::string& program, SecPolicy::TeskAccessInterfaceImpl& access) {
  const Policy::InstalledDomain caller = CallersDomain(access);
  const Question question = ReadQuestion({"exec", Find(program)}, access);
  const auto& file = std::get<Policy::FileQuestion>(question.asked);
  const Policy::Decision decision = Decide(file, caller);
  if (!decision.IsAllowed()) {
    throw BraxoException(caller.name + " may not execute " + file.path + ": 'secpolicy why " +
                         caller.name + " exec " + file.path + "' says which rule would grant it");
  }
  for (const Rule* const rule : RulesOf(caller, RuleKind::kDomainTransition)) {
    if (rule->Grants() && rule->words[0] == file.label && rule->words[2] == "exec") {
      return rule->words[1];
    }
  }
  return caller.name;
}

}  // namespace SecPolicyCli
