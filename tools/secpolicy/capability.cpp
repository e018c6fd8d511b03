#include <memory>
#include <string>

#include "command_line.h"
#include "policy/limits.h"
#include "policy_dir.h"
#include "query/ask.h"
#include "query/named.h"
#include "query/question.h"
#include "root.h"
#include "runtime/change.h"
#include "secpolicy/policy_root.h"
#include "verb.h"

namespace SecPolicyCli {
namespace {

// The capabilities that the runtime interface does not know came after it.
std::string WhyNotSet(const NamedDomain& domain, const NumberedWord& capability,
                      const char* decision) {
  if (capability.number < Policy::kRuntimeCapabilities) return "";
  return "Only a policy file can name " + capability.word + ": write '-c " + capability.word + " " +
         decision + "' into " + OutsidePath(DomainFile(domain.name, SecPolicy::kPolicyRoot)) +
         " and load it";
}

ExitCode Set(const std::string& verb, const std::string& domainWord, const std::string& word,
             bool grant) {
  SecPolicy::TeskAccessInterfaceImpl access;
  const NamedDomain domain = FindDomain(domainWord, access);
  const NumberedWord capability = FindNumberedWord(Policy::WordKind::kCapability, word, access);
  return Change(
      verb,
      [&] {
        SecPolicy::SetCapRule(domain.id, SecPolicy::TeskAccess_Capability{capability.number},
                              grant ? 1 : 0);
      },
      [&] { return WhyNotSet(domain, capability, grant ? "grant" : "revoke"); });
}

Action DefineSet(Syntax& syntax, const char* verb, bool grant) {
  const auto domain = AddDomain(syntax);
  const auto capability = std::make_shared<std::string>();
  syntax.AddOption("CAPABILITY", *capability, "The capability, as 'secpolicy words' lists it")
      .Require();
  return [=] { return Ask(verb, [=] { return Set(verb, *domain, *capability, grant); }); };
}

const Kind kGrant = {
    "grant", "Grant a domain a capability",
    "As the line '-c CAPABILITY grant' of a policy file does; what revoked the capability goes.\n"
    "\n"
    "Example:\n"
    "  secpolicy capability grant job7 cap_net_bind_service",
    [](Syntax& syntax) { return DefineSet(syntax, "capability grant", true); }};

const Kind kRevoke = {"revoke", "Revoke a capability of a domain",
                      "As the line '-c CAPABILITY revoke' of a policy file does; what granted the "
                      "capability goes, and\n"
                      "a rule that revokes it stays in its place.\n"
                      "\n"
                      "Example:\n"
                      "  secpolicy capability revoke job7 cap_net_bind_service",
                      [](Syntax& syntax) { return DefineSet(syntax, "capability revoke", false); }};

Action Define(Syntax& syntax) { return syntax.AddKinds(std::vector<Kind>{kGrant, kRevoke}); }

}  // namespace

const Verb kCapability = {
    "capability", "Grant and revoke capabilities of domains while the system runs",
    "What services do by the library's runtime interface, which knows the 19 capabilities that "
    "were\n"
    "there first. A DOMAIN is its name or its number. What is changed counts at once for who "
    "enters\n"
    "the domain, and until the next boot; 'secpolicy domain show' lists what is granted.\n"
    "\n"
    "Examples:\n"
    "  secpolicy capability grant job7 cap_net_bind_service\n"
    "  secpolicy capability revoke job7 cap_net_bind_service",
    Define};

}  // namespace SecPolicyCli
