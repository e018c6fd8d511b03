#include "report_source.h"

#include <utility>

#include "compare/side.h"
#include "ending.h"
#include "enforce/domain_plan.h"
#include "host/linux/operation/log_use.h"
#include "host/linux/operation/state_use.h"
#include "query/question.h"
#include "refusal.h"
#include "root.h"
#include "scratch/scratch_state.h"
#include "text/shell_word.h"

namespace SecPolicyCli {
namespace {

using Policy::WordKind;
using SecPolicy::TeskAccessInterfaceImpl;

constexpr char kInstalled[] = "installed";

constexpr WordKind kTables[] = {
    WordKind::kObjectAccess,   WordKind::kCapability, WordKind::kTransition, WordKind::kFileKind,
    WordKind::kParameterCheck, WordKind::kSyscall,    WordKind::kSocketKind};

// Words are those of any host.
void ReadWords(ReportSource& source) {
  const ScratchState scratch(true);
  TeskAccessInterfaceImpl access;
  for (const WordKind kind : kTables) source.words[kind] = KnownWords(kind, access);
  for (const auto& [name, id] : source.policy.objects) {
    if (access.IsPredefinedLabel(name, TeskCtl::Security::TESKACCESS_LABEL_OBJECT)) {
      source.builtInLabels.push_back(name);
    }
  }
}

Coverage ReadCoverage(const Policy::InstalledPolicy& policy, TeskAccessInterfaceImpl& access) {
  Coverage coverage{.features = Enforce::ProbeFeatures(), .domains = {}};
  PlanSources sources(access, coverage.features);
  for (const Policy::InstalledDomain& domain : policy.domains) {
    Enforce::CompiledPlan compiled = sources.Compile(domain);
    coverage.domains.push_back(
        {.fates = std::move(compiled.fates), .gaps = std::move(compiled.gaps)});
  }
  return coverage;
}

// A report is of use without it.
void TryCoverage(ReportSource& source, TeskAccessInterfaceImpl& access) {
  try {
    source.coverage = ReadCoverage(source.policy, access);
  } catch (const Braxo::Lib::BraxoException& failure) {
    source.whyNoCoverage = failure.what();
  }
}

void ReadInstalled(ReportSource& source) {
  if (LinuxHost::IsStateMissing()) throw NothingInstalled(WhyWithoutState());
  TeskAccessInterfaceImpl access;
  source.policy = ReadInstalledPolicy(access);
  source.labels = LinuxHost::ListLabelOrigins(LinuxHost::CurrentState());
  TryCoverage(source, access);
}

Side ReadOther(const std::string& name) {
  SecPolicy::PolicyObserver nobody;
  try {
    return ReadSide(name, nobody);
  } catch (const BadPolicy&) {
    throw BadPolicy("the policy in " + name + " has errors (above), so no report was made. " +
                    Call("check " + ShellWord(name)) + " shows every one with its place.");
  }
}

}  // namespace

ReportSource ReadReportSource(const std::string& name, const std::string& against) {
  const LinuxHost::DroppedLog dropped;
  ReportSource source{.title = {},
                      .name = name,
                      .policy = {},
                      .labels = {},
                      .words = {},
                      .builtInLabels = {},
                      .coverage = std::nullopt,
                      .whyNoCoverage = {},
                      .against = std::nullopt};
  if (name == kInstalled) {
    ReadInstalled(source);
  } else {
    Side side = ReadOther(name);
    source.policy = std::move(side.policy);
    source.labels = std::move(side.labelLines);
    source.whyNoCoverage = "it is told of the installed policy alone";
  }
  ReadWords(source);
  if (!against.empty()) source.against = Diff(ReadOther(against), ReadOther(name));
  return source;
}

}  // namespace SecPolicyCli
