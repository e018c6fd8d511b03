#include "secpolicy/domain/policy_errors.h"

#include "braxo/misc/strcat.h"

namespace SecPolicy {

using Braxo::Misc::StrCat;

void RaisePolicyParseError(unsigned int line, const std::string& domainName,
                           const std::string& message, std::optional<Fault> fault,
                           std::size_t word) {
  throw LineFailure(
      StrCat("Error in parsing policy for domain: ", domainName, ": ", line, " : ", message),
      {.line = line, .fault = fault, .word = word, .reason = message});
}

void RaisePolicySetError(unsigned int line, const std::string& domainName,
                         const std::string& message) {
  const std::string text =
      StrCat("Error in setting policy for domain: ", domainName, ": ", line, " : ", message);
  throw LineFailure(text, {.line = line, .reason = text});
}

}  // namespace SecPolicy
