#include "check_options.h"

#include "diagnostic.h"

namespace SecPolicyCli {
namespace {

std::string CheckWarningName(const std::string& name) {
  const Code* const code = FindCode(name);
  if (code == nullptr) return WhyNoCode(name);
  if (code->severity == Severity::kWarning) return "";
  return "'" + name + "' is an error: a load does not end well with it";
}

}  // namespace

void AddFresh(Syntax& syntax, bool& fresh) {
  syntax.AddFlag("--fresh", fresh, "Check as after a boot, whatever is installed on this host now");
}

void AddUnwantedCodes(Syntax& syntax, std::vector<std::string>& codes) {
  syntax.AddList("--disable", codes, "Leave out this warning; may be given repeatedly")
      .Check(CheckWarningName)
      .NameValue("CODE")
      .Offer(OfferCodes(true));
}

}  // namespace SecPolicyCli
