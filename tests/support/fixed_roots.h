#pragma once

#include <gtest/gtest.h>

#include <initializer_list>
#include <string>

#include "support/policy_tree.h"

namespace SecPolicyTest {

// Puts the process under a root directory of its own, in which "/etc/zorvan/secpolicy" and
// "/tardisks" exist and are empty; the real ones are out of reach until the object goes. Needs the
// right to change the root directory; an ordinary user gets it in a user namespace, in which the
// process stays.
//
//   class LoadPolicyTardisks : public FixedRootsTest {};
//   TEST_F(LoadPolicyTardisks, ...) {
//     FixedRoots roots({{"/tardisks/base.tgz", ""}, {"/etc/zorvan/secpolicy/tardisks/base",
//     "..."}});
class FixedRoots {
 public:
  // Writes `entries`, whose paths start with "/", below the new root.
  FixedRoots(std::initializer_list<TreeEntry> entries = {});
  FixedRoots(const FixedRoots&) = delete;
  FixedRoots& operator=(const FixedRoots&) = delete;
  ~FixedRoots();

  // Adds a file or, with a "/" at the end, a directory.
  void Write(const std::string& path, const std::string& text) const;

  // Why the process may not do this; empty when it may.
  static std::string WhyNot();

 private:
  PolicyTree tree;
  int outerRoot;
  int outerDirectory;
  bool inside = false;
};

// Skips its tests, with the reason, where fixed roots are not possible.
class FixedRootsTest : public testing::Test {
 protected:
  void SetUp() override;
};

}  // namespace SecPolicyTest
