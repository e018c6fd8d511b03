// Messages and headers: in which words, on which stream and in which log, in what order and
// whether flushed; and what the exceptions carry.

#include "secpolicy/report.h"

#include <gmock/gmock.h>

#include <type_traits>

#include "secpolicy/secpolicy.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

using Braxo::Lib::KweMessage;
using SecPolicy::SecPolicyRetryException;

// Any address will do: nobody looks into an event message.
KweMessage SomeMessage() {
  return KweMessage(std::make_shared<int>(7), static_cast<Braxo::Lib::KweMessageBody*>(nullptr));
}

class RetryWithMessage : public SecPolicyRetryException {
 public:
  RetryWithMessage() : SecPolicyRetryException("again", SomeMessage()) {}
};

// ---- Information.

TEST(SecpolicyInfo, GoesToRunningSyslogAsArgument) {
  ScriptedHost host;
  const Transcript run = Record([] { SecPolicy::SecpolicyInfo("Using policy dir /etc"); });
  EXPECT_EQ(run.Text(), Lines({
                            R"(syslog(LOG_INFO, "%s", "Using policy dir /etc"))",
                            "returns",
                        }));
}

TEST(SecpolicyInfo, GoesToKernelLogWhileSyslogIsDown) {
  ScriptedHost host;
  host.syslogRunning = false;
  const Transcript run = Record([] { SecPolicy::SecpolicyInfo("Using policy dir /etc"); });
  EXPECT_EQ(run.Text(), Lines({
                            R"(WriteToKlog("Using policy dir /etc", "[INFO]"))",
                            "returns",
                        }));
}

TEST(SecpolicyInfo, IsNeverWrittenToTheStandardStreams) {
  ScriptedHost host;
  SecPolicy::SecpolicyInfo("one");
  host.syslogRunning = false;
  SecPolicy::SecpolicyInfo("two");
  EXPECT_EQ(host.StandardOutput(), "");
  EXPECT_EQ(host.StandardError(), "");

  SecPolicy::SecpolicyError("three");
  EXPECT_EQ(host.StandardError(), "Error: three\n");
}

TEST(SecpolicyInfo, LogsPercentSignsLiterally) {
  ScriptedHost host;
  const Transcript run = Record([] { SecPolicy::SecpolicyInfo("100%s %n %d"); });
  EXPECT_EQ(run.Text(), Lines({
                            R"(syslog(LOG_INFO, "%s", "100%s %n %d"))",
                            "returns",
                        }));
}

TEST(SecpolicyInfo, LogsAnEmptyMessage) {
  ScriptedHost host;
  const Transcript run = Record([] { SecPolicy::SecpolicyInfo(""); });
  EXPECT_EQ(run.Text(), Lines({
                            R"(syslog(LOG_INFO, "%s", ""))",
                            "returns",
                        }));
}

TEST(SecpolicyInfo, PassesOnWhatTheKernelLogThrows) {
  ScriptedHost host;
  host.syslogRunning = false;
  host.Fail("WriteToKlog", "log full");
  const Transcript run = Record([] { SecPolicy::SecpolicyInfo("hello"); });
  EXPECT_EQ(run.Text(), Lines({
                            R"(WriteToKlog("hello", "[INFO]"))",
                            "throws Braxo::Lib::BraxoException: log full",
                        }));
}

// ---- Errors.

TEST(SecpolicyError, GoesToStandardErrorAndRunningSyslog) {
  ScriptedHost host;
  const Transcript run = Record([] { SecPolicy::SecpolicyError("disk gone"); });
  EXPECT_EQ(run.Text(), Lines({
                            R"(stderr "Error: disk gone\n")",
                            R"(syslog(LOG_ERR, "Error: %s", "disk gone"))",
                            "returns",
                        }));
}

TEST(SecpolicyError, GoesToStandardErrorAndBareToKernelLogWhileSyslogIsDown) {
  ScriptedHost host;
  host.syslogRunning = false;
  const Transcript run = Record([] { SecPolicy::SecpolicyError("disk gone"); });
  EXPECT_EQ(run.Text(), Lines({
                            R"(stderr "Error: disk gone\n")",
                            R"(WriteToKlog("disk gone", "[ERR]"))",
                            "returns",
                        }));
}

TEST(SecpolicyError, LogsPercentSignsLiterally) {
  ScriptedHost host;
  const Transcript run = Record([] { SecPolicy::SecpolicyError("100%s %n"); });
  EXPECT_EQ(run.Text(), Lines({
                            R"(stderr "Error: 100%s %n\n")",
                            R"(syslog(LOG_ERR, "Error: %s", "100%s %n"))",
                            "returns",
                        }));
}

TEST(SecpolicyError, IsOnStandardErrorBeforeTheKernelLogThrows) {
  ScriptedHost host;
  host.syslogRunning = false;
  host.FailForeign("WriteToKlog");
  const Transcript run = Record([] { SecPolicy::SecpolicyError("disk gone"); });
  EXPECT_EQ(run.Text(), Lines({
                            R"(stderr "Error: disk gone\n")",
                            R"(WriteToKlog("disk gone", "[ERR]"))",
                            "throws SecPolicyTest::ForeignException: foreign",
                        }));
}

