// An error that is lost with the process, since standard error was buffered.

#include <gtest/gtest.h>

#include <iostream>

#include "secpolicy/secpolicy.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

// A program may have standard error buffered; an error has to be out before the process can end.
class BufferedStandardError {
 public:
  BufferedStandardError() : before(std::cerr.flags()) { std::cerr << std::nounitbuf; }
  BufferedStandardError(const BufferedStandardError&) = delete;
  BufferedStandardError& operator=(const BufferedStandardError&) = delete;
  ~BufferedStandardError() { std::cerr.flags(before); }

 private:
  std::ios_base::fmtflags before;
};

TEST(SecpolicyError, IsFlushedWhereStandardErrorIsBuffered) {
  ScriptedHost host;
  const BufferedStandardError buffered;

  const Transcript run = Record([] { SecPolicy::SecpolicyError("disk gone"); });

  EXPECT_EQ(run.Text(), Lines({
                            R"(stderr "Error: disk gone\n")",
                            R"(syslog(LOG_ERR, "Error: %s", "disk gone"))",
                            "returns",
                        }));
}

}  // namespace
}  // namespace SecPolicyTest
