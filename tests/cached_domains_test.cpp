// The four domains that a load keeps for its host: zero before any load, never mixed up, the
// latest load's.

#include "secpolicy/cached_domains.h"

#include <gmock/gmock.h>

#include <array>

#include "secpolicy/secpolicy.h"

namespace SecPolicyTest {
namespace {

using testing::ElementsAre;

std::array<unsigned int, 4> CachedDomains() {
  return {SecPolicy::GetGlobalVMDomain(), SecPolicy::GetIOFilterDomain(),
          SecPolicy::GetDefaultTardiskDomain(), SecPolicy::GetDaemonFrameworkDomain()};
}

// The caches outlive a test, so what a fresh process sees is asked in one.
TEST(CachedDomainsDeathTest, AreZeroBeforeAnyLoad) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  const auto answer = [] {
    const bool allZero = CachedDomains() == std::array<unsigned int, 4>{};
    std::exit(allZero ? 0 : 1);
  };
  EXPECT_EXIT(answer(), testing::ExitedWithCode(0), "");
}

TEST(CachedDomains, AreKeptApart) {
  SecPolicy::CacheGlobalVMDomain(11);
  SecPolicy::CacheIOFilterDomain(12);
  SecPolicy::CacheDefaultTardiskDomain(13);
  SecPolicy::CacheDaemonFrameworkDomain(14);
  EXPECT_THAT(CachedDomains(), ElementsAre(11, 12, 13, 14));
}

TEST(CachedDomains, AreOverwrittenOneByOne) {
  SecPolicy::CacheGlobalVMDomain(11);
  SecPolicy::CacheIOFilterDomain(12);
  SecPolicy::CacheDefaultTardiskDomain(13);
  SecPolicy::CacheDaemonFrameworkDomain(14);

  SecPolicy::CacheIOFilterDomain(4294967295);

  EXPECT_THAT(CachedDomains(), ElementsAre(11, 4294967295, 13, 14));
}

}  // namespace
}  // namespace SecPolicyTest
