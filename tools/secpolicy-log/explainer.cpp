#include "explainer.h"

#include <cstring>
#include <ctime>
#include <utility>
#include <vector>

#include "host/enforce/module/refusal_question.h"
#include "host/linux/operation/state_use.h"
#include "installed/installed_policy.h"
#include "observe/asked_rules.h"
#include "query/answer.h"
#include "root.h"
#include "text/format.h"

namespace SecPolicyLog {
namespace {

using Braxo::Lib::BraxoException;
using Enforce::ModuleEvent;
using Policy::Decision;
using Policy::InstalledDomain;
using Policy::Question;
using SecPolicy::TeskAccessInterfaceImpl;
using SecPolicyCli::GatheredRefusal;
using TeskCtl::Security::TESKACCESS_LABEL_OBJECT;

constexpr std::int64_t kSecond = 1'000'000'000;

// What is less says that there is none, or none that is known.
constexpr unsigned int kFirstLabel = 2;

std::int64_t NowBy(clockid_t clock) {
  timespec now = {};
  clock_gettime(clock, &now);
  return now.tv_sec * kSecond + now.tv_nsec;
}

// Events are of the clock since the start of the machine.
std::int64_t TimeOf(const ModuleEvent& event) {
  const std::int64_t ago = NowBy(CLOCK_BOOTTIME) - static_cast<std::int64_t>(event.time);
  return (NowBy(CLOCK_REALTIME) - ago) / kSecond;
}

std::optional<InstalledDomain> ReadDomain(unsigned int id) {
  if (LinuxHost::IsStateMissing()) return std::nullopt;
  try {
    TeskAccessInterfaceImpl access;
    return SecPolicyCli::ReadInstalledDomain(SecPolicy::GetDomainNameForID(id), access);
  } catch (const BraxoException&) {
    return std::nullopt;
  }
}

void AddLabel(Enforce::EventNames& names, const ModuleEvent& event,
              TeskAccessInterfaceImpl& access) {
  if (event.label < kFirstLabel) return;
  names.label = access.GetLabel(event.label, TESKACCESS_LABEL_OBJECT);
  names.labelIsBuiltIn = access.IsPredefinedLabel(names.label, TESKACCESS_LABEL_OBJECT);
}

void AddEntered(Enforce::EventNames& names, const ModuleEvent& event,
                TeskAccessInterfaceImpl& access) {
  if (event.act != Enforce::kActEnter) return;
  names.domain = SecPolicy::GetDomainNameForID(static_cast<unsigned int>(event.value));
  names.ways = Policy::ReadTransitionsInto(names.domain, access);
}

Enforce::EventNames NamesOf(const ModuleEvent& event) {
  Enforce::EventNames names;
  if (LinuxHost::IsStateMissing()) return names;
  try {
    TeskAccessInterfaceImpl access;
    AddLabel(names, event, access);
    AddEntered(names, event, access);
  } catch (const BraxoException&) {
    return names;
  }
  return names;
}

// Of the uses that were asked for at once, the first that the rules refuse.
Question Refused(const std::vector<Question>& asked, const InstalledDomain& domain) {
  for (const Question& question : asked) {
    if (!Policy::Decide(question, domain).granted) return question;
  }
  return asked.front();
}

// Of what no question can be asked.
std::string ActOf(const ModuleEvent& event) {
  switch (event.act) {
    case Enforce::kActReachModule:
      return "reach what enforces the policy, or past it";
    case Enforce::kActPassPorts:
      return "use a socket whose ports nobody sees (family " + std::to_string(event.value) +
             ", type " + std::to_string(event.detail) + ")";
    case Enforce::kActReachSocket:
      return "reach a unix socket without a path that was named in another domain";
    case Enforce::kActUseFile:
    case Enforce::kActMakeFile:
    case Enforce::kActMakeSocket:
      return "use or make a file without a known path or label";
    default:
      return "do something that has no name here (" + std::to_string(event.act) + ")";
  }
}

std::string Joined(const std::vector<std::string>& parts) {
  std::string text;
  for (const std::string& part : parts) text += (text.empty() ? "" : "; ") + part;
  return text;
}

std::string ReasonOf(const Decision& decision, const InstalledDomain& domain) {
  std::vector<std::string> rules;
  for (const Policy::Vote& vote : decision.votes) rules.push_back(SecPolicyCli::Cite(vote.rule));
  if (decision.granted) {
    const std::string rule = rules.empty() ? "" : ": " + Joined(rules);
    return "by now the rules grant it" + rule;
  }
  if (!rules.empty()) return Joined(rules);
  for (const Policy::Rule& rule : decision.missing) rules.push_back(rule.Text());
  return "missing in " + SecPolicyCli::OutsidePath(SecPolicyCli::PolicyFileOf(domain)) + ": " +
         SecPolicyCli::ListOf(rules, "or");
}

void AddAnswer(ExplainedRefusal& explained, const Question& question,
               const InstalledDomain& domain) {
  const Decision decision = Policy::Decide(question, domain);
  explained.reason = ReasonOf(decision, domain);
  explained.answer = SecPolicyCli::AnswerToJson(domain, decision);
  explained.file = SecPolicyCli::PolicyFileOf(domain);
  if (decision.votes.empty()) return;
  const Policy::Origin& origin = decision.votes.front().rule.origin;
  explained.file = origin.file;
  explained.line = origin.line;
}

// The kernel asks for a narrow capability first, and then for a wider one.
bool IsAskedOnceMore(const ModuleEvent& event, const Question& question,
                     const InstalledDomain& domain) {
  return event.act == Enforce::kActUseCapability && !Policy::Decide(question, domain).granted &&
         SecPolicyCli::IsGranted(question, domain);
}

SecPolicyCli::RefusedAct RefusedBy(const GatheredRefusal& gathered) {
  const ModuleEvent& event = gathered.event;
  return {.time = TimeOf(event),
          .count = static_cast<std::int64_t>(gathered.count),
          .isRefused = event.isRefused != 0,
          .isOfNoRule = Enforce::IsOfNoRule(event),
          .act = ActOf(event),
          .path = gathered.path,
          .process = {.id = event.process,
                      .parent = event.parent,
                      .user = event.user,
                      .program = {event.program, strnlen(event.program, sizeof event.program)},
                      .path = gathered.programPath,
                      .parentProgram = gathered.parentPath}};
}

}  // namespace

void Explainer::Renew() {
  if (mark && !LinuxHost::ChangedSince(*mark)) return;
  domains.clear();
  mark.reset();
  if (LinuxHost::IsStateMissing()) return;
  try {
    mark = LinuxHost::TakeChangeMark();
  } catch (const BraxoException&) {
    return;
  }
}

const InstalledDomain* Explainer::FindDomain(unsigned int id) {
  Renew();
  auto found = domains.find(id);
  if (found == domains.end()) found = domains.emplace(id, ReadDomain(id)).first;
  return found->second ? &*found->second : nullptr;
}

std::string Explainer::NameOfDomain(unsigned int id) {
  const InstalledDomain* const domain = FindDomain(id);
  return domain == nullptr ? std::to_string(id) : domain->name;
}

std::optional<ExplainedRefusal> Explainer::Explain(const GatheredRefusal& gathered) {
  ExplainedRefusal explained = {.refused = RefusedBy(gathered)};
  const InstalledDomain* const domain = FindDomain(gathered.event.domain);
  const Enforce::EventNames names = NamesOf(gathered.event);
  explained.refused.domain =
      domain == nullptr ? std::to_string(gathered.event.domain) : domain->name;
  explained.refused.label = names.label;
  const auto asked = Enforce::QuestionsOf(gathered.event, gathered.path, names);
  if (asked.empty()) {
    explained.reason = explained.refused.isOfNoRule ? "no rule grants it" : "";
    return explained;
  }
  const Question question = domain == nullptr ? asked.front() : Refused(asked, *domain);
  explained.refused.question = SecPolicyCli::WordsOf(question);
  if (domain == nullptr) {
    explained.reason = "there is no such domain any more";
    return explained;
  }
  if (IsAskedOnceMore(gathered.event, question, *domain)) return std::nullopt;
  AddAnswer(explained, question, *domain);
  return explained;
}

}  // namespace SecPolicyLog
