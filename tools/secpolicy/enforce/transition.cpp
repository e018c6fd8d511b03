#include "transition.h"

#include <optional>
#include <utility>

#include "execution.h"
#include "host/enforce/interpreter.h"
#include "host/linux/operation/world_entry.h"
#include "installed/installed_policy.h"
#include "policy/decision.h"
#include "program_file.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;

Policy::InstalledDomain CallersDomain(SecPolicy::TeskAccessInterfaceImpl& access) {
  auto domain = Policy::ReadDomain(access, LinuxHost::DomainOfCaller());
  if (!domain) throw BraxoException("the domain of this process is gone");
  return std::move(*domain);
}

// The domain that its label leads to from the domain of the caller; nothing where it stays there.
std::optional<std::string> DomainByExec(const ProgramFile& program,
                                        const Policy::InstalledDomain& caller,
                                        SecPolicy::TeskAccessInterfaceImpl& access) {
  const Policy::FileQuestion asked = AskToExecute(program, access);
  RequireAllowed(asked, caller, access);
  return DomainBehind(asked.label, caller);
}

// A script is executed by its real path, as its interpreter opens it by that.
Entry EntryOf(std::string domain, std::vector<std::string> command, ProgramFile program) {
  Entry entry{.domain = std::move(domain), .command = std::move(command)};
  if (Enforce::IsScript(program.file.Number())) {
    entry.command.front() = program.path;
  } else {
    entry.program = std::move(program.file);
    entry.programPath = program.path;
  }
  return entry;
}

}  // namespace

Entry EntryByExec(std::vector<std::string> command, SecPolicy::TeskAccessInterfaceImpl& access) {
  const auto path = FindProgram(command.front());
  if (!path) throw NoSuchProgram("there is no program '" + command.front() + "' in PATH");
  command.front() = *path;
  ProgramFile program = OpenProgram(*path);
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
