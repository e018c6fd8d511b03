// Hunts bundles that take the place of a newer one or of another policy, and edits that are not
// seen.
#include "bundle/bundle_decision.h"

#include <gtest/gtest.h>

namespace SecPolicyCli {
namespace {

Manifest BundleOf(const std::string& name, std::int64_t serial) {
  return {.name = name,
          .serial = serial,
          .created = 1,
          .expires = std::nullopt,
          .key = "0123456789abcdef",
          .files = {}};
}

TEST(WhyNotNewer, TakesTheSameBundleAndANewerOne) {
  EXPECT_EQ(WhyNotNewer(BundleOf("web", 7), BundleOf("web", 7)), "");
  EXPECT_EQ(WhyNotNewer(BundleOf("web", 7), BundleOf("web", 8)), "");
}

TEST(WhyNotNewer, RefusesAnOlderOne) {
  EXPECT_EQ(WhyNotNewer(BundleOf("web", 7), BundleOf("web", 6)),
            "it is older than what is installed: its serial is 6, and that of what is installed 7. "
            "--allow-older takes it all the same.");
}

TEST(WhyNotNewer, RefusesAnotherOneWithTheSameSerial) {
  Manifest another = BundleOf("web", 7);
  another.created = 2;
  EXPECT_EQ(WhyNotNewer(BundleOf("web", 7), another),
            "it has the serial of what is installed, 7, and is another. --allow-older takes it all "
            "the same.");
}

TEST(WhyNotNewer, RefusesAnotherPolicyWhateverItsSerial) {
  for (const std::int64_t serial : {6, 7, 8}) {
    EXPECT_EQ(WhyNotNewer(BundleOf("web", 7), BundleOf("db", serial)),
              "it is db, serial " + std::to_string(serial) +
                  ", and web, serial 7 is installed: of two policies none is newer. --allow-older "
                  "takes it all the same.");
  }
}

using Files = std::vector<BundledFile>;
using Names = std::vector<std::string>;

TEST(EditedFiles, AreThoseThatWereChangedAddedOrRemoved) {
  const Files named = {{"domains/a", 1, "aa"}, {"domains/b", 1, "bb"}, {"domains/d", 1, "dd"}};
  EXPECT_EQ(EditedFiles(named, named), Names());
  EXPECT_EQ(
      EditedFiles(named, {{"domains/a", 1, "aa"}, {"domains/b", 1, "00"}, {"domains/c", 1, "cc"}}),
      (Names{"domains/b", "domains/c", "domains/d"}));
  EXPECT_EQ(EditedFiles({}, named), (Names{"domains/a", "domains/b", "domains/d"}));
}

TEST(FirstOf, NamesTenAndCountsTheRest) {
  EXPECT_EQ(FirstOf({"a", "b"}), "a and b");
  const Names ten = {"a", "b", "c", "d", "e", "f", "g", "h", "i", "j"};
  EXPECT_EQ(FirstOf(ten), "a, b, c, d, e, f, g, h, i and j");
  Names twelve = ten;
  twelve.insert(twelve.end(), {"k", "l"});
  EXPECT_EQ(FirstOf(twelve), "a, b, c, d, e, f, g, h, i, j and 2 more");
}

}  // namespace
}  // namespace SecPolicyCli
