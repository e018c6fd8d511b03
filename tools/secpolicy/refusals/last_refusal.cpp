#include "last_refusal.h"

#include <iostream>
#include <utility>

#include "host/linux/operation/latest_refusals.h"
#include "query/answer.h"
#include "query/named.h"
#include "query/question.h"
#include "refusal.h"
#include "refused_act.h"
#include "root.h"
#include "text/format.h"
#include "text/visible.h"

namespace SecPolicyCli {
namespace {

using Policy::Decision;
using Policy::InstalledDomain;

void WriteLine(const std::string& text) { std::cout << Visible(text) << '\n'; }

RefusedAct RequireLatest(const std::string& domain) {
  const auto lines = LinuxHost::ReadLatestRefusals();
  auto latest = FindLatest(lines.value_or(""), domain);
  if (latest) return std::move(*latest);
  const std::string none = "no refusal" + (domain.empty() ? "" : " in " + domain);
  if (lines) {
    throw Refusal(none + " is among the latest, which are in " +
                  OutsidePath(LinuxHost::LatestRefusalsFile()));
  }
  throw Refusal(none +
                " is known: secpolicy-log notes them while it runs, "
                "which 'systemctl enable --now secpolicy-log' sees to");
}

// The label that decided then.
void WriteFormerLabel(const RefusedAct& refused, const Question& question) {
  if (!question.file || refused.label.empty() || refused.label == question.file->label) return;
  WriteLine("label when it was refused: " + refused.label);
}

void WriteWithoutQuestion(const RefusedAct& refused) {
  if (refused.isOfNoRule) {
    WriteLine("no: no rule grants to " + refused.act);
  } else {
    WriteLine("which rule decides is not known");
  }
}

ExitCode ExplainWithoutQuestion(const RefusedAct& refused, const InstalledDomain& domain,
                                bool isJson) {
  if (isJson) {
    Json json = {{"schema", "secpolicy.why/1"}, {"question", Json()}};
    json.Add(AnswerToJson(domain, Decision()));
    json["refusal"] = ToJson(refused);
    std::cout << json.Text();
  } else {
    WriteLine(UtcTime(refused.time) + ": " + TextOf(refused));
    WriteWithoutQuestion(refused);
  }
  return kFailed;
}

}  // namespace

ExitCode ExplainLastRefusal(const std::string& word, const std::string& format) {
  SecPolicy::TeskAccessInterfaceImpl access;
  const RefusedAct refused = RequireLatest(word.empty() ? "" : FindDomain(word, access).name);
  const InstalledDomain domain = RequireInstalledDomain(refused.domain, access);
  const bool isJson = format == "json";
  if (refused.question.empty()) return ExplainWithoutQuestion(refused, domain, isJson);
  const Question question = ReadQuestion(refused.question, access);
  const Decision decision = Policy::Decide(question.asked, domain);
  if (isJson) {
    Json json = WhyToJson(question, domain, decision);
    json["refusal"] = ToJson(refused);
    std::cout << json.Text();
  } else {
    WriteLine(UtcTime(refused.time) + ": " + TextOf(refused));
    WriteAnswer(question, domain, decision, std::cout);
    WriteFormerLabel(refused, question);
  }
  return decision.IsAllowed() ? kWell : kFailed;
}

}  // namespace SecPolicyCli
