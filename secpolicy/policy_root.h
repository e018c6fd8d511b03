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

// Where the tardisks themselves lie.
inline constexpr char kTardiskImagesDir[] = "/tardisks/";

}  // namespace SecPolicy
