// Domains at run time: arguments in the kernel's order, answers where the kernel stores none, and
// an interface that is always destroyed.

#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <limits>
#include <span>
#include <string>
#include <vector>

#include "secpolicy/secpolicy.h"
#include "support/scripted_host.h"

namespace SecPolicyTest {
namespace {

using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_CHECK_ACCESS;
using TeskCtl::Security::TESKACCESS_DEFAULT_DOM_NONE;
using Zorvan::Kernel::CallResult;

using Arguments64 = std::span<const std::uint64_t>;

template <class Target>
Target* Pointer(std::uint64_t address) {
  return reinterpret_cast<Target*>(static_cast<std::uintptr_t>(address));
}

class RuntimeDomains : public testing::Test {
 protected:
  // Kernel call `number` stores `id` as its argument `argument`, and finds 0 there.
  void AnswerWithId(std::uint32_t number, std::size_t argument, std::uint32_t id) {
    host.OnKernelCall(number, [=](Arguments64 args) {
      EXPECT_EQ(*Pointer<std::uint32_t>(args[argument]), 0U);
      *Pointer<std::uint32_t>(args[argument]) = id;
      return CallResult{0, 0};
    });
  }

  ScriptedHost host;
};

using CreateDomain = RuntimeDomains;
using DestroyDomain = RuntimeDomains;
using AddGcomService = RuntimeDomains;
using RetrieveLeakedDomains = RuntimeDomains;
using GetDomainIDForWorld = RuntimeDomains;

TEST_F(CreateDomain, ReturnsTheStoredIdentifier) {
  AnswerWithId(0x4059, 2, 4294967295);
  unsigned int id = 0;
  EXPECT_EQ(Record([&] {
              id = SecPolicy::CreateDomain("toolDom", TESKACCESS_DEFAULT_DOM_CHECK_ACCESS);
            }).Text(),
            Lines({
                "TeskAccessInterfaceImpl()",
                R"(Call(0x4059, "toolDom", 3, &out))",
                "~TeskAccessInterfaceImpl()",
                "returns",
            }));
  EXPECT_EQ(id, 4294967295);
}

TEST_F(CreateDomain, ReturnsZeroWhenTheKernelStoresNothing) {
  EXPECT_EQ(SecPolicy::CreateDomain("toolDom", TESKACCESS_DEFAULT_DOM_NONE), 0U);
}

TEST_F(CreateDomain, RefusesAnEmptyName) {
  EXPECT_EQ(Record([] { SecPolicy::CreateDomain("", TESKACCESS_DEFAULT_DOM_NONE); }).Text(),
            Lines({
                "TeskAccessInterfaceImpl()",
                "~TeskAccessInterfaceImpl()",
                "throws Braxo::Lib::BraxoException: Must specify domain name",
            }));
}

TEST_F(CreateDomain, DestroysItsInterfaceWhenTheKernelRefuses) {
  host.FailKernelCall(0x4059, 1, -ENOSPC);
  EXPECT_EQ(
      Record([] { SecPolicy::CreateDomain("toolDom", TESKACCESS_DEFAULT_DOM_NONE); }).Text(),
      Lines({
          "TeskAccessInterfaceImpl()",
          R"(Call(0x4059, "toolDom", 0, &out))",
          "~TeskAccessInterfaceImpl()",
          "throws Braxo::Lib::BraxoException: Failed to create domain:toolDom :No space left on "
          "device",
      }));
}

TEST_F(CreateDomain, MakesNoCallWithoutAnInterface) {
  const auto create = [] { SecPolicy::CreateDomain("toolDom", TESKACCESS_DEFAULT_DOM_NONE); };
  host.FailWith("TeskAccessInterfaceImpl", Every(), DerivedBraxoException("no module"));
  EXPECT_EQ(Record(create).Text(), Lines({
                                       "TeskAccessInterfaceImpl()",
                                       "throws SecPolicyTest::DerivedBraxoException: no module",
                                   }));
  host.FailForeign("TeskAccessInterfaceImpl");
  EXPECT_EQ(Record(create).Text(), Lines({
                                       "TeskAccessInterfaceImpl()",
                                       "throws SecPolicyTest::ForeignException: foreign",
                                   }));
}

TEST_F(DestroyDomain, PassesTheIdentifier) {
  EXPECT_EQ(Record([] { SecPolicy::DestroyDomain(4294967295); }).Text(),
            Lines({
                "TeskAccessInterfaceImpl()",
                "Call(0x405a, 4294967295)",
                "~TeskAccessInterfaceImpl()",
                "returns",
            }));
}

TEST_F(DestroyDomain, DestroysItsInterfaceWhenTheKernelRefuses) {
  host.FailKernelCall(0x405a, 1, -EBUSY);
  EXPECT_EQ(Record([] { SecPolicy::DestroyDomain(0); }).Text(),
            Lines({
                "TeskAccessInterfaceImpl()",
                "Call(0x405a, 0)",
                "~TeskAccessInterfaceImpl()",
                "throws Braxo::Lib::BraxoException: Failed to destroy domain: Device or resource "
                "busy",
            }));
}

TEST_F(DestroyDomain, MakesNoCallWithoutAnInterface) {
  host.FailForeign("TeskAccessInterfaceImpl");
  EXPECT_EQ(Record([] { SecPolicy::DestroyDomain(7); }).Text(),
            Lines({
                "TeskAccessInterfaceImpl()",
                "throws SecPolicyTest::ForeignException: foreign",
            }));
}

TEST_F(AddGcomService, GoesThroughTheInterface) {
  EXPECT_EQ(Record([] { SecPolicy::AddGcomService(4294967295, "guest.service"); }).Text(),
            Lines({
                "TeskAccessInterfaceImpl()",
                R"(AddGcomService(4294967295, "guest.service"))",
                "~TeskAccessInterfaceImpl()",
                "returns",
            }));
}

TEST_F(AddGcomService, RefusesAnEmptyService) {
  EXPECT_EQ(Record([] { SecPolicy::AddGcomService(7, ""); }).Text(),
            Lines({
                "TeskAccessInterfaceImpl()",
                "~TeskAccessInterfaceImpl()",
                "throws Braxo::Lib::BraxoException: Must specify service string",
            }));
}

TEST_F(AddGcomService, PassesWhateverTheInterfaceThrows) {
  host.FailWith("AddGcomService", Every(), DerivedBraxoException("no such domain"));
  EXPECT_EQ(Record([] { SecPolicy::AddGcomService(7, "guest"); }).Text(),
            Lines({
                "TeskAccessInterfaceImpl()",
                R"(AddGcomService(7, "guest"))",
                "~TeskAccessInterfaceImpl()",
                "throws SecPolicyTest::DerivedBraxoException: no such domain",
            }));
  host.FailForeign("AddGcomService");
  EXPECT_EQ(Record([] { SecPolicy::AddGcomService(7, "guest"); }).Text(),
            Lines({
                "TeskAccessInterfaceImpl()",
                R"(AddGcomService(7, "guest"))",
                "~TeskAccessInterfaceImpl()",
                "throws SecPolicyTest::ForeignException: foreign",
            }));
}

TEST_F(RetrieveLeakedDomains, PassesItsParametersInReverseOrder) {
  unsigned int count = 0;
  unsigned int ids[2] = {};
  std::vector<std::uint64_t> passed;
  host.OnKernelCall(0x4064, [&](Arguments64 args) {
    passed.assign(args.begin(), args.end());
    Pointer<unsigned int>(args[0])[0] = 11;
    Pointer<unsigned int>(args[0])[1] = 12;
    *Pointer<unsigned int>(args[1]) = 2;
    return CallResult{0, 0};
  });
  EXPECT_EQ(Record([&] {
              SecPolicy::RetrieveLeakedDomains(std::numeric_limits<unsigned long>::max(), &count,
                                               ids);
            }).Text(),
            Lines({"Call(0x4064, &buffer, &buffer, 18446744073709551615)", "returns"}));
  EXPECT_EQ(passed, (std::vector<std::uint64_t>{reinterpret_cast<std::uintptr_t>(ids),
                                                reinterpret_cast<std::uintptr_t>(&count),
                                                std::numeric_limits<unsigned long>::max()}));
  EXPECT_EQ(count, 2U);
  EXPECT_EQ(ids[0], 11U);
  EXPECT_EQ(ids[1], 12U);
}

TEST_F(RetrieveLeakedDomains, LeavesTheStoresToTheKernel) {
  EXPECT_EQ(Record([] { SecPolicy::RetrieveLeakedDomains(0, nullptr, nullptr); }).Text(),
            Lines({"Call(0x4064, null, null, 0)", "returns"}));
  unsigned int count = 5;
  unsigned int id = 6;
  SecPolicy::RetrieveLeakedDomains(1, &count, &id);
  EXPECT_EQ(count, 5U);
  EXPECT_EQ(id, 6U);
}

TEST_F(GetDomainIDForWorld, ReturnsTheStoredIdentifier) {
  AnswerWithId(0x4065, 1, 4294967295);
  unsigned int id = 0;
  EXPECT_EQ(Record([&] { id = SecPolicy::GetDomainIDForWorld(2147483647); }).Text(),
            Lines({"Call(0x4065, 2147483647, &out)", "returns"}));
  EXPECT_EQ(id, 4294967295);
}

TEST_F(GetDomainIDForWorld, ReturnsZeroWhenTheKernelStoresNothing) {
  EXPECT_EQ(SecPolicy::GetDomainIDForWorld(12), 0U);
}

TEST_F(GetDomainIDForWorld, WidensNegativeWorldsWithTheirSign) {
  std::uint64_t world = 0;
  host.OnKernelCall(0x4065, [&](Arguments64 args) {
    world = args[0];
    return CallResult{0, 0};
  });
  SecPolicy::GetDomainIDForWorld(-1);
  EXPECT_EQ(world, 0xffffffffffffffffU);
  SecPolicy::GetDomainIDForWorld(std::numeric_limits<int>::min());
  EXPECT_EQ(world, 0xffffffff80000000U);
}

class DomainName : public RuntimeDomains {
 protected:
  // What is returned when the kernel writes `bytes` to the buffer.
  std::string NameOf(const std::string& bytes) {
    host.OnKernelCall(0x4066, [&](Arguments64 args) {
      const auto* buffer = Pointer<char>(args[1]);
      EXPECT_TRUE(std::all_of(buffer, buffer + 64, [](char byte) { return byte == '\0'; }));
      std::memcpy(Pointer<char>(args[1]), bytes.data(), bytes.size());
      return CallResult{0, 0};
    });
    return SecPolicy::GetDomainNameForID(7);
  }
};

TEST_F(DomainName, IsAskedForWithABufferOf64Bytes) {
  EXPECT_EQ(Record([] { SecPolicy::GetDomainNameForID(4294967295); }).Text(),
            Lines({"Call(0x4066, 4294967295, &buffer, 64)", "returns"}));
}

TEST_F(DomainName, EndsAtTheFirstNul) {
  EXPECT_EQ(NameOf("toolDom"), "toolDom");
  EXPECT_EQ(NameOf(std::string("tool\0Dom", 8)), "tool");
  EXPECT_EQ(NameOf(std::string(63, 'n') + '\0'), std::string(63, 'n'));
}

TEST_F(DomainName, EndsAtTheBuffersEndWithoutANul) {
  EXPECT_EQ(NameOf(std::string(64, 'n')), std::string(64, 'n'));
}

TEST_F(DomainName, IsEmptyWhenTheKernelWritesNothing) { EXPECT_EQ(NameOf(""), ""); }

}  // namespace
}  // namespace SecPolicyTest
