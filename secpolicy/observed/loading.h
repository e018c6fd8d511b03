#pragma once

#include "secpolicy/observed/policy_observer.h"
#include "secpolicy/secpolicy.h"

// The loads and displays of secpolicy.h, which see there, with somebody who is told what they do.
namespace SecPolicy {

void LoadPolicy(const std::string& policyDir, PolicyObserver& observer);
// The load of a policy that is to be the host's own: with the partner domains in it.
void LoadPolicyWithPartners(const std::string& policyDir, PolicyObserver& observer);
void LoadPolicyEarly(const std::string& earlyPolicyDir, PolicyObserver& observer);
void RestoreDomainEnforcement(PolicyObserver& observer);
void DisplayPolicy(const std::string& domainName, PolicyObserver& observer);

// Their parts.
void LoadPolicyObjects(const std::string& dir, TeskAccessInterfaceImpl& access,
                       PolicyObserver& observer);
void LoadPolicyDomains(const std::string& dir, TeskAccessInterfaceImpl& access,
                       PolicyObserver& observer);
void LoadPartnerPolicyDomains(const std::string& dir, TeskAccessInterfaceImpl& access,
                              PolicyObserver& observer);
void LoadPolicyTardisks(const std::string& dir, TeskAccessInterfaceImpl& access,
                        PolicyObserver& observer);
void LoadPolicyFileLabels(const std::string& dir, TeskAccessInterfaceImpl& access,
                          PolicyObserver& observer);
void GetAllTardisks(std::list<std::string>& tardisks, PolicyObserver& observer);
void GetTardiskLists(const std::string& policyDir, std::list<TardiskPolicy*>& policies,
                     std::list<std::string>& unmatched, PolicyObserver& observer);
void ParseAndSetTardiskPolicy(const std::list<TardiskPolicy*>& policies,
                              TeskAccessInterfaceImpl& access, PolicyObserver& observer);
void SetDefaultTardiskPolicy(const std::list<std::string>& tardisks,
                             TeskAccessInterfaceImpl& access, PolicyObserver& observer);
void DisplayPolicyDomains(TeskAccessInterfaceImpl& access, const std::string& domain,
                          PolicyObserver& observer);
void DisplayDomainPolicy(TeskAccessInterfaceImpl& access, unsigned int id,
                         PolicyObserver& observer);
void DisplayPolicyTardiskLabels(TeskAccessInterfaceImpl& access, PolicyObserver& observer);

}  // namespace SecPolicy
