#include <iostream>
#include <memory>
#include <string>
#include <vector>

#include "command_line.h"
#include "complete/offer.h"
#include "ending.h"
#include "installed/installed_json.h"
#include "installed/installed_policy.h"
#include "policy/way.h"
#include "query/answer.h"
#include "query/ask.h"
#include "query/named.h"
#include "text/format.h"
#include "text/visible.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

using Policy::Step;

void WriteText(const std::vector<Step>& steps) {
  for (const Step& step : steps) {
    std::cout << Visible(step.from + " -> " + step.To() + ": " + Cite(step.rule)) << '\n';
  }
}

void WriteJson(const std::string& from, const std::string& to,
               const std::optional<std::vector<Step>>& way) {
  Json steps = Json::Array();
  for (const Step& step : way.value_or(std::vector<Step>())) {
    steps.Append({{"from", step.from}, {"to", step.To()}, {"rule", ToJson(step.rule)}});
  }
  const Json document = {{"schema", "secpolicy.path/1"},
                         {"from", from},
                         {"to", to},
                         {"reachable", way.has_value()},
                         {"steps", steps}};
  std::cout << document.Text();
}

ExitCode Answer(const std::string& fromWord, const std::string& toWord, const std::string& format) {
  SecPolicy::TeskAccessInterfaceImpl access;
  const std::string from = FindDomain(fromWord, access).name;
  const std::string to = FindDomain(toWord, access).name;
  const auto way = Policy::FindWay(ReadInstalledPolicy(access), from, to);
  if (format == "json") {
    WriteJson(from, to, way);
  } else if (way) {
    WriteText(*way);
  }
  Summarize("path", way ? CountOf(way->size(), "transition")
                        : "no transitions lead from " + from + " to " + to);
  return way ? kWell : kFailed;
}

Action Define(Syntax& syntax) {
  const auto from = std::make_shared<std::string>();
  const auto to = std::make_shared<std::string>();
  const Offering domains = OfferWordsOf(Policy::WordKind::kDomain);
  syntax.AddOption("FROM", *from, "The domain to begin in, by its name or its number")
      .Require()
      .Offer(domains);
  syntax.AddOption("TO", *to, "The domain to get into").Require().Offer(domains);
  const auto format = AddAnswerFormat(syntax);
  return [=] { return Ask("path", [=] { return Answer(*from, *to, *format); }); };
}

}  // namespace

const Verb kPath = {
    "path", "Find the shortest way from one domain into another by transitions",
    "Prints the transitions, one to a line, each with the rule that grants it and the policy file\n"
    "and line where that was written. What a domain that is not enforcing could do beside its "
    "rules\n"
    "is no way. Exit status: 0 there is a way, 1 there is none, 2 a word is not known.\n"
    "\n"
    "Examples:\n"
    "  secpolicy path hostDom sshDom\n"
    "  secpolicy path sshDom daemonFrameworkDom --format json | jq -r '.steps[].to'",
    Define};

}  // namespace SecPolicyCli
