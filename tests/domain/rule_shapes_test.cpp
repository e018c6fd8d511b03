// The shape of the rule sets: one abstract virtual base, one list of their own, the operations in
// one order.

#include <cstddef>
#include <type_traits>

#include "secpolicy/domain/capability_param_rules.h"
#include "secpolicy/domain/capability_rules.h"
#include "secpolicy/domain/dom_trans_rules.h"
#include "secpolicy/domain/file_creation_rules.h"
#include "secpolicy/domain/file_path_access_rules.h"
#include "secpolicy/domain/object_access_rules.h"
#include "secpolicy/domain/syscall_rules.h"
#include "secpolicy/domain/unix_sock_creation_rules.h"
#include "support/slot.h"
#include "teskctl/security.h"

namespace SecPolicyTest {
namespace {

using SecPolicy::PolicyRules;

// A class is reached from its virtual base only by dynamic_cast.
template <class Derived, class Base>
concept PlainlyDerived = std::is_base_of_v<Base, Derived> && requires(Base* base) {
  static_cast<Derived*>(base);
};
template <class Derived, class Base>
concept VirtuallyDerived = std::is_convertible_v<Derived*, Base*> && !PlainlyDerived<Derived, Base>;

template <class Rules>
std::vector<std::ptrdiff_t> Slots() {
  return {Slot(&Rules::AddRule), Slot(&Rules::Set), Slot(&Rules::ReadSystemRules),
          Slot(&Rules::CheckConstraints), Slot(&Rules::PrintRules)};
}

struct Plain : PolicyRules {};
struct Virtual : virtual PolicyRules {};
static_assert(PlainlyDerived<Plain, PolicyRules> && !VirtuallyDerived<Plain, PolicyRules>);
static_assert(!PlainlyDerived<Virtual, PolicyRules> && VirtuallyDerived<Virtual, PolicyRules>);

TEST(PolicyRulesShape, IsAbstractWithKeywordOnly) {
  EXPECT_TRUE(std::is_abstract_v<PolicyRules>);
  EXPECT_TRUE(std::has_virtual_destructor_v<PolicyRules>);
  EXPECT_EQ(sizeof(PolicyRules), sizeof(void*) + sizeof(std::string));
  EXPECT_TRUE((std::is_same_v<decltype(PolicyRules::keyword), std::string>));
}

// The slot of whatever comes behind all operations tells how many there are: two are the
// destructor's.
struct OneMoreOperation : PolicyRules {
  virtual void Next() {}
};

TEST(PolicyRulesShape, OrdersFiveOperationsAndHasNoOther) {
  EXPECT_EQ(Slots<PolicyRules>(), (std::vector<std::ptrdiff_t>{0, 1, 2, 3, 4}));
  EXPECT_EQ(Slot(&OneMoreOperation::Next), 7);
}

template <class RuleFamily>
class RuleSetShape : public testing::Test {};

template <class RulesClass, class RecordType>
struct Family {
  using Rules = RulesClass;
  using Record = RecordType;
};
using Families = testing::Types<
    Family<SecPolicy::SyscallRules, TeskCtl::Security::TeskAccess_SyscallRule>,
    Family<SecPolicy::CapabilityRules, TeskCtl::Security::TeskAccess_CapabilityRule>,
    Family<SecPolicy::CapabilityParamRules, TeskCtl::Security::TeskAccess_CapabilityParamRule>,
    Family<SecPolicy::ObjectAccessRules, TeskCtl::Security::TeskAccess_ObjectAccessRule>,
    Family<SecPolicy::DomTransRules, TeskCtl::Security::TeskAccess_DomTransRule>,
    Family<SecPolicy::FileCreationRules, TeskCtl::Security::TeskAccess_FileCreationRule>,
    Family<SecPolicy::UnixSockCreationRules, TeskCtl::Security::TeskAccess_UnixSockCreationRule>,
    Family<SecPolicy::FilePathAccessRules, TeskCtl::Security::TeskAccess_FilePathAccessRule>>;
TYPED_TEST_SUITE(RuleSetShape, Families);

TYPED_TEST(RuleSetShape, DerivesVirtuallyFromPolicyRules) {
  EXPECT_TRUE((VirtuallyDerived<typename TypeParam::Rules, PolicyRules>));
}

TYPED_TEST(RuleSetShape, HasOneListOfItsRecords) {
  using Rules = typename TypeParam::Rules;
  using List = std::list<typename TypeParam::Record>;
  EXPECT_TRUE((std::is_same_v<decltype(Rules::rules), List>));
  EXPECT_EQ(sizeof(Rules), sizeof(void*) + sizeof(List) + sizeof(PolicyRules));
}

TYPED_TEST(RuleSetShape, OverridesOperationsInTheirOrder) {
  using Rules = typename TypeParam::Rules;
  EXPECT_EQ(Slots<Rules>(), (std::vector<std::ptrdiff_t>{0, 1, 2, 3, 4}));
  EXPECT_FALSE(std::is_abstract_v<Rules>);
}

TYPED_TEST(RuleSetShape, BeginsItsRecordsWithSameHeader) {
  const typename TypeParam::Record record;
  const auto distance = [&](const auto& field) {
    return reinterpret_cast<const char*>(&field) - reinterpret_cast<const char*>(&record);
  };
  EXPECT_EQ(distance(record.line), 0);
  EXPECT_EQ(distance(record.domainId), 4);
  EXPECT_EQ(distance(record.domainName), 8);
}

TEST(FileRuleShape, IsPathAndMaskOfFixedSize) {
  using TeskCtl::Security::TeskAccess_FileRule;
  EXPECT_EQ(sizeof(TeskAccess_FileRule::path), 1984u);
  EXPECT_EQ(offsetof(TeskAccess_FileRule, permission), 1984u);
  EXPECT_EQ(sizeof(TeskAccess_FileRule), 1988u);
}

}  // namespace
}  // namespace SecPolicyTest