TEST(SecpolicyError, WritesNothingToStandardOutput) {
  ScriptedHost host;
  SecPolicy::SecpolicyError("disk gone");
  EXPECT_EQ(host.StandardOutput(), "");

  SecPolicy::DisplayHeader("x", "");
  EXPECT_EQ(host.StandardOutput(), "\n\n-\nx\n-\n");
}

// ---- Headers.

TEST(DisplayHeader, LeavesOutAnEmptySubtitle) {
  ScriptedHost host;
  const Transcript run = Record([] { SecPolicy::DisplayHeader("Objects", ""); });
  EXPECT_EQ(run.Text(), Lines({
                            R"(stdout "\n")",
                            R"(stdout "\n")",
                            R"(stdout "-------\n")",
                            R"(stdout "Objects\n")",
                            R"(stdout "-------\n")",
                            "returns",
                        }));
}

TEST(DisplayHeader, IsAsWideAsALongerSubtitle) {
  ScriptedHost host;
  const Transcript run = Record([] { SecPolicy::DisplayHeader("Domains", "name and rules"); });
  EXPECT_EQ(run.Text(), Lines({
                            R"(stdout "\n")",
                            R"(stdout "\n")",
                            R"(stdout "--------------\n")",
                            R"(stdout "Domains\n")",
                            R"(stdout "name and rules\n")",
                            R"(stdout "--------------\n")",
                            "returns",
                        }));
}

TEST(DisplayHeader, IsAsWideAsALongerTitle) {
  ScriptedHost host;
  SecPolicy::DisplayHeader("Objects Defined: Name (Kernel Id)", "all");
  EXPECT_EQ(host.StandardOutput(),
            "\n\n---------------------------------\nObjects Defined: Name (Kernel Id)\nall\n"
            "---------------------------------\n");
}

TEST(DisplayHeader, HasEmptyRulesWithoutAnyText) {
  ScriptedHost host;
  const Transcript run = Record([] { SecPolicy::DisplayHeader("", ""); });
  EXPECT_EQ(run.Text(), Lines({
                            R"(stdout "\n")",
                            R"(stdout "\n")",
                            R"(stdout "\n")",
                            R"(stdout "\n")",
                            R"(stdout "\n")",
                            "returns",
                        }));
}

TEST(DisplayHeader, KeepsTheTitleLineForASubtitleAlone) {
  ScriptedHost host;
  SecPolicy::DisplayHeader("", "sub");
  EXPECT_EQ(host.StandardOutput(), "\n\n---\n\nsub\n---\n");
}

// ---- The throwers.

TEST(RuleSizeError, ThrowsItsMessage) {
  ScriptedHost host;
  const Transcript run = Record([] { SecPolicy::RuleSizeError(); });
  EXPECT_EQ(run.Text(), Lines({
                            "throws Braxo::Lib::BraxoException: "
                            "incorrect number of arguments for this rule type",
                        }));
}

TEST(RaiseError, ThrowsTheMessageAndReportsNothing) {
  ScriptedHost host;
  const Transcript run = Record([] { SecPolicy::RaiseError("any text"); });
  EXPECT_EQ(run.Text(), Lines({"throws Braxo::Lib::BraxoException: any text"}));
}

// ---- Exception types.

TEST(BraxoException, IsAStandardExceptionWithItsMessage) {
  const BraxoException fromString(std::string("text"));
  const BraxoException fromCharacters("text");
  const std::exception& base = fromString;
  EXPECT_STREQ(base.what(), "text");
  EXPECT_STREQ(fromCharacters.what(), "text");
}

TEST(BraxoException, HasNoEventMessageUnlessGivenOne) {
  EXPECT_EQ(BraxoException(std::string("text")).Message().use_count(), 0);
  EXPECT_EQ(BraxoException("text").Message().use_count(), 0);
  EXPECT_EQ(RetryWithMessage().Message().use_count(), 1);
}

TEST(BraxoException, HoldsTheMessageThenTheHandle) {
  struct Shape {
    virtual ~Shape() = default;
    std::string message;
    KweMessage kweMessage;
  };
  EXPECT_EQ(sizeof(BraxoException), sizeof(Shape));
}

TEST(SecPolicyRetryException, IsABraxoExceptionWithoutFieldsOfItsOwn) {
  EXPECT_TRUE((std::is_base_of_v<BraxoException, SecPolicyRetryException>));
  EXPECT_EQ(sizeof(SecPolicyRetryException), sizeof(BraxoException));
}

TEST(SecPolicyRetryException, HasNoEventMessageUnlessGivenOne) {
  const SecPolicyRetryException plain("again");
  EXPECT_STREQ(plain.what(), "again");
  EXPECT_EQ(plain.Message().use_count(), 0);
}

TEST(SecPolicyRetryException, SharesTheEventMessage) {
  const KweMessage message = SomeMessage();
  EXPECT_EQ(message.use_count(), 1);
  {
    const SecPolicyRetryException retry("again", message);
    EXPECT_STREQ(retry.what(), "again");
    EXPECT_EQ(message.use_count(), 2);
  }
  EXPECT_EQ(message.use_count(), 1);
}

TEST(SecPolicyRetryException, SharesTheEventMessageWithItsCopies) {
  const KweMessage message = SomeMessage();
  const SecPolicyRetryException retry("again", message);
  const SecPolicyRetryException copy(retry);
  EXPECT_STREQ(copy.what(), "again");
  EXPECT_EQ(message.use_count(), 3);
}

}  // namespace
}  // namespace SecPolicyTest
