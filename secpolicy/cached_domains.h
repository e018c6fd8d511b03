#pragma once

namespace SecPolicy {

// Store the kernel identifier of a well-known domain, which the public getters then return. Only
// the load driver does so.
void CacheGlobalVMDomain(unsigned int id);
void CacheIOFilterDomain(unsigned int id);
void CacheDefaultTardiskDomain(unsigned int id);
void CacheDaemonFrameworkDomain(unsigned int id);

}  // namespace SecPolicy
