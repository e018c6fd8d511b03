// Exceptions that are thrown in libsecpolicy.so, or in the host's library behind it, and caught in
// a program by their own type or by a base.

#include <gtest/gtest.h>

#include <cstdlib>
#include <memory>
#include <string>
#include <typeinfo>

#include "secpolicy/secpolicy.h"
#include "support/message_of.h"
#include "support/temporary_directory.h"

namespace SecPolicyTest {
namespace {

using Braxo::Lib::BraxoException;
using SecPolicy::SecPolicyRetryException;
using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;

TEST(ExceptionBorder, LetsAFailureBeCaughtByItsType) {
  std::map<unsigned int, std::queue<std::string>> parsed;
  std::string caught;
  try {
    SecPolicy::ParseFile("/nowhere/policy", parsed);
  } catch (const BraxoException& failure) {
    EXPECT_TRUE(typeid(failure) == typeid(BraxoException));
    caught = failure.what();
  }
  EXPECT_EQ(caught, "Unable to open policy file /nowhere/policy");
}

TEST(ExceptionBorder, LetsAFailureBeCaughtAsAStandardException) {
  std::string caught;
  try {
    SecPolicy::RuleSizeError();
  } catch (const std::exception& failure) {
    EXPECT_NE(dynamic_cast<const BraxoException*>(&failure), nullptr);
    EXPECT_EQ(dynamic_cast<const SecPolicyRetryException*>(&failure), nullptr);
    caught = failure.what();
  }
  EXPECT_EQ(caught, "incorrect number of arguments for this rule type");
}

// With a host of its own, so that kernel calls have something to fail on.
class ExceptionBorderOnHost : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_EQ(setenv("SECPOLICY_HOST_STATE", (directory / "state/host.db").c_str(), 1), 0);
  }

 private:
  TemporaryDirectory directory;
};

TEST_F(ExceptionBorderOnHost, LetsARetryBeCaughtByItsType) {
  const unsigned int domain = SecPolicy::CreateDomain("job", TESKACCESS_DEFAULT_DOM_NONE);
  SecPolicy::TeskAccess_FileRule rules[2] = {};
  rules[0] = {.path = "/bin/ls", .permission = 0x11};
  rules[1] = {.path = "/bin/cat", .permission = 0x11};
  unsigned int result = 0;
  SecPolicy::AddFilePolicyBatch(0, domain, rules, 2, &result);
  SecPolicy::TeskAccess_FileRule buffer[2] = {};

  std::string caught;
  try {
    SecPolicy::RetrieveFilePolicies(domain, buffer, 1);
  } catch (const SecPolicyRetryException& retry) {
    EXPECT_TRUE(typeid(retry) == typeid(SecPolicyRetryException));
    caught = retry.what();
  }
  EXPECT_EQ(caught, "Failed to retrieve policies from domain:: " + std::to_string(domain) +
                        " : Resource temporarily unavailable");
  EXPECT_EQ(MessageOf([&] { SecPolicy::RetrieveFilePolicies(domain, buffer, 1); }), caught);

  SecPolicy::RetrieveFilePolicies(domain, buffer, 2);
  EXPECT_EQ(buffer[0].permission + buffer[1].permission, 0x22u);
}

TEST_F(ExceptionBorderOnHost, LetsAnotherFailureOfThatCallNotBeARetry) {
  SecPolicy::TeskAccess_FileRule buffer[1] = {};
  std::string caught;
  try {
    SecPolicy::RetrieveFilePolicies(511, buffer, 1);
  } catch (const BraxoException& failure) {
    EXPECT_TRUE(typeid(failure) == typeid(BraxoException));
    caught = failure.what();
  }
  EXPECT_EQ(caught, "Failed to retrieve policies from domain:: 511 : No such file or directory");
}

TEST_F(ExceptionBorderOnHost, LetsAFailureOfTheHostComeThrough) {
  const unsigned int domain = SecPolicy::CreateDomain("job", TESKACCESS_DEFAULT_DOM_NONE);
  EXPECT_NO_THROW(SecPolicy::AddGcomService(domain, "service"));
  EXPECT_EQ(MessageOf([&] { SecPolicy::AddGcomService(domain + 1, "service"); }),
            "unknown domain " + std::to_string(domain + 1));
}

// The class is exported because its objects are the caller's to delete.
TEST(TardiskPolicyBorder, LetsTheCallerDeleteAPolicy) {
  const auto policy = std::make_unique<SecPolicy::TardiskPolicy>("/nowhere/policy");
  EXPECT_EQ(MessageOf([&] { policy->GetBackingTardiskPath(); }),
            "Unable to open policy file /nowhere/policy");
}

}  // namespace
}  // namespace SecPolicyTest
