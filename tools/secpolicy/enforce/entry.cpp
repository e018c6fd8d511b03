#include "entry.h"

#include <exception>
#include <iostream>
#include <optional>

#include "broker.h"
#include "domain_plan.h"
#include "environment.h"
#include "execution.h"
#include "host/enforce/broker/message.h"
#include "host/linux/kernel/module_publication.h"
#include "host/linux/operation/log_use.h"
#include "host/linux/operation/state_use.h"
#include "host/linux/operation/world_entry.h"
#include "host/linux/operation/world_records.h"
#include "kept_domain.h"
#include "launcher.h"
#include "observe/permissive.h"
#include "observe/watch.h"
#include "program_file.h"
#include "published.h"
#include "query/named.h"
#include "root.h"
#include "teskctl/system.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

// Tells what this kernel cannot refuse, which is only of interest where something is to be refused;
// true where it is given up for.
bool MaySurrender(const std::string& verb, const Enforce::CompiledPlan& compiled,
                  const EntryOptions& options) {
  if (compiled.plan.level != Policy::Level::kEnforcing || KeepsAllRules(compiled)) return true;
  for (const std::string& gap : compiled.gaps) std::cerr << Enforce::LineOfGap(gap) << '\n';
  for (const Enforce::RuleFate& fate : NotExpressible(compiled.fates)) {
    std::cerr << Visible(LineOf(NamedOutside(fate))) << '\n';
  }
  if (options.bestEffort) return true;
  std::cerr << "secpolicy: " << verb << ": the rules of " << compiled.plan.domain
            << " cannot be kept to, so nothing was started; change them, or give --best-effort"
            << std::endl;
  return false;
}

// Nothing where there is none.
std::optional<std::string> ProgramOf(const Entry& entry) {
  return entry.program.IsOpen() ? entry.programPath : FindProgram(entry.command.front());
}

ExitCode EnterAsInstalled(const std::string& verb, const Entry& entry,
                          SecPolicy::TeskAccessInterfaceImpl& access, const EntryOptions& options) {
  const Policy::InstalledDomain domain = RequireInstalledDomain(entry.domain, access);
  const Keeper keeper = FindKeeper();
  TellWhyNot(verb, keeper, domain.name);
  const Enforce::CompiledPlan compiled = PlanOf(domain, keeper, access);
  if (!MaySurrender(verb, compiled, options)) return kNotConfined;
  const auto program = ProgramOf(entry);
  if (program && KeepsAllRules(compiled)) RequireExecutable(*program, domain, access);
  // This process does not end as others do: a new label index was a commit.
  LinuxHost::PublishCommitted();
  std::cerr << std::flush;
  if (keeper.module != nullptr) {
    LinuxHost::EnterKeptWorld(compiled.plan.domainId);
    StartKept(compiled.plan, entry, keeper.module->EnteringMap());
  }
  LinuxHost::EnterWorld(compiled.plan.domainId, compiled.plan.level);
  if (compiled.plan.level == Policy::Level::kPermissive) {
    return RunPermissive(verb, entry, domain, access);
  }
  StartConfined(compiled.plan, entry, KeepBroker(compiled.plan));
}

// Plans go by the names of their domains.
std::string NameOf(const std::string& domain) {
  if (!ReadNumber(domain)) return domain;
  const PublishedState state;
  SecPolicy::TeskAccessInterfaceImpl access;
  return FindDomain(domain, access).name;
}

ExitCode EnterAsPublished(const std::string& verb, const Entry& entry) {
  const Enforce::Plan plan = ReadPublishedPlan(NameOf(entry.domain));
  LinuxHost::RecordWorld(plan.domain, TextOf(plan.level));
  if (plan.level != Policy::Level::kPermissive) StartConfined(plan, entry, KeepBroker(plan));
  // Of ordinary users only the daemon takes lines.
  std::optional<LinuxHost::DroppedLog> withoutLog;
  if (!TeskCtl::System::SyslogIsRunning()) withoutLog.emplace();
  const PublishedState state;
  SecPolicy::TeskAccessInterfaceImpl access;
  return RunPermissive(verb, entry, RequireInstalledDomain(plan.domain, access), access);
}

void TellFailure(const std::string& verb, const std::string& failure) {
  const std::string advice = AdviseOnForeignRoot();
  std::cerr << "secpolicy: " << verb << ": " << Visible(failure) << "; nothing was started"
            << (advice.empty() ? "" : ". " + advice) << std::endl;
}

ExitCode TryToEnter(const std::string& verb, const std::function<ExitCode()>& enter) {
  try {
    return enter();
  } catch (const NoSuchProgram& failure) {
    TellFailure(verb, failure.what());
    return kNoProgram;
  } catch (const std::exception& failure) {
    TellFailure(verb, failure.what());
    return kNotConfined;
  }
}

}  // namespace

std::vector<std::string> EnvironmentOf(const Entry& entry) {
  return EnvironmentWith(entry.environment, {Enforce::kBrokerVariable});
}

void AddEntryOptions(Syntax& syntax, EntryOptions& options) {
  syntax.AddFlag("--best-effort", options.bestEffort,
                 "Start it although this kernel cannot refuse all that the rules do");
}

void PrepareEntry() {
  OpenLauncher();
  OpenProc();
}

ExitCode EnterDomain(const std::string& verb, const Entry& entry, const EntryOptions& options) {
  return TryToEnter(verb, [&] {
    if (LinuxHost::IsStateForbidden()) return EnterAsPublished(verb, entry);
    SecPolicy::TeskAccessInterfaceImpl access;
    return EnterAsInstalled(verb, entry, access, options);
  });
}

ExitCode EnterDomain(const std::string& verb,
                     const std::function<Entry(SecPolicy::TeskAccessInterfaceImpl&)>& find,
                     const EntryOptions& options) {
  return TryToEnter(verb, [&] {
    // Whatever becomes of this process, the copy is removed first.
    std::optional<PublishedState> copy;
    if (LinuxHost::IsStateForbidden()) copy.emplace();
    SecPolicy::TeskAccessInterfaceImpl access;
    const Entry entry = find(access);
    if (!copy) return EnterAsInstalled(verb, entry, access, options);
    copy.reset();
    return EnterAsPublished(verb, entry);
  });
}

}  // namespace SecPolicyCli
