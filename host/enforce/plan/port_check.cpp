#include "host/enforce/plan/port_check.h"

namespace Enforce {
namespace {

constexpr std::uint32_t kLastPort = 65'535;

}  // namespace

bool PortCheck::IsOpen() const { return passing.Count() == std::uint64_t{kLastPort} + 1; }

bool IsPortCheck(std::string_view check) { return check == kBindPort || check == kConnectPort; }

PortCheck ReadPortCheck(const Policy::InstalledDomain& domain, std::string_view check) {
  std::vector<const Policy::Rule*> rules = RulesOfCheck(domain.rules, check);
  ValueSet passing = PassingValues(rules).Within(ValueSet({{0, kLastPort}}));
  return {std::move(rules), std::move(passing)};
}

}  // namespace Enforce
