#include "support/fixed_roots.h"

#include <fcntl.h>
#include <sched.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <stdexcept>

namespace SecPolicyTest {
namespace {

void Check(bool succeeded, const char* what) {
  if (!succeeded) throw std::runtime_error(std::string(what) + ": " + std::strerror(errno));
}

bool MayChangeRoot() { return chroot("/") == 0; }

// Makes the user root in a namespace of its own.
bool EnterUserNamespace() {
  const std::string user = "0 " + std::to_string(geteuid()) + " 1\n";
  const std::string group = "0 " + std::to_string(getegid()) + " 1\n";
  if (unshare(CLONE_NEWUSER) != 0) return false;
  std::ofstream("/proc/self/setgroups") << "deny";
  std::ofstream("/proc/self/uid_map") << user;
  std::ofstream("/proc/self/gid_map") << group;
  return true;
}

}  // namespace

FixedRoots::FixedRoots(std::initializer_list<TreeEntry> entries)
    : outerRoot(open("/", O_PATH | O_DIRECTORY | O_CLOEXEC)),
      outerDirectory(open(".", O_PATH | O_DIRECTORY | O_CLOEXEC)) {
  Write("/etc/zorvan/secpolicy/", "");
  Write("/tardisks/", "");
  Write("/tmp/", "");
  for (const TreeEntry& entry : entries) Write(entry.path, entry.text);
  Check(outerRoot >= 0 && outerDirectory >= 0, "open");
  Check(chroot(tree.Root().c_str()) == 0, "chroot");
  Check(chdir("/") == 0, "chdir");
  inside = true;
}

FixedRoots::~FixedRoots() {
  // The tree is removed by its outer path, so the way back comes first, or nothing may be removed.
  if (fchdir(outerRoot) != 0 || chroot(".") != 0 || fchdir(outerDirectory) != 0) std::abort();
  close(outerRoot);
  close(outerDirectory);
}

void FixedRoots::Write(const std::string& path, const std::string& text) const {
  WriteTreeEntry(inside ? path : tree.Root() + path, text);
}

std::string FixedRoots::WhyNot() {
  if (MayChangeRoot() || (EnterUserNamespace() && MayChangeRoot())) return {};
  return std::string("skipped: the root directory cannot be changed: ") + std::strerror(errno);
}

void FixedRootsTest::SetUp() {
  const std::string reason = FixedRoots::WhyNot();
  if (!reason.empty()) GTEST_SKIP() << reason;
}

}  // namespace SecPolicyTest
