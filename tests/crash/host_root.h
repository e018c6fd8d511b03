#pragma once

#include <filesystem>
#include <string>

#include "support/temporary_directory.h"

namespace CrashTest {

// A root directory with a policy in it that has rules of every kind, and no tardisks: `load` works
// in it without a boot. Removed with the object.
class HostRoot {
 public:
  HostRoot();

  std::filesystem::path Path() const { return root.Path(); }

  // The database of the state, which is not there before the first load.
  std::filesystem::path State() const { return root / "run/secpolicy/host.db"; }

  // Removes the state and the log beside it.
  void Forget() const;

 private:
  SecPolicyTest::TemporaryDirectory root;
};

// The number of domains in the policy whose names begin with "service", and the `-r` rules of each:
// for "/data/linkN", which leads to "/data/fileN", so that each of them makes two entries at once.
constexpr int kServices = 8;
constexpr int kLinks = 6;

// The whole content of a file.
std::string ReadFile(const std::filesystem::path& path);

// Replaces the content of a file, or makes it.
void WriteFile(const std::filesystem::path& path, const std::string& content);

}  // namespace CrashTest
