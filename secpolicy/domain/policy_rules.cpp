#include "secpolicy/domain/policy_rules.h"

#include <utility>

namespace SecPolicy {

void PolicyRules::AddLine(RuleLine& line, TeskAccessInterfaceImpl& access) {
  AddRule(line.line, line.domainName, line.domainId, line.TakeAll(), access);
}

void PolicyRules::AddWords(unsigned int line, const std::string& domainName, unsigned int domainId,
                           std::queue<std::string> args, TeskAccessInterfaceImpl& access) {
  Problem unheard;
  RuleLine words(line, domainName, domainId, std::move(args), unheard);
  AddLine(words, access);
}

}  // namespace SecPolicy
