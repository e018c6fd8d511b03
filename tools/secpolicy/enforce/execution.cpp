#include "execution.h"

#include <optional>

#include "host/enforce/interpreter.h"
#include "host/linux/operation/file_label.h"
#include "query/answer.h"
#include "query/named.h"
#include "root.h"

namespace SecPolicyCli {
namespace {

using Braxo::Lib::BraxoException;
using Policy::Rule;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;

// The kernel reads what it executes.
Rule ThatReads(Rule rule) {
  if (rule.kind == Policy::RuleKind::kFilePath) {
    rule.verdict = rule.Permits().With(Policy::Permission::kRead);
  }
  return rule;
}

std::string Remedy(const Policy::Decision& decision, const Policy::InstalledDomain& domain) {
  if (decision.votes.empty()) {
    return "'" + ThatReads(decision.missing.front()).Text() + "' is missing in " +
           OutsidePath(PolicyFileOf(domain));
  }
  const Policy::Vote& refusing = decision.votes.front();
  return Cite(refusing.rule) + "; '" + ThatReads(*refusing.instead).Text() +
         "' in its place would let it";
}

std::optional<ProgramFile> TryToOpen(const std::string& path) {
  if (!IsProgram(path)) return std::nullopt;
  try {
    return OpenProgram(path);
  } catch (const BraxoException&) {
    return std::nullopt;
  }
}

// What leads to another domain is neither executed nor read in this one.
void RequireToStay(const Policy::FileQuestion& asked, const Policy::InstalledDomain& domain) {
  const auto elsewhere = DomainBehind(asked.label, domain);
  if (!elsewhere || domain.level != Policy::Level::kEnforcing) return;
  throw BraxoException(domain.name + " may not execute " + asked.path + " itself: its label " +
                       asked.label + " leads to " + *elsewhere + ", where " +
                       Call("run " + *elsewhere + " -- " + asked.path) + " starts it");
}

std::string RoleOf(const Enforce::Interpreter& interpreter, const ProgramFile& program) {
  return (interpreter.isLoader ? ", the loader of " : ", the interpreter of ") + program.path;
}

}  // namespace

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

void RequireAllowed(const Policy::FileQuestion& asked, const Policy::InstalledDomain& domain,
                    SecPolicy::TeskAccessInterfaceImpl& access, const std::string& role) {
  if (Decide(asked, domain).IsAllowed()) return;
  // Where rules were written is of interest only now.
  const Policy::InstalledDomain written = RequireInstalledDomain(domain.name, access);
  throw BraxoException(domain.name + " may not execute " + asked.path + role + ": " +
                       Remedy(Decide(asked, written), written));
}

std::optional<std::string> DomainBehind(const std::string& label,
                                        const Policy::InstalledDomain& domain) {
  for (const Rule* const rule : RulesOf(domain, Policy::RuleKind::kDomainTransition)) {
    const bool isWayOut = rule->Grants() && rule->words[0] == label && rule->words[2] == "exec";
    if (isWayOut && rule->words[1] != domain.name) return rule->words[1];
  }
  return std::nullopt;
}

void RequireExecutable(const std::string& path, const Policy::InstalledDomain& domain,
                       SecPolicy::TeskAccessInterfaceImpl& access) {
  std::optional<ProgramFile> program = TryToOpen(path);
  std::string role;
  for (int count = 0; count < Enforce::kMostInterpreters && program; ++count) {
    const Policy::FileQuestion asked = AskToExecute(*program, access);
    RequireAllowed(asked, domain, access, role);
    RequireToStay(asked, domain);
    const auto interpreter = Enforce::InterpreterOf(program->file.Number());
    if (!interpreter) return;
    role = RoleOf(*interpreter, *program);
    program = TryToOpen(interpreter->path);
  }
}

}  // namespace SecPolicyCli
