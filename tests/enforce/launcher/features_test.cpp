// What the kernel can enforce: hunts for a feature that is taken for granted or for missing, and
// for a probe that changes its caller.

#include "host/enforce/features.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>

#include "launch.h"

namespace EnforceTest {
namespace {

using Enforce::Features;
using Enforce::Namespace;
using Enforce::ProbeFeatures;
using Enforce::ProbeMounts;

std::string ContentOf(const std::string& path) {
  std::ifstream file(path);
  return {std::istreambuf_iterator<char>(file), {}};
}

TEST(Features, AreWhatTheKernelTells) {
  const Features features = ProbeFeatures();
  EXPECT_EQ(features.lastCapability, std::stoi(ContentOf("/proc/sys/kernel/cap_last_cap")));
  const std::string answers = ContentOf("/proc/sys/kernel/seccomp/actions_avail");
  EXPECT_EQ(features.seccomp, answers.find("errno") != std::string::npos);
  EXPECT_EQ(features.notifies, answers.find("user_notif") != std::string::npos);
}

TEST(Features, HaveTheCapabilitiesOfTheProcess) {
  const std::string status = ContentOf("/proc/self/status");
  const std::string permitted = status.substr(status.find("CapPrm:") + 7);
  EXPECT_EQ(ProbeFeatures().capabilities, std::stoull(permitted, nullptr, 16));
}

struct Surroundings {
  std::string namespaces;
  std::string mounts;
  std::size_t descriptors;
  bool operator==(const Surroundings&) const = default;
};

Surroundings Look() {
  std::string namespaces;
  for (const char* kind : {"mnt", "user"}) {
    namespaces += std::filesystem::read_symlink(std::string("/proc/self/ns/") + kind);
  }
  const std::filesystem::directory_iterator descriptors("/proc/self/fd");
  return {namespaces, ContentOf("/proc/self/mountinfo"),
          static_cast<std::size_t>(std::distance(begin(descriptors), end(descriptors)))};
}

TEST(Features, HaveNoCapabilitiesWhereNoneCanBeRead) {
  if (Lacks()) GTEST_SKIP() << Lacks();
  WithoutCalls({SYS_capget}, [] { EXPECT_EQ(ProbeFeatures().capabilities, 0U); });
}

TEST(Features, AreProbedWithoutATrace) {
  const Surroundings before = Look();
  static_cast<void>(ProbeFeatures());
  static_cast<void>(ProbeMounts());
  EXPECT_EQ(Look(), before);
  EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1) << "no child is left";
}

// What a child process that is nobody finds.
struct Found {
  Features features;
  Namespace mounts = Namespace::kNone;
};

Found ProbeAsNobody() {
  int channel[2];
  EXPECT_EQ(pipe2(channel, O_CLOEXEC), 0);
  const pid_t child = fork();
  if (child == 0) {
    if (setresuid(65534, 65534, 65534) != 0) _exit(1);
    const Found found = {ProbeFeatures(), ProbeMounts()};
    _exit(write(channel[1], &found, sizeof(found)) == sizeof(found) ? 0 : 1);
  }
  close(channel[1]);
  Found found;
  EXPECT_EQ(read(channel[0], &found, sizeof(found)), sizeof(found));
  close(channel[0]);
  waitpid(child, nullptr, 0);
  return found;
}

TEST(Features, DependOnTheUser) {
  if (geteuid() != 0) GTEST_SKIP() << "needs root to be somebody else";
  const Features root = ProbeFeatures();
  const auto [nobody, mounts] = ProbeAsNobody();
  EXPECT_EQ(ProbeMounts(), Namespace::kPrivileged);
  EXPECT_NE(mounts, Namespace::kPrivileged);
  EXPECT_EQ(nobody.capabilities, 0);
  EXPECT_EQ(nobody.landlock, root.landlock);
  EXPECT_EQ(nobody.seccomp, root.seccomp);
}

}  // namespace
}  // namespace EnforceTest
