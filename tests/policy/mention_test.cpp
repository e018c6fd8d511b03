// Hunts rules that speak of something and are not found, and those that are found though they do
// not.

#include "policy/mention.h"

#include <gtest/gtest.h>

namespace PolicyTest {
namespace {

using Policy::Covers;
using Policy::Rule;
using Policy::RuleKind;
using Policy::SpeaksOf;
using Policy::WordKind;

TEST(SpeaksOf, ALabelWhereverItStands) {
  const Rule access{.kind = RuleKind::kObjectAccess, .words = {"key", "read"}, .verdict = true};
  const Rule creation{
      .kind = RuleKind::kFileCreation, .words = {"spool", "key", "regular"}, .verdict = false};
  const Rule transition{
      .kind = RuleKind::kDomainTransition, .words = {"key", "web", "exec"}, .verdict = true};
  const Rule socket{
      .kind = RuleKind::kUnixSocketCreation, .words = {"key", "stream"}, .verdict = true};
  for (const Rule& rule : {access, creation, transition, socket}) {
    EXPECT_TRUE(SpeaksOf(rule, WordKind::kLabel, "key")) << rule.Text();
    EXPECT_FALSE(SpeaksOf(rule, WordKind::kLabel, "other")) << rule.Text();
    EXPECT_FALSE(SpeaksOf(rule, WordKind::kLabel, "read")) << rule.Text();
  }
  EXPECT_TRUE(SpeaksOf(creation, WordKind::kLabel, "spool"));
  EXPECT_TRUE(SpeaksOf(transition, WordKind::kDomain, "web"));
  EXPECT_FALSE(SpeaksOf(transition, WordKind::kLabel, "web"));
}

TEST(SpeaksOf, ASystemCallByItsNameAndByItsSets) {
  const Rule call{.kind = RuleKind::kSyscall, .words = {"openat"}, .verdict = false};
  const Rule set{.kind = RuleKind::kSyscall, .words = {"@file"}, .verdict = true};
  EXPECT_TRUE(SpeaksOf(call, WordKind::kSyscall, "openat"));
  EXPECT_TRUE(SpeaksOf(set, WordKind::kSyscall, "openat"));
  EXPECT_TRUE(SpeaksOf(set, WordKind::kSyscall, "@file"));
  EXPECT_FALSE(SpeaksOf(set, WordKind::kSyscall, "ptrace"));
}

TEST(SpeaksOf, APathFromAboveAndNotFromBeneath) {
  const Rule rule{
      .kind = RuleKind::kFilePath, .words = {"/etc/ssh"}, .verdict = Policy::Permissions()};
  EXPECT_TRUE(SpeaksOf(rule, WordKind::kPath, "/etc/ssh"));
  EXPECT_TRUE(SpeaksOf(rule, WordKind::kPath, "/etc/ssh/key"));
  EXPECT_FALSE(SpeaksOf(rule, WordKind::kPath, "/etc"));
  EXPECT_FALSE(SpeaksOf(rule, WordKind::kPath, "/etc/ssh2"));
  EXPECT_TRUE(Covers("/", "/etc"));
}

}  // namespace
}  // namespace PolicyTest
