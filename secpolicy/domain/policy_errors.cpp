#include "secpolicy/domain/policy_errors.h"

#include "braxo/misc/strcat.h"
#include "secpolicy/report.h"

namespace SecPolicy {

using Braxo::Misc::StrCat;

void RaisePolicyParseError(unsigned int line, const std::string& domainName,
                           const std::string& message) {
  RaiseError(
      StrCat("Error in parsing policy for domain: ", domainName, ": ", line, " : ", message));
}

void RaisePolicySetError(unsigned int line, const std::string& domainName,
                         const std::string& message) {
  RaiseError(
      StrCat("Error in setting policy for domain: ", domainName, ": ", line, " : ", message));
}

}  // namespace SecPolicy
