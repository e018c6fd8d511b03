#include "search.h"

#include <utility>

#include "answer.h"

namespace SecPolicyCli {

std::vector<Found> FindDomains(const Question& question, const Policy::InstalledPolicy& policy) {
  std::vector<Found> found;
  for (const Policy::InstalledDomain& domain : policy.domains) {
    Policy::Decision decision = Policy::Decide(question.asked, domain);
    if (decision.IsAllowed()) found.push_back(Found{domain, std::move(decision)});
  }
  return found;
}

Json WhoCanToJson(const Question& question, const std::vector<Found>& found) {
  Json domains = Json::Array();
  for (const auto& [domain, decision] : found) domains.Append(AnswerToJson(domain, decision));
  return {{"schema", "secpolicy.who-can/1"},
          {"question", QuestionToJson(question)},
          {"domains", domains}};
}

}  // namespace SecPolicyCli
