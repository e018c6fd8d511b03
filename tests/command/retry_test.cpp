// Hunts a call that is given up though it asked for another try, and one that is tried for ever.

#include "runtime/retry.h"

#include <gmock/gmock.h>

#include "support/message_of.h"

namespace {

using SecPolicyCli::Retry;
using SecPolicyTest::MessageOf;

TEST(Retry, ReturnsWhatTheFirstTryReturns) {
  int tries = 0;
  EXPECT_EQ(Retry([&] { return ++tries; }), 1);
}

TEST(Retry, TriesAgainWhereItIsAskedTo) {
  int tries = 0;
  const int result = Retry([&] {
    if (++tries < 5) throw SecPolicy::SecPolicyRetryException("busy");
    return tries;
  });
  EXPECT_EQ(result, 5);
}

TEST(Retry, GivesUpAfterFiveTriesAndSaysSo) {
  int tries = 0;
  const auto attempt = [&]() -> int {
    ++tries;
    throw SecPolicy::SecPolicyRetryException("busy");
  };
  EXPECT_EQ(MessageOf([&] { Retry(attempt); }),
            "busy. Others changed it at each of 5 tries: run it again when they are done");
  EXPECT_EQ(tries, 5);
}

TEST(Retry, DoesNotRepeatAnotherFailure) {
  int tries = 0;
  const auto attempt = [&]() -> int {
    ++tries;
    throw Braxo::Lib::BraxoException("broken");
  };
  EXPECT_EQ(MessageOf([&] { Retry(attempt); }), "broken");
  EXPECT_EQ(tries, 1);
}

}  // namespace
