#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <string>

#include "secpolicy/secpolicy.h"
#include "support/temporary_directory.h"

namespace HostileTest {

using TeskCtl::Security::TeskAccessInterfaceImpl;

// The label that the walks of these tests give, and the one that every file starts with.
inline constexpr char kLabel[] = "toolLabel";
inline constexpr char kFirstLabel[] = "unlabeled";

// Whether the long forms are wanted.
bool LongRun();

// Gives the file at `path`, itself and no link's target, its first label, as a boot does.
void GiveFirstLabel(const std::string& path);
void GiveFirstLabel(int descriptor);

// The label that the entry at `path` carries, links not followed: kFirstLabel, kLabel, "" for none.
std::string LabelOf(const std::string& path);

// How many descriptors the process holds.
unsigned int OpenDescriptors();

// A directory with a label in an otherwise empty temporary directory, whatever is made in it is
// removed at the end; and a state of the Linux host in which kLabel exists. Entries are made with
// their first label.
class HostileTree : public testing::Test {
 protected:
  void SetUp() override;
  void TearDown() override;

  // The tree, and the place beside it that no walk may reach.
  const std::string& Tree() const { return tree; }
  const std::string& Outside() const { return outside; }
  // Beside both, a directory without a label.
  const std::string& Unlabelled() const { return unlabelled; }
  std::string operator/(const std::string& name) const { return tree + "/" + name; }

  void MakeFile(const std::string& path) const;
  void MakeDirectory(const std::string& path) const;

  // Labels the tree with kLabel; returns what that threw, as MessageOf.
  std::string LabelTree();

  TeskAccessInterfaceImpl& Access() { return *access; }

 private:
  SecPolicyTest::TemporaryDirectory scratch;
  const std::string tree = scratch / "tree";
  const std::string outside = scratch / "outside";
  const std::string unlabelled = scratch / "unlabelled";
  std::unique_ptr<TeskAccessInterfaceImpl> access;
};

// Removes a tree of any depth.
void RemoveTree(const std::string& path);

}  // namespace HostileTest
