// The attribute that carries a label: one real attribute for each state, errors as the system
// calls give them, and the choice between the two kinds.

#include "host/linux/files/security_attribute.h"

#include <gtest/gtest.h>
#include <linux/capability.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <cstring>

#include "label_calls.h"
#include "scratch_root.h"
#include "zorvan/kernel.h"

namespace LinuxHostTest {
namespace {

using Zorvan::Kernel::GetXattr;
using Zorvan::Kernel::SetXattr;

constexpr std::uint32_t kValue = 0x12345678;

int Put(const char* path, int flags) {
  return SetXattr(path, kLabelName, &kValue, sizeof kValue, flags);
}

// The real attributes that `path` carries.
std::string RealNames(const char* path) {
  std::string names;
  for (const char* name : {"security.bpf.zorvan", "user.zorvan.security"}) {
    if (getxattr(path, name, nullptr, 0) == sizeof kValue) names += std::string(name) + " ";
  }
  return names;
}

// Gives up the right to write attributes of the system.
bool DropSystemAdministration() {
  __user_cap_header_struct header{_LINUX_CAPABILITY_VERSION_3, 0};
  __user_cap_data_struct data[2];
  if (syscall(SYS_capget, &header, data) != 0) return false;
  data[0].effective &= ~(1U << CAP_SYS_ADMIN);
  data[0].permitted &= ~(1U << CAP_SYS_ADMIN);
  return syscall(SYS_capset, &header, data) == 0;
}

class SecurityAttribute : public ScratchRootTest {
 protected:
  void SetUp() override { scratch.Write("file", "text"); }
};

TEST_F(SecurityAttribute, IsReadAsWritten) {
  EXPECT_EQ(Run([] {
              std::uint32_t value = 0;
              const std::string set = Told(Put("file", 0));
              const std::string got = Told(GetXattr("file", kLabelName, &value, sizeof value));
              return set + " " + got + (value == kValue ? " same" : " different");
            }),
            "0 4 same");
}

TEST_F(SecurityAttribute, IsOneRealAttribute) {
  const std::string names = Run([] {
    Put("file", 0);
    return RealNames("file");
  });
  EXPECT_TRUE(names == "security.bpf.zorvan " || names == "user.zorvan.security ") << names;
}

TEST_F(SecurityAttribute, IsReplacedOnlyWhereItIs) {
  EXPECT_EQ(Run([] { return Told(Put("file", XATTR_REPLACE)); }), "ENODATA");
  EXPECT_EQ(Run([] { return Told(Put("file", XATTR_CREATE)); }), "0");
  EXPECT_EQ(Run([] { return Told(Put("file", XATTR_REPLACE)); }), "0");
  EXPECT_EQ(Run([] { return Told(Put("file", XATTR_CREATE)); }), "EEXIST");
}

TEST_F(SecurityAttribute, FailsAsTheSystemCallsDo) {
  EXPECT_EQ(Run([] { return Told(Put("missing", 0)); }), "ENOENT");
  EXPECT_EQ(Run([] { return Told(Put("file/below", 0)); }), "ENOTDIR");
  EXPECT_EQ(Run([] { return Told(Put("", 0)); }), "ENOENT");
  EXPECT_EQ(Run([] { return Told(Put("file", 0x1000)); }), "EINVAL");
  EXPECT_EQ(Run([] { return Told(GetXattr("missing", kLabelName, nullptr, 0)); }), "ENOENT");
  EXPECT_EQ(Run([] { return Told(GetXattr("file", kLabelName, nullptr, 0)); }), "ENODATA");
}

TEST_F(SecurityAttribute, NeedsBufferThatIsLargeEnough) {
  Run([] { return Told(Put("file", 0)); });
  EXPECT_EQ(Run([] { return Told(GetXattr("file", kLabelName, nullptr, 0)); }), "4");
  EXPECT_EQ(Run([] {
              char buffer[3];
              return Told(GetXattr("file", kLabelName, buffer, sizeof buffer));
            }),
            "ERANGE");
}

TEST_F(SecurityAttribute, IsFoundThroughLinks) {
  std::filesystem::create_symlink("file", scratch.Root() / "link");
  EXPECT_EQ(Run([] {
              Put("link", 0);
              return Told(GetXattr("file", kLabelName, nullptr, 0));
            }),
            "4");
}

TEST_F(SecurityAttribute, ReplacesTheFormerOneWhateverItHolds) {
  const std::string left = Run([]() -> std::string {
    const std::string attribute = LinuxHost::LabelAttribute();
    if (attribute != "security.bpf.zorvan") return "ENODATA ENODATA";
    std::string told;
    for (const std::string value : {"text", ""}) {
      if (setxattr("file", "security.zorvan", value.data(), value.size(), 0) != 0) return "unset";
      LinuxHost::GiveFirstLabel("file", attribute);
      told += (told.empty() ? "" : " ") + Told(getxattr("file", "security.zorvan", nullptr, 0));
    }
    return told;
  });
  EXPECT_EQ(left, "ENODATA ENODATA");
}

TEST_F(SecurityAttribute, IsTheOnlyOneThereIs) {
  EXPECT_EQ(Run([] { return Told(SetXattr("file", "user.other", &kValue, 4, 0)); }), "EOPNOTSUPP");
  EXPECT_EQ(Run([] { return Told(GetXattr("file", "zorvan.securit", nullptr, 0)); }), "EOPNOTSUPP");
  EXPECT_EQ(Run([] { return Told(SetXattr("file", nullptr, &kValue, 4, 0)); }), "EFAULT");
}

TEST_F(SecurityAttribute, FailsWithoutState) {
  EXPECT_EQ(Run([] {
              setenv("SECPOLICY_HOST_STATE", "not/absolute", 1);
              return Told(Put("file", 0));
            }),
            "EINVAL");
}

// The choice is the state's, not the process's.

TEST_F(SecurityAttribute, IsTheUsersOwnWithoutPrivilege) {
  EXPECT_EQ(Run([]() -> std::string {
              if (!DropSystemAdministration()) return "(rights cannot be dropped)";
              Put("file", 0);
              return RealNames("file");
            }),
            "user.zorvan.security ");
  EXPECT_EQ(Run([] {
              Put("file", XATTR_REPLACE);
              return RealNames("file");
            }),
            "user.zorvan.security ");
}

TEST_F(SecurityAttribute, StaysPrivilegedOnceChosen) {
  const std::string chosen = Run([] {
    Put("file", 0);
    return RealNames("file");
  });
  if (chosen != "security.bpf.zorvan ") GTEST_SKIP() << "this user may not write system attributes";
  EXPECT_EQ(Run([]() -> std::string {
              if (!DropSystemAdministration()) return "(rights cannot be dropped)";
              return Told(Put("file", XATTR_REPLACE));
            }),
            "EPERM");
}

}  // namespace
}  // namespace LinuxHostTest
