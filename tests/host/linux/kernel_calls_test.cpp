// The numbered kernel calls: bad numbers, counts, addresses and owners are told by their errno,
// and nothing is half done.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <climits>
#include <cstring>
#include <filesystem>
#include <random>

#include "child_process.h"
#include "host/linux/state/domain_table.h"
#include "host/linux/state/host_state.h"
#include "host/linux/state/rule_table.h"
#include "host/linux/state/world_table.h"
#include "secpolicyhost/mode_param.h"
#include "secpolicyhost/values.h"
#include "state_directory.h"
#include "teskctl/security.h"
#include "zorvan/kernel.h"

namespace LinuxHostTest {
namespace {

using LinuxHost::HostState;
using TeskCtl::Security::TeskAccess_CapabilityParamRule;
using TeskCtl::Security::TeskAccess_CapabilityRule;
using TeskCtl::Security::TeskAccess_FileRule;
using TeskCtl::Security::TeskAccess_ModeParam;
using TeskCtl::Security::TeskAccessInterfaceImpl;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using Zorvan::Kernel::Call;

constexpr std::uint32_t kCreateDomain = 0x4059;
constexpr std::uint32_t kDestroyDomain = 0x405a;
constexpr std::uint32_t kUpdateFilePolicy = 0x405b;
constexpr std::uint32_t kRemoveFilePolicy = 0x405c;
constexpr std::uint32_t kRetrieveFilePolicies = 0x405d;
constexpr std::uint32_t kCountFilePolicies = 0x405e;
constexpr std::uint32_t kAddFilePolicies = 0x405f;
constexpr std::uint32_t kSetCapability = 0x4061;
constexpr std::uint32_t kSetParameterCheck = 0x4062;
constexpr std::uint32_t kRetrieveLeaked = 0x4064;
constexpr std::uint32_t kDomainOfWorld = 0x4065;
constexpr std::uint32_t kDomainName = 0x4066;
constexpr std::uint32_t kRePoint = 0x4067;
constexpr std::uint32_t kRemoveParameterCheck = 0x413e;

constexpr std::uint64_t kBadAddress = 8;

template <class Target>
std::uint64_t Address(const Target* pointer) {
  return reinterpret_cast<std::uintptr_t>(pointer);
}

std::uint64_t Widened(int value) {
  return static_cast<std::uint64_t>(static_cast<std::int64_t>(value));
}

// The error number of a call; 0 when it succeeded.
int ErrorOf(std::uint32_t number, std::initializer_list<std::uint64_t> args) {
  const auto result = Call(number, args);
  EXPECT_EQ(result.status == 0, result.error == 0);
  return -result.error;
}

class KernelCalls : public ::testing::Test {
 protected:
  unsigned int Create(const char* name) {
    std::uint32_t id = 0;
    EXPECT_EQ(ErrorOf(kCreateDomain, {Address(name), 0, Address(&id)}), 0);
    return id;
  }

  static TeskAccess_FileRule FileRule(const std::string& path, unsigned int permission) {
    TeskAccess_FileRule rule{};
    path.copy(rule.path, sizeof rule.path);
    rule.permission = permission;
    return rule;
  }

  int Add(int world, const std::vector<TeskAccess_FileRule>& rules) {
    return ErrorOf(kAddFilePolicies, {Widened(world), domain, Address(rules.data()), rules.size(),
                                      Address(&installed)});
  }

  std::vector<std::string> Retrieve() {
    std::uint32_t count = 0;
    EXPECT_EQ(ErrorOf(kCountFilePolicies, {domain, Address(&count)}), 0);
    std::vector<TeskAccess_FileRule> rules(count);
    EXPECT_EQ(ErrorOf(kRetrieveFilePolicies, {domain, Address(rules.data()), count}), 0);
    std::vector<std::string> texts;
    for (const auto& rule : rules) {
      texts.push_back(std::string(rule.path) + " " + std::to_string(rule.permission));
    }
    return texts;
  }

