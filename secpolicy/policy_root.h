#pragma once

namespace SecPolicy {

// The roots are fixed: a host has one policy. The early root is what boot scripts give to the early
// load.
inline constexpr char kPolicyRoot[] = "/etc/zorvan/secpolicy";
inline constexpr char kEarlyPolicyRoot[] = "/etc/zorvan/secpolicy/early";
inline constexpr char kPartnerDomainsDir[] = "/etc/zorvan/secpolicy/domains/plugins";

// Stands before the names of partner domains, which so cannot take one of the host's own.
inline constexpr char kPartnerPrefix[] = "plugin-";

// The directories under a policy root.
inline constexpr char kObjectsDir[] = "objects";
inline constexpr char kDomainsDir[] = "domains";
inline constexpr char kTardisksDir[] = "tardisks";
inline constexpr char kFileLabelsDir[] = "fileLabels";

// The directories of the fixed root that have a part of its policy to themselves: partner domains,
// under its domains, and the early policy.
inline constexpr char kPartnersDir[] = "plugins";
inline constexpr char kEarlyDir[] = "early";

// Where the tardisks themselves lie.
inline constexpr char kTardiskImagesDir[] = "/tardisks/";

// The domains that every host needs: a load asks for them by name, in this order.
inline constexpr const char* kNeededDomains[] = {"globalVMDom", "ioFilterDom", "appDom",
                                                 "daemonFrameworkDom"};

}  // namespace SecPolicy
