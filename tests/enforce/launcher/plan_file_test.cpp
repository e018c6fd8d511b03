// Plans as bytes: hunts for one that is read as another than was written, and for bytes that are
// taken for a plan.

#include "host/enforce/plan_file.h"

#include <gmock/gmock.h>

#include <cstring>
#include <functional>

#include "host/enforce/checksum.h"

namespace EnforceTest {
namespace {

using Enforce::MaskKind;
using Enforce::Parse;
using Enforce::Plan;
using Enforce::Serialize;
using testing::StrEq;

Plan SamplePlan() {
  Plan plan;
  plan.domain = "sshDom";
  plan.domainId = 7;
  plan.mark = std::string("\0mark\n", 6);
  plan.level = Policy::Level::kPermissive;
  plan.keepsBroker = true;
  plan.handledFiles = Enforce::Landlock::AllRights(5);
  plan.paths = {{"/etc/ssh", Enforce::Landlock::kReadFile, false},
                {"/run/sshd.pid", Enforce::Landlock::kWriteFile, true}};
  plan.bindsChecked = true;
  plan.connectsChecked = true;
  plan.bindPorts = {22, 2222};
  plan.connectPorts = {65535};
  plan.isScoped = true;
  plan.masks = {{"/etc/ssh/keys", MaskKind::kHidden}, {"/etc/ssh/bin", MaskKind::kNoExec}};
  plan.capabilities = std::uint64_t{1} << 40 | 1;
  plan.filter = {BPF_STMT(BPF_LD | BPF_W | BPF_ABS, 4),
                 BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, 1, 2, 3),
                 BPF_STMT(BPF_RET | BPF_K, 0x7fff'0000)};
  plan.secret = {1, 2};
  plan.mayMap = false;
  return plan;
}

// Why bytes are no plan; empty when they are one.
std::string ReasonAgainst(std::string_view bytes) {
  Plan plan;
  const char* whyNot = nullptr;
  return Parse(bytes, &plan, &whyNot) ? "" : whyNot;
}

TEST(PlanFile, KeepsAllOfAPlan) {
  const Plan sample = SamplePlan();
  Plan plan;
  const char* whyNot = nullptr;

  ASSERT_TRUE(Parse(Serialize(sample), &plan, &whyNot)) << whyNot;

  EXPECT_EQ(plan.domain, sample.domain);
  EXPECT_EQ(plan.domainId, sample.domainId);
  EXPECT_EQ(plan.mark, sample.mark);
  EXPECT_EQ(plan.level, sample.level);
  EXPECT_EQ(plan.keepsBroker, sample.keepsBroker);
  EXPECT_EQ(plan.handledFiles, sample.handledFiles);
  EXPECT_EQ(plan.paths, sample.paths);
  EXPECT_EQ(plan.bindsChecked, sample.bindsChecked);
  EXPECT_EQ(plan.connectsChecked, sample.connectsChecked);
  EXPECT_EQ(plan.bindPorts, sample.bindPorts);
  EXPECT_EQ(plan.connectPorts, sample.connectPorts);
  EXPECT_EQ(plan.isScoped, sample.isScoped);
  EXPECT_EQ(plan.masks, sample.masks);
  EXPECT_EQ(plan.capabilities, sample.capabilities);
  ASSERT_EQ(plan.filter.size(), sample.filter.size());
  EXPECT_EQ(std::memcmp(plan.filter.data(), sample.filter.data(),
                        sample.filter.size() * sizeof(sock_filter)),
            0);
  ASSERT_TRUE(plan.secret);
  EXPECT_EQ(plan.secret->lower, 1);
  EXPECT_EQ(plan.secret->upper, 2);
  EXPECT_TRUE(plan.mayEnd);
  EXPECT_FALSE(plan.mayMap);
}

TEST(PlanFile, KeepsAPlanOfNothing) {
  Plan plan;
  const char* whyNot = nullptr;
  ASSERT_TRUE(Parse(Serialize({}), &plan, &whyNot)) << whyNot;
  EXPECT_EQ(plan.level, Policy::Level::kEnforcing);
  EXPECT_EQ(plan.secret, std::nullopt);
  EXPECT_THAT(plan.paths, testing::IsEmpty());
}

TEST(PlanFile, IsNotCutShort) {
  const std::string bytes = Serialize(SamplePlan());
  ASSERT_THAT(ReasonAgainst(bytes), StrEq(""));
  for (std::size_t size = 0; size < bytes.size(); ++size) {
    const char* const expected =
        size < std::strlen("secpolicy-plan\n") ? "it is no plan" : "it is damaged";
    EXPECT_THAT(ReasonAgainst(std::string_view(bytes).substr(0, size)), StrEq(expected)) << size;
  }
}

TEST(PlanFile, HasNothingBehindIt) {
  EXPECT_THAT(ReasonAgainst(Serialize(SamplePlan()) + '\0'), StrEq("it is damaged"));
}

TEST(PlanFile, HasNoFlippedBit) {
  const std::string bytes = Serialize(SamplePlan());
  for (std::size_t bit = 0; bit < bytes.size() * 8; ++bit) {
    std::string changed = bytes;
    changed[bit / 8] = static_cast<char>(changed[bit / 8] ^ (1 << bit % 8));
    EXPECT_THAT(ReasonAgainst(changed), Not(StrEq(""))) << bit;
  }
}

// Puts the right checksum behind `body`, as no accident does.
std::string Sign(std::string body) {
  const std::uint64_t sum = Enforce::Checksum(body);
  return body.append(reinterpret_cast<const char*>(&sum), sizeof(sum));
}

std::string Body(const Plan& plan) {
  std::string bytes = Serialize(plan);
  bytes.resize(bytes.size() - sizeof(std::uint64_t));
  return bytes;
}

TEST(PlanFile, IsOfThisVersion) {
  std::string body = Body(SamplePlan());
  ASSERT_THAT(ReasonAgainst(Sign(body)), StrEq(""));
  ++body[std::strlen("secpolicy-plan\n")];
  EXPECT_THAT(ReasonAgainst(Sign(body)), StrEq("another version of secpolicy made it"));
  EXPECT_THAT(ReasonAgainst(body + "another sum"), StrEq("another version of secpolicy made it"));
}

TEST(PlanFile, BelievesNoCount) {
  const std::string body = Body(SamplePlan());
  const std::size_t domainSize = std::strlen("secpolicy-plan\n") + sizeof(std::uint32_t);
  for (const char byte : {'\x7f', '\xff'}) {
    std::string changed = body;
    changed[domainSize + 3] = byte;
    EXPECT_THAT(ReasonAgainst(Sign(changed)), StrEq("it contradicts itself"));
  }
  // A signed body may end anywhere.
  for (std::size_t size = domainSize; size < body.size(); ++size) {
    EXPECT_THAT(ReasonAgainst(Sign(body.substr(0, size))), StrEq("it contradicts itself")) << size;
  }
  EXPECT_THAT(ReasonAgainst(Sign(body + '\0')), StrEq("it contradicts itself"));
}

TEST(PlanFile, ContradictsItself) {
  const std::vector<std::pair<const char*, std::function<void(Plan*)>>> changes = {
      {"a relative path", [](Plan* plan) { plan->paths[0].path = "etc"; }},
      {"a path of nothing", [](Plan* plan) { plan->paths[0].path = ""; }},
      {"a NUL in a path", [](Plan* plan) { plan->paths[0].path = std::string("/e\0c", 4); }},
      {"a path without rights", [](Plan* plan) { plan->paths[1].rights = 0; }},
      {"a right that is not handled", [](Plan* plan) { plan->paths[1].rights = 1 << 16; }},
      {"a relative mask", [](Plan* plan) { plan->masks[0].path = "etc"; }},
      {"ports to bind unchecked", [](Plan* plan) { plan->bindsChecked = false; }},
      {"ports to connect to unchecked", [](Plan* plan) { plan->connectsChecked = false; }},
      {"a filter that is too long",
       [](Plan* plan) { plan->filter.resize(BPF_MAXINSNS + 1, plan->filter.back()); }},
      {"a secret behind the filter", [](Plan* plan) { plan->secret->lower = 3; }},
      {"a secret far behind it", [](Plan* plan) { plan->secret->upper = 0xffff'ffff; }},
      {"a level that there is not",
       [](Plan* plan) { plan->level = static_cast<Policy::Level>(3); }},
      {"a mask that there is not",
       [](Plan* plan) { plan->masks[1].kind = static_cast<MaskKind>(2); }},
  };
  for (const auto& [name, change] : changes) {
    Plan plan = SamplePlan();
    ASSERT_THAT(ReasonAgainst(Serialize(plan)), StrEq(""));
    change(&plan);
    EXPECT_THAT(ReasonAgainst(Serialize(plan)), StrEq("it contradicts itself")) << name;
  }
}

TEST(PlanFile, HasTheLongestFilter) {
  Plan plan = SamplePlan();
  plan.filter.resize(BPF_MAXINSNS, plan.filter.back());
  EXPECT_THAT(ReasonAgainst(Serialize(plan)), StrEq(""));
}

}  // namespace
}  // namespace EnforceTest