  StateDirectory directory;
  const unsigned int domain = Create("owner");
  std::uint32_t installed = 0;
};

// ---- The entry.

TEST_F(KernelCalls, WithUnknownNumbersAreNotImplemented) {
  for (const std::uint32_t number : {0U, 0x4058U, 0x4060U, 0x4063U, 0x4068U, 0x413dU, ~0U}) {
    EXPECT_EQ(ErrorOf(number, {1, 2, 3}), ENOSYS) << number;
  }
}

TEST_F(KernelCalls, TakeExactlyTheirArguments) {
  EXPECT_EQ(ErrorOf(kDestroyDomain, {}), EINVAL);
  EXPECT_EQ(ErrorOf(kDestroyDomain, {domain, 0}), EINVAL);
  EXPECT_EQ(ErrorOf(kAddFilePolicies, {0, domain, 0, 1}), EINVAL);
}

TEST_F(KernelCalls, LeaveErrnoAlone) {
  errno = E2BIG;
  Call(kDestroyDomain, {kBadAddress});
  EXPECT_EQ(errno, E2BIG);
  Call(kDestroyDomain, {domain});
  EXPECT_EQ(errno, E2BIG);
}

TEST_F(KernelCalls, AnswerAnErrorWhenTheStateCannotBeUsed) {
  const std::string other = directory.Path() + "/other.db";
  std::filesystem::create_directory(other);
  const LinuxHost::UsedState used(other);
  EXPECT_EQ(ErrorOf(kDestroyDomain, {5}), EINVAL);
  const LinuxHost::UsedState missing(directory.Path() + "/missing/too/host.db");
  EXPECT_EQ(ErrorOf(kDestroyDomain, {5}), ENOENT);
}

TEST_F(KernelCalls, SeeWhatAnotherProcessHasJustDone) {
  std::array<char, 64> name{};
  const std::uint64_t next = domain + 1;
  ASSERT_EQ(ErrorOf(kDomainName, {next, Address(name.data()), name.size()}), ENOENT);
  ASSERT_EQ(RunInChild([&] { Create("next"); }), "");
  EXPECT_EQ(ErrorOf(kDomainName, {next, Address(name.data()), name.size()}), 0);
  EXPECT_STREQ(name.data(), "next");

  ASSERT_EQ(RunInChild([&] { Call(kDestroyDomain, {next}); }), "");
  std::uint32_t count = 0;
  EXPECT_EQ(ErrorOf(kCountFilePolicies, {next, Address(&count)}), ENOENT);
  ASSERT_EQ(RunInChild([&] { Create("again"); }), "");
  EXPECT_EQ(ErrorOf(kSetCapability, {next, 0, 1}), 0);
  std::array<std::uint32_t, 4> ids{};
  EXPECT_EQ(ErrorOf(kRetrieveLeaked, {Address(ids.data()), Address(&count), ids.size()}), 0);
  EXPECT_EQ(count, 2U);
}

// ---- Domains.

TEST_F(KernelCalls, CreateAndDestroyDomains) {
  const unsigned int id = Create("guest");
  std::array<char, 64> name{};
  EXPECT_EQ(ErrorOf(kDomainName, {id, Address(name.data()), name.size()}), 0);
  EXPECT_STREQ(name.data(), "guest");
  EXPECT_EQ(ErrorOf(kDestroyDomain, {id}), 0);
  EXPECT_EQ(ErrorOf(kDomainName, {id, Address(name.data()), name.size()}), ENOENT);
  EXPECT_EQ(ErrorOf(kDestroyDomain, {id}), ENOENT);
  EXPECT_EQ(ErrorOf(kDestroyDomain, {0}), EPERM);
}

TEST_F(KernelCalls, RefuseDomainsThatCannotBeCreated) {
  std::uint32_t id = 0;
  const std::string longest(63, 'n');
  const std::string tooLong(64, 'n');
  EXPECT_EQ(ErrorOf(kCreateDomain, {Address("owner"), 0, Address(&id)}), EEXIST);
  EXPECT_EQ(ErrorOf(kCreateDomain, {Address(""), 0, Address(&id)}), EINVAL);
  EXPECT_EQ(ErrorOf(kCreateDomain, {Address(tooLong.c_str()), 0, Address(&id)}), ENAMETOOLONG);
  EXPECT_EQ(ErrorOf(kCreateDomain, {Address(longest.c_str()), 0, Address(&id)}), 0);
  EXPECT_EQ(ErrorOf(kCreateDomain, {Address("x"), 1, Address(&id)}), EINVAL);
  EXPECT_EQ(ErrorOf(kCreateDomain, {Address("x"), 1ULL << 32U, Address(&id)}), EINVAL);
  EXPECT_EQ(ErrorOf(kCreateDomain, {0, 0, Address(&id)}), EFAULT);
}

TEST_F(KernelCalls, CreateNoDomainForACallerThatCannotBeTold) {
  EXPECT_EQ(ErrorOf(kCreateDomain, {Address("lost"), 0, kBadAddress}), EFAULT);
  EXPECT_EQ(HostState::Current().Domains().Find("lost"), nullptr);
}

TEST_F(KernelCalls, AnswerFullWhenAllSlotsAreTaken) {
  for (int number = 0; number < 509; ++number) Create(("d" + std::to_string(number)).c_str());
  std::uint32_t id = 0;
  EXPECT_EQ(ErrorOf(kCreateDomain, {Address("more"), 0, Address(&id)}), ENOSPC);
}

TEST_F(KernelCalls, NameDomainsOnlyWhereTheNameFits) {
  const std::string longest(63, 'n');
  const unsigned int id = Create(longest.c_str());
  std::array<char, 64> name{};
  EXPECT_EQ(ErrorOf(kDomainName, {id, Address(name.data()), 63}), ERANGE);
  EXPECT_THAT(name, Each('\0'));
  EXPECT_EQ(ErrorOf(kDomainName, {id, Address(name.data()), 64}), 0);
  EXPECT_EQ(name.data(), longest);
  EXPECT_EQ(ErrorOf(kDomainName, {id, kBadAddress, 64}), EFAULT);
  EXPECT_EQ(ErrorOf(kDomainName, {1ULL << 32U, Address(name.data()), 64}), EINVAL);
}

TEST_F(KernelCalls, TellTheDomainOfAWorld) {
  std::uint32_t id = 77;
  EXPECT_EQ(ErrorOf(kDomainOfWorld, {Widened(getpid()), Address(&id)}), 0);
  EXPECT_EQ(id, 0U);
  HostState::Current().Worlds().Place(getpid(), domain);
  EXPECT_EQ(ErrorOf(kDomainOfWorld, {Widened(getpid()), Address(&id)}), 0);
  EXPECT_EQ(id, domain);
  EXPECT_EQ(ErrorOf(kDomainOfWorld, {Widened(-1), Address(&id)}), ESRCH);
  EXPECT_EQ(ErrorOf(kDomainOfWorld, {1ULL << 40U, Address(&id)}), EINVAL);
  EXPECT_EQ(ErrorOf(kDomainOfWorld, {INT_MAX, Address(&id)}), ESRCH);
  EXPECT_EQ(ErrorOf(kDomainOfWorld, {INT_MAX + 1ULL, Address(&id)}), EINVAL);
  EXPECT_EQ(ErrorOf(kDomainOfWorld, {Widened(getpid()), kBadAddress}), EFAULT);

  ChildProcess world([] {});
  world.Wait();
  EXPECT_EQ(ErrorOf(kDomainOfWorld, {Widened(world.Id()), Address(&id)}), ESRCH);
}

TEST_F(KernelCalls, PlaceLivingWorldsInDomains) {
  const std::uint32_t place = LinuxHost::kCallPlaceWorld;
  EXPECT_EQ(ErrorOf(place, {Widened(getpid()), domain}), 0);
  EXPECT_EQ(HostState::Current().Worlds().DomainOf(getpid()), domain);
  EXPECT_EQ(ErrorOf(place, {Widened(getpid()), 77}), ENOENT);
  EXPECT_EQ(ErrorOf(place, {Widened(-1), 0}), ESRCH);
  EXPECT_EQ(ErrorOf(place, {Widened(getpid()), 1ULL << 32U}), EINVAL);
  EXPECT_EQ(ErrorOf(place, {Widened(getpid())}), EINVAL);
  EXPECT_EQ(HostState::Current().Worlds().DomainOf(getpid()), domain);
  EXPECT_EQ(ErrorOf(place, {Widened(getpid()), 0}), 0);
  EXPECT_EQ(HostState::Current().Worlds().DomainOf(getpid()), 0U);
}

TEST_F(KernelCalls, ListLeakedDomainsUpToTheCapacity) {
  const unsigned int second = Create("second");
  const unsigned int third = Create("third");
  std::array<std::uint32_t, 4> ids = {9, 9, 9, 9};
  std::uint32_t count = 0;
  EXPECT_EQ(ErrorOf(kRetrieveLeaked, {Address(ids.data()), Address(&count), 2}), 0);
  EXPECT_EQ(count, 3U);
  EXPECT_THAT(ids, ElementsAre(domain, second, 9, 9));
  EXPECT_EQ(ErrorOf(kRetrieveLeaked, {Address(ids.data()), Address(&count), 4}), 0);
  EXPECT_THAT(ids, ElementsAre(domain, second, third, 9));
  EXPECT_EQ(ErrorOf(kRetrieveLeaked, {0, Address(&count), 0}), 0);
  EXPECT_EQ(ErrorOf(kRetrieveLeaked, {kBadAddress, Address(&count), 1}), EFAULT);
  EXPECT_EQ(ErrorOf(kRetrieveLeaked, {Address(ids.data()), kBadAddress, 4}), EFAULT);
}

// ---- File policies.

TEST_F(KernelCalls, AddAndRetrieveFilePolicies) {
  EXPECT_EQ(Add(0, {FileRule("/etc", 1), FileRule("/bin", 0x11)}), 0);
  EXPECT_EQ(installed, 2U);
  EXPECT_EQ(Add(getpid(), {FileRule("/vm", 3)}), 0);
  EXPECT_THAT(Retrieve(), ElementsAre("/etc 1", "/bin 17", "/vm 3"));
}

TEST_F(KernelCalls, AddManyPoliciesAtOnce) {
  std::vector<TeskAccess_FileRule> rules;
  for (int number = 0; number < 1001; ++number) {
    rules.push_back(FileRule("/file" + std::to_string(number), 1));
  }
  EXPECT_EQ(Add(0, rules), 0);
  EXPECT_EQ(installed, 1001U);
  EXPECT_EQ(Retrieve().size(), 1001U);
  EXPECT_EQ(Retrieve().back(), "/file1000 1");
}

TEST_F(KernelCalls, AddAllPoliciesOrNone) {
  EXPECT_EQ(Add(0, {FileRule("/etc", 1), FileRule("", 1)}), EINVAL);
  EXPECT_EQ(Add(0, {FileRule("/etc", 1), FileRule("/bin", 0x20)}), EINVAL);
  EXPECT_EQ(Add(0, {FileRule("/etc", 1), FileRule(std::string(1984, 'p'), 1)}), ENAMETOOLONG);
  EXPECT_EQ(installed, 0U);
  EXPECT_THAT(Retrieve(), IsEmpty());
}

TEST_F(KernelCalls, AddNoPoliciesFromBadPlacesOrForBadOwners) {
  const TeskAccess_FileRule rule = FileRule("/etc", 1);
  const auto add = [&](std::uint64_t world, std::uint64_t owner, std::uint64_t rules,
                       std::uint64_t count, std::uint64_t result) {
    return ErrorOf(kAddFilePolicies, {world, owner, rules, count, result});
  };
  EXPECT_EQ(add(0, domain, kBadAddress, 1, Address(&installed)), EFAULT);
  EXPECT_EQ(add(0, domain, Address(&rule), 1, kBadAddress), EFAULT);
  EXPECT_EQ(add(0, domain, Address(&rule), 0, Address(&installed)), EINVAL);
  EXPECT_EQ(add(0, domain, Address(&rule), 65'537, Address(&installed)), EINVAL);
  EXPECT_EQ(add(0, domain, Address(&rule), 1ULL << 32U, Address(&installed)), EINVAL);
  EXPECT_EQ(add(0, 77, Address(&rule), 1, Address(&installed)), ENOENT);
  EXPECT_EQ(add(Widened(-7), domain, Address(&rule), 1, Address(&installed)), ESRCH);
  EXPECT_THAT(Retrieve(), IsEmpty());
  EXPECT_EQ(add(0, domain, Address(&rule), 1, Address(&installed)), 0);
}

TEST_F(KernelCalls, AskForALargerBufferWhenThereIsMore) {
  ASSERT_EQ(Add(0, {FileRule("/etc", 1), FileRule("/bin", 1)}), 0);
  std::array<TeskAccess_FileRule, 2> buffer{};
  const auto result = Call(kRetrieveFilePolicies, {domain, Address(buffer.data()), 1});
  EXPECT_EQ(result.status, 0xbad011fU);
  EXPECT_EQ(result.error, -EAGAIN);
  EXPECT_STREQ(buffer[0].path, "");
  EXPECT_EQ(ErrorOf(kRetrieveFilePolicies, {domain, Address(buffer.data()), 2}), 0);
  EXPECT_STREQ(buffer[1].path, "/bin");
}

TEST_F(KernelCalls, RetrieveNoPoliciesFromOrToBadPlaces) {
  ASSERT_EQ(Add(0, {FileRule("/etc", 1)}), 0);
  std::uint32_t count = 0;
  EXPECT_EQ(ErrorOf(kRetrieveFilePolicies, {domain, kBadAddress, 5}), EFAULT);
  EXPECT_EQ(ErrorOf(kRetrieveFilePolicies, {77, kBadAddress, 5}), ENOENT);
  EXPECT_EQ(ErrorOf(kCountFilePolicies, {domain, kBadAddress}), EFAULT);
  EXPECT_EQ(ErrorOf(kCountFilePolicies, {77, Address(&count)}), ENOENT);
}

TEST_F(KernelCalls, UpdateFilePolicies) {
  ASSERT_EQ(Add(0, {FileRule("/etc", 1)}), 0);
  EXPECT_EQ(ErrorOf(kUpdateFilePolicy, {domain, Address("/etc"), 0x13}), 0);
  EXPECT_THAT(Retrieve(), ElementsAre("/etc 19"));
  EXPECT_EQ(ErrorOf(kUpdateFilePolicy, {domain, Address("/bin"), 1}), ENOENT);
  EXPECT_EQ(ErrorOf(kUpdateFilePolicy, {domain, Address(""), 1}), EINVAL);
  EXPECT_EQ(ErrorOf(kUpdateFilePolicy, {domain, Address("/etc"), 4}), EINVAL);
  EXPECT_EQ(ErrorOf(kUpdateFilePolicy, {domain, 0, 1}), EFAULT);
  EXPECT_EQ(ErrorOf(kUpdateFilePolicy, {77, Address("/etc"), 1}), ENOENT);
}

TEST_F(KernelCalls, RemoveFilePoliciesOfTheWorldTheyAreFor) {
  ASSERT_EQ(Add(0, {FileRule("/etc", 1)}), 0);
  ASSERT_EQ(Add(getpid(), {FileRule("/etc", 3)}), 0);
  EXPECT_EQ(ErrorOf(kRemoveFilePolicy, {Widened(getpid()), domain, Address("/etc")}), 0);
  EXPECT_THAT(Retrieve(), ElementsAre("/etc 1"));
  EXPECT_EQ(ErrorOf(kRemoveFilePolicy, {Widened(getpid()), domain, Address("/etc")}), ENOENT);
  EXPECT_EQ(ErrorOf(kRemoveFilePolicy, {0, domain, Address("/etc")}), 0);
  EXPECT_EQ(ErrorOf(kRemoveFilePolicy, {0, domain, kBadAddress}), EFAULT);
}

TEST_F(KernelCalls, RePointThePoliciesOfWorlds) {
  ASSERT_EQ(Add(0, {FileRule("/vm/a", 1)}), 0);
  ASSERT_EQ(Add(getpid(), {FileRule("/vm/a", 3)}), 0);
  EXPECT_EQ(ErrorOf(kRePoint, {Address("/vm/a"), Address("/vm/b")}), 0);
  EXPECT_THAT(Retrieve(), ElementsAre("/vm/a 1", "/vm/b 3"));
  EXPECT_EQ(ErrorOf(kRePoint, {Address("/vm/a"), Address("/vm/b")}), ENOENT);
  EXPECT_EQ(ErrorOf(kRePoint, {Address("/vm/b"), Address("")}), EINVAL);
  EXPECT_EQ(ErrorOf(kRePoint, {0, Address("/vm/b")}), EFAULT);
}

// ---- Capabilities and parameter checks.

TEST_F(KernelCalls, GrantAndRevokeCapabilities) {
  EXPECT_EQ(ErrorOf(kSetCapability, {domain, 18, 1}), 0);
  EXPECT_EQ(ErrorOf(kSetCapability, {domain, 0, Widened(-1)}), 0);
  EXPECT_EQ(ErrorOf(kSetCapability, {domain, 18, 0}), 0);

  std::list<TeskAccess_CapabilityRule> rules;
  TeskAccessInterfaceImpl().GetCapabilityRules(domain, rules);
  ASSERT_EQ(rules.size(), 2U);
  EXPECT_EQ(rules.front().capability, "cap_chown");
  EXPECT_TRUE(rules.front().grant);
  EXPECT_EQ(rules.back().capability, "cap_sys_boot");
  EXPECT_FALSE(rules.back().grant);
}

TEST_F(KernelCalls, RefuseCapabilitiesThatDoNotExist) {
  EXPECT_EQ(ErrorOf(kSetCapability, {domain, 41, 1}), EINVAL);
  EXPECT_EQ(ErrorOf(kSetCapability, {domain, ~0ULL, 1}), EINVAL);
  EXPECT_EQ(ErrorOf(kSetCapability, {77, 18, 1}), ENOENT);
}

TEST_F(KernelCalls, SetAndRemoveParameterChecks) {
  const TeskAccess_ModeParam range{80, 443};
  const TeskAccess_ModeParam one{22, 22};
  EXPECT_EQ(ErrorOf(kSetParameterCheck, {domain, 2, Address(&range), 1}), 0);
  EXPECT_EQ(ErrorOf(kSetParameterCheck, {domain, 2, Address(&one), 0}), 0);

  std::list<TeskAccess_CapabilityParamRule> rules;
  TeskAccessInterfaceImpl access;
  access.GetCapabilityParamRules(domain, rules);
  ASSERT_EQ(rules.size(), 2U);
  EXPECT_EQ(rules.front().paramCheck, "bind_port");
  EXPECT_EQ(rules.front().firstParam, "80");
  EXPECT_EQ(rules.front().secondParam, "443");
  EXPECT_TRUE(rules.front().grant);
  EXPECT_EQ(rules.back().firstParam, "22");
  EXPECT_EQ(rules.back().secondParam, "");
  EXPECT_FALSE(rules.back().grant);

  EXPECT_EQ(ErrorOf(kRemoveParameterCheck, {domain, 2, Address(&range)}), 0);
  EXPECT_EQ(ErrorOf(kRemoveParameterCheck, {domain, 2, Address(&range)}), ENOENT);
  EXPECT_EQ(ErrorOf(kRemoveParameterCheck, {domain, 2, Address(&one)}), 0);
  rules.clear();
  access.GetCapabilityParamRules(domain, rules);
  EXPECT_THAT(rules, IsEmpty());
}

TEST_F(KernelCalls, RefuseParameterChecksThatMakeNoSense) {
  const TeskAccess_ModeParam range{80, 443};
  const TeskAccess_ModeParam backwards{443, 80};
  EXPECT_EQ(ErrorOf(kSetParameterCheck, {domain, 10, Address(&range), 1}), EINVAL);
  EXPECT_EQ(ErrorOf(kSetParameterCheck, {domain, 2, Address(&backwards), 1}), EINVAL);
  EXPECT_EQ(ErrorOf(kSetParameterCheck, {domain, 2, 0, 1}), EFAULT);
  EXPECT_EQ(ErrorOf(kSetParameterCheck, {77, 2, Address(&range), 1}), ENOENT);
  EXPECT_EQ(ErrorOf(kRemoveParameterCheck, {domain, 10, Address(&range)}), EINVAL);
  EXPECT_EQ(ErrorOf(kRemoveParameterCheck, {domain, 2, kBadAddress}), EFAULT);
  EXPECT_EQ(ErrorOf(kRemoveParameterCheck, {77, 2, Address(&range)}), ENOENT);
}

// ---- Anything at all.

TEST_F(KernelCalls, SurviveRandomArguments) {
  // Addresses are either in a page of ours or can be nowhere, so that nothing else is written to.
  constexpr std::size_t kSize = 1 << 16;
  void* page = mmap(nullptr, kSize, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  std::mt19937_64 random(20);
  const auto argument = [&]() -> std::uint64_t {
    switch (random() % 5) {
      case 0:
        return random() % 4;
      case 1:
        return random() % 600;
      case 2:
        return random() | 0x8000'0000'0000'0000;
      case 3:
        return random() % 4096;
      default:
        return Address(static_cast<char*>(page)) + random() % (kSize + 100);
    }
  };
  for (int round = 0; round < 20'000; ++round) {
    const auto number = static_cast<std::uint32_t>(0x4058 + random() % 0x11);
    auto* bytes = static_cast<unsigned char*>(page);
    bytes[random() % kSize] = static_cast<unsigned char>(random());
    switch (random() % 6) {
      case 0:
        Call(number, {argument()});
        break;
      case 1:
        Call(number, {argument(), argument()});
        break;
      case 2:
        Call(number, {argument(), argument(), argument()});
        break;
      case 3:
        Call(number, {argument(), argument(), argument(), argument()});
        break;
      case 4:
        Call(number, {argument(), argument(), argument(), argument(), argument()});
        break;
      default:
        Call(random() % 2 == 0 ? kRemoveParameterCheck : number,
             {argument(), argument(), argument()});
    }
  }
  munmap(page, kSize);
  HostState& state = HostState::Current();
  state.Refresh();
  EXPECT_NE(state.Domains().Find("hostDom"), nullptr);
  auto rows = state.Database().Select("PRAGMA integrity_check");
  ASSERT_TRUE(rows.Next());
  EXPECT_EQ(rows.Text(0), "ok");
}

}  // namespace
}  // namespace LinuxHostTest
