#include "secpolicy/cached_domains.h"

#include "secpolicy/secpolicy.h"

namespace SecPolicy {
namespace {

unsigned int globalVMDomain = 0;
unsigned int ioFilterDomain = 0;
unsigned int defaultTardiskDomain = 0;
unsigned int daemonFrameworkDomain = 0;

}  // namespace

unsigned int GetGlobalVMDomain() { return globalVMDomain; }
unsigned int GetIOFilterDomain() { return ioFilterDomain; }
unsigned int GetDefaultTardiskDomain() { return defaultTardiskDomain; }
unsigned int GetDaemonFrameworkDomain() { return daemonFrameworkDomain; }

void CacheGlobalVMDomain(unsigned int id) { globalVMDomain = id; }
void CacheIOFilterDomain(unsigned int id) { ioFilterDomain = id; }
void CacheDefaultTardiskDomain(unsigned int id) { defaultTardiskDomain = id; }
void CacheDaemonFrameworkDomain(unsigned int id) { daemonFrameworkDomain = id; }

}  // namespace SecPolicy
