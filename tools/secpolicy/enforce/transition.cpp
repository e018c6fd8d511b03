#include "transition.h"

#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <optional>
#include <string_view>
#include <system_error>
#include <utility>

#include "host/linux/operation/file_label.h"
#include "host/linux/operation/world_entry.h"
#include "installed/installed_policy.h"
#include "policy/decision.h"
#include "program_file.h"
#include "root.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;
using Policy::Rule;
using Policy::RuleKind;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;

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

Policy::InstalledDomain CallersDomain(SecPolicy::TeskAccessInterfaceImpl& access) {
  auto domain = Policy::ReadDomain(access, LinuxHost::DomainOfCaller());
  if (!domain) throw BraxoException("the domain of this process is gone");
  return std::move(*domain);
}

Policy::FileQuestion AskToExecute(const ProgramFile& program,
                                  SecPolicy::TeskAccessInterfaceImpl& access) {
  Policy::FileQuestion asked = {.access = Policy::FileAccess::kExecute,
                                .path = program.path,
                                .label = {},
                                .labelIsBuiltIn = false};
  const auto label = LinuxHost::ReadLabel(program.file.Number(), program.path.c_str());
  if (!label) return asked;
  try {
    asked.label = access.GetLabel(label->id, TESKACCESS_LABEL_OBJECT);
  } catch (const BraxoException&) {
    return asked;
  }
  asked.labelIsBuiltIn = access.IsPredefinedLabel(asked.label, TESKACCESS_LABEL_OBJECT);
  return asked;
}

// The domain that its label leads to from the domain of the caller; nothing where it stays there.
std::optional<std::string> DomainByExec(const ProgramFile& program,
                                        const Policy::InstalledDomain& caller,
                                        SecPolicy::TeskAccessInterfaceImpl& access) {
  const Policy::FileQuestion asked = AskToExecute(program, access);
  if (!Decide(asked, caller).IsAllowed()) {
    throw BraxoException(caller.name + " may not execute " + asked.path + ": " +
                         Call("why " + caller.name + " exec " + asked.path) +
                         " says which rule would grant it");
  }
  for (const Rule* const rule : RulesOf(caller, RuleKind::kDomainTransition)) {
    const bool isWayIn =
        rule->Grants() && rule->words[0] == asked.label && rule->words[2] == "exec";
    if (isWayIn && rule->words[1] != caller.name) return rule->words[1];
  }
  return std::nullopt;
}

// A script is executed by its real path, as its interpreter opens it by that.
Entry EntryOf(std::string domain, std::vector<std::string> command, ProgramFile program) {
  Entry entry{.domain = std::move(domain), .command = std::move(command)};
  if (IsScript(program)) {
    entry.command.front() = program.path;
  } else {
    entry.program = std::move(program.file);
    entry.programPath = program.path;
  }
  return entry;
}

}  // namespace

Entry EntryByExec(std::vector<std::string> command, SecPolicy::TeskAccessInterfaceImpl& access) {
  command.front() = Find(command.front());
  ProgramFile program = OpenProgram(command.front());
  const Policy::InstalledDomain caller = CallersDomain(access);
  const auto domain = DomainByExec(program, caller, access);
  return EntryOf(domain.value_or(caller.name), std::move(command), std::move(program));
}

Entry EntryByBroker(const Enforce::AskedEntry& asked, const DomainReference& asker,
                    SecPolicy::TeskAccessInterfaceImpl& access) {
  const auto caller = Policy::ReadDomain(access, asker.id);
  if (!caller || caller->name != asker.name) {
    throw BraxoException("the domain of this process is gone");
  }
  ProgramFile program = SeeProgram(asked.program.Number());
  const auto domain = DomainByExec(program, *caller, access);
  if (!domain) {
    throw BraxoException("no rule leads from " + caller->name + " to another domain by " +
                         program.path + ", and what stays in the domain needs no broker");
  }
  Entry entry = EntryOf(*domain, asked.request.command, std::move(program));
  entry.environment = asked.request.environment;
  entry.isForAnother = true;
  return entry;
}

}  // namespace SecPolicyCli
