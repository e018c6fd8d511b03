// A directory that hosts keep their policy in and that the library looks for elsewhere.

#include "secpolicy/policy_root.h"

#include <gtest/gtest.h>

namespace SecPolicyTest {
namespace {

TEST(PolicyRoot, LiesWhereHostsKeepTheirPolicy) {
  EXPECT_STREQ(SecPolicy::kPolicyRoot, "/etc/zorvan/secpolicy");
  EXPECT_STREQ(SecPolicy::kEarlyPolicyRoot, "/etc/zorvan/secpolicy/early");
  EXPECT_STREQ(SecPolicy::kPartnerDomainsDir, "/etc/zorvan/secpolicy/domains/plugins");
  EXPECT_STREQ(SecPolicy::kTardiskImagesDir, "/tardisks/");
}

}  // namespace
}  // namespace SecPolicyTest
