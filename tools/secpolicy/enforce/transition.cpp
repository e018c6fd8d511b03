#include "transition.h"

#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <string_view>
#include <system_error>

#include "host/linux/operation/world_entry.h"
#include "installed/installed_policy.h"
#include "policy/decision.h"
#include "query/question.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;
using Policy::Rule;
using Policy::RuleKind;

bool IsProgram(const std::filesystem::path& path) {
  std::error_code error;
  return std::filesystem::is_regular_file(path, error) && access(path.c_str(), X_OK) == 0;
}

// As a shell finds it.
std::string Find(const std::string& program) {
  if (program.find('/') != std::string::npos) return program;
  const char* const variable = std::getenv("PATH");
  std::string_view path = variable == nullptr ? "/bin:/usr/bin" : variable;
  while (!path.empty()) {
    const std::string_view directory = path.substr(0, path.find(':'));
    path.remove_prefix(std::min(directory.size() + 1, path.size()));
    const std::filesystem::path candidate =
        std::filesystem::path(directory.empty() ? "." : directory) / program;
    if (IsProgram(candidate)) return candidate;
  }
  throw BraxoException("there is no program '" + program + "' in PATH");
}

std::string Absolute(const std::string& path) {
  std::error_code error;
  const auto absolute = std::filesystem::absolute(path, error);
  if (!error) return absolute;
  throw BraxoException("cannot tell where " + path + " is: " + error.message());
}

Policy::InstalledDomain CallersDomain(SecPolicy::TeskAccessInterfaceImpl& access) {
  auto domain = Policy::ReadDomain(access, LinuxHost::DomainOfCaller());
  if (!domain) throw BraxoException("the domain of this process is gone");
  return std::move(*domain);
}

// By its absolute path.
std::string DomainByExec(const std::string& program, SecPolicy::TeskAccessInterfaceImpl& access) {
  const Policy::InstalledDomain caller = CallersDomain(access);
  const Question question = ReadQuestion({"exec", program}, access);
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

}  // namespace

Entry EntryByExec(std::vector<std::string> command, SecPolicy::TeskAccessInterfaceImpl& access) {
  command.front() = Find(command.front());
  return {DomainByExec(Absolute(command.front()), access), command};
}

}  // namespace SecPolicyCli
