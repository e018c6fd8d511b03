// A directory that is opened before it carries its label.

#include <gtest/gtest.h>
#include <sys/inotify.h>
#include <unistd.h>

#include <array>
#include <cerrno>

#include "secpolicy/secpolicy.h"
#include "support/message_of.h"
#include "support/policy_tree.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

// Tells whether a directory was opened since the watch began.
class OpenWatch {
 public:
  explicit OpenWatch(const std::string& dir) : queue(inotify_init1(IN_NONBLOCK | IN_CLOEXEC)) {
    watching = inotify_add_watch(queue, dir.c_str(), IN_OPEN | IN_ONLYDIR) >= 0;
  }
  OpenWatch(const OpenWatch&) = delete;
  OpenWatch& operator=(const OpenWatch&) = delete;
  ~OpenWatch() { close(queue); }

  bool IsWatching() const { return watching; }

  bool WasOpened() const {
    alignas(inotify_event) std::array<char, 4096> events;
    return read(queue, events.data(), events.size()) > 0;
  }

 private:
  int queue;
  bool watching;
};

class SetDirLabelRecursiveOpening : public testing::Test {
 protected:
  void SetUp() override {
    if (!watch.IsWatching()) GTEST_SKIP() << "skipped: directories cannot be watched here";
  }

  ScriptedHost host;
  TeskAccessInterfaceImpl access;
  const PolicyTree tree{{"inner/", ""}};
  const OpenWatch watch{tree / "inner"};
};

TEST_F(SetDirLabelRecursiveOpening, FollowsTheLabel) {
  SecPolicy::SetDirLabelRecursive(tree / "inner", "tool", access);
  EXPECT_TRUE(watch.WasOpened());
}

TEST_F(SetDirLabelRecursiveOpening, DoesNotHappenWithoutTheLabel) {
  host.FailErrno("SetXattr", tree / "inner", ENODATA);
  EXPECT_EQ(MessageOf([&] { SecPolicy::SetDirLabelRecursive(tree / "inner", "tool", access); }),
            "Unable to set file label (tool) for file " + tree / "inner" + ": No data available");
  EXPECT_FALSE(watch.WasOpened());
}

}  // namespace
}  // namespace SecPolicyTest
